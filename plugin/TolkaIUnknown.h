#pragma once
// TolkaIUnknown: the static functions that fill the slots of the two interface tables. Each takes
// the interface handle it was called through, finds the service object in the table's reserved
// slot and forwards to the object's method of the same role, reordering arguments where the
// table's order differs from the method's (Probe, Start, setProperty). Nothing thrown inside a
// method leaves a shim: the host gets the operation's "not supported" answer instead.

#include <cstdint>

#include "tolkatouch/HIDServicePlugin.h"

namespace TolkaTouch::TolkaIUnknown {

Host::Result QueryInterface(void* self, Host::UUIDBytes interfaceID, void** outInterface);
uint32_t AddRef(void* self);
uint32_t Release(void* self);

Host::Result Probe(void* self, const PropertyValue* matchingProperties, uint32_t service, int32_t* outScore);
Host::Result Start(void* self, const PropertyValue* properties, uint32_t service);
Host::Result Stop(void* self);

bool open(void* self, uint32_t options);
void close(void* self, uint32_t options);
PropertyValue copyProperty(void* self, const char* key);
bool setProperty(void* self, const char* key, const PropertyValue* value);
void setEventCallback(void* self, Host::HIDEventCallback callback, void* target, void* refcon);
void scheduleWithDispatchQueue(void* self, const DispatchQueueRef* queue);
void unscheduleFromDispatchQueue(void* self, const DispatchQueueRef* queue);
HIDEventRef copyEvent(void* self, uint32_t type, const HIDEventRef* matching, uint32_t options);
Host::Result setOutputEvent(void* self, const HIDEventRef* event);

}  // namespace TolkaTouch::TolkaIUnknown

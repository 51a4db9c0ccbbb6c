#pragma once
// The host's side of the HID service plug-in model, as a host program includes it: the interface
// identifiers, the two interface tables with their slot layout, the event callback, the result
// codes and the factory the plug-in library exports. A host reaches the service through these
// tables only; it never sees the classes behind them.
//
// How a host drives a plug-in:
//   void* library = dlopen(".../tolkatouch/tolkatouch-hidservice.so", RTLD_NOW | RTLD_LOCAL);
//   auto factory = reinterpret_cast<Host::PlugInFactoryFunction>(dlsym(library, Host::kFactorySymbol));
//   auto plugin = static_cast<Host::PlugInInterface**>(factory(nullptr, Host::kHIDServicePlugInTypeID));
//   Host::HIDServiceInterface** service = nullptr;
//   (*plugin)->QueryInterface(plugin, Host::kHIDServiceInterfaceID, reinterpret_cast<void**>(&service));
//   (*plugin)->Probe(plugin, &matching, serviceHandle, &score);
//   (*plugin)->Start(plugin, &matching, serviceHandle);        // device from HIDServiceRegistry
//   (*service)->open(service, 0);
//   (*service)->setEventCallback(service, callback, target, refcon);
//   (*service)->scheduleWithDispatchQueue(service, &queue);   // events arrive on `queue`
//   ... (*service)->copyProperty(service, "Version") ... (*service)->setProperty(service, key, &value) ...
//   (*service)->unscheduleFromDispatchQueue(service, &queue);
//   (*service)->close(service, 0);
//   (*plugin)->Stop(plugin);
//   (*service)->Release(service);                               // the reference QueryInterface added
//   (*plugin)->Release(plugin);                                 // the factory's reference: the service goes
//
// Every slot takes the interface handle it was reached through (`self`) as its first argument.

#include <cstddef>
#include <cstdint>

#include "platform/DispatchQueue.h"
#include "platform/HIDEvent.h"
#include "platform/HIDResult.h"
#include "platform/PropertyValue.h"

namespace TolkaTouch::Host {

// A 16-byte interface identifier, passed by value, bytes in the order they are written
// (00000000-0000-0000-C000-000000000046 starts with four 0x00 and ends with 0x46).
struct UUIDBytes {
    uint8_t bytes[16];
};
static_assert(sizeof(UUIDBytes) == 16);

constexpr bool operator==(const UUIDBytes& a, const UUIDBytes& b) {
    for (size_t i = 0; i < sizeof(a.bytes); ++i) {
        if (a.bytes[i] != b.bytes[i]) return false;
    }
    return true;
}

// The base lifetime interface (QueryInterface, AddRef, Release):
// 00000000-0000-0000-C000-000000000046.
inline constexpr UUIDBytes kIUnknownInterfaceID = {
    {0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0xC0, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x46}};

// The plug-in type of HID services, the only type the factory creates:
// 0E5B1DE7-964D-4842-8806-62DE121EC132.
inline constexpr UUIDBytes kHIDServicePlugInTypeID = {
    {0x0E, 0x5B, 0x1D, 0xE7, 0x96, 0x4D, 0x48, 0x42, 0x88, 0x06, 0x62, 0xDE, 0x12, 0x1E, 0xC1, 0x32}};

// The HID service interface (open, close, properties, events, scheduling):
// 6020107F-1B90-480C-868A-0BFB4163F6B8.
inline constexpr UUIDBytes kHIDServiceInterfaceID = {
    {0x60, 0x20, 0x10, 0x7F, 0x1B, 0x90, 0x48, 0x0C, 0x86, 0x8A, 0x0B, 0xFB, 0x41, 0x63, 0xF6, 0xB8}};

// 32-bit result codes of the interface operations: HIDResult (platform/HIDResult.h), the same set
// the device handle answers. QueryInterface answers NoInterface for an interface it lacks; start
// answers NotCreated when the device handle could not be created.
using Result = uint32_t;

// The host's event callback: called on the host's dispatch queue, once per event, in order.
// `sender` is the service's HID service interface handle; `options` is 0. The callback may keep
// the event by copying the reference.
using HIDEventCallback = void (*)(void* target, void* refcon, void* sender, const HIDEventRef& event,
                                  uint32_t options);

// An interface handle is a pointer to a pointer to one of the tables below; every slot receives
// the handle it was called through. Properties and values travel as pointers to PropertyValue
// (null meaning none), keys as NUL-terminated UTF-8 (null meaning no key), the dispatch queue as a
// pointer to the host's shared reference: the service takes its own reference from it and keeps
// it until unscheduled, so the pointer need only be valid during the call.
struct PlugInInterface {
    void* _reserved;  // the service object; hosts leave it alone
    Result (*QueryInterface)(void* self, UUIDBytes interfaceID, void** outInterface);
    uint32_t (*AddRef)(void* self);
    uint32_t (*Release)(void* self);
    uint16_t version;   // 1
    uint16_t revision;  // 0
    Result (*Probe)(void* self, const PropertyValue* matchingProperties, uint32_t service, int32_t* outScore);
    Result (*Start)(void* self, const PropertyValue* properties, uint32_t service);
    Result (*Stop)(void* self);
};
static_assert(offsetof(PlugInInterface, _reserved) == 0);
static_assert(offsetof(PlugInInterface, QueryInterface) == 8);
static_assert(offsetof(PlugInInterface, AddRef) == 16);
static_assert(offsetof(PlugInInterface, Release) == 24);
static_assert(offsetof(PlugInInterface, version) == 32);
static_assert(offsetof(PlugInInterface, revision) == 34);
static_assert(offsetof(PlugInInterface, Probe) == 40);
static_assert(offsetof(PlugInInterface, Start) == 48);
static_assert(offsetof(PlugInInterface, Stop) == 56);
static_assert(sizeof(PlugInInterface) == 64);

struct HIDServiceInterface {
    void* _reserved;  // the service object; hosts leave it alone
    Result (*QueryInterface)(void* self, UUIDBytes interfaceID, void** outInterface);
    uint32_t (*AddRef)(void* self);
    uint32_t (*Release)(void* self);
    bool (*open)(void* self, uint32_t options);
    void (*close)(void* self, uint32_t options);
    // The caller owns the answer (a null PropertyValue when the service has none).
    PropertyValue (*copyProperty)(void* self, const char* key);
    bool (*setProperty)(void* self, const char* key, const PropertyValue* value);
    void (*setEventCallback)(void* self, HIDEventCallback callback, void* target, void* refcon);
    void (*scheduleWithDispatchQueue)(void* self, const DispatchQueueRef* queue);
    void (*unscheduleFromDispatchQueue)(void* self, const DispatchQueueRef* queue);
    HIDEventRef (*copyEvent)(void* self, uint32_t type, const HIDEventRef* matching, uint32_t options);
    Result (*setOutputEvent)(void* self, const HIDEventRef* event);
};
static_assert(offsetof(HIDServiceInterface, _reserved) == 0);
static_assert(offsetof(HIDServiceInterface, QueryInterface) == 8);
static_assert(offsetof(HIDServiceInterface, AddRef) == 16);
static_assert(offsetof(HIDServiceInterface, Release) == 24);
static_assert(offsetof(HIDServiceInterface, open) == 32);
static_assert(offsetof(HIDServiceInterface, close) == 40);
static_assert(offsetof(HIDServiceInterface, copyProperty) == 48);
static_assert(offsetof(HIDServiceInterface, setProperty) == 56);
static_assert(offsetof(HIDServiceInterface, setEventCallback) == 64);
static_assert(offsetof(HIDServiceInterface, scheduleWithDispatchQueue) == 72);
static_assert(offsetof(HIDServiceInterface, unscheduleFromDispatchQueue) == 80);
static_assert(offsetof(HIDServiceInterface, copyEvent) == 88);
static_assert(offsetof(HIDServiceInterface, setOutputEvent) == 96);
static_assert(sizeof(HIDServiceInterface) == 104);

// The one symbol the plug-in library exports: the allocator is ignored; any type other than
// kHIDServicePlugInTypeID answers null. The answer is a PlugInInterface handle holding one
// reference, which the host gives back through Release.
using PlugInFactoryFunction = void* (*)(void* allocator, UUIDBytes typeID);
inline constexpr const char* kFactorySymbol = "TolkaTouchHIDServiceFactory";

// The library's file name, installed under <libdir>/tolkatouch/.
inline constexpr const char* kPlugInFileName = "tolkatouch-hidservice.so";

}  // namespace TolkaTouch::Host

extern "C" __attribute__((visibility("default"))) void* TolkaTouchHIDServiceFactory(
    void* allocator, TolkaTouch::Host::UUIDBytes typeID);

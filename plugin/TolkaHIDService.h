#pragma once
// TolkaHIDService: the reference-counted object behind the two interface tables a host calls
// through. It builds and owns the tables, counts references (the object deletes itself when the
// last one goes), and answers every host operation with its "not supported" default until a
// derived service overrides it.

#include <atomic>
#include <cstdint>

#include "platform/DispatchQueue.h"
#include "platform/HIDEvent.h"
#include "platform/PropertyValue.h"
#include "tolkatouch/HIDServicePlugin.h"

namespace TolkaTouch {

class TolkaHIDService {
public:
    // Builds both tables; the creator holds the one reference.
    TolkaHIDService();
    TolkaHIDService(const TolkaHIDService&) = delete;
    TolkaHIDService& operator=(const TolkaHIDService&) = delete;

    void retain();
    void release();  // the last release deletes the object
    uint32_t retainCount() const;

    // Interface handles as the host sees them: the addresses of the two table pointers.
    void* getPluginInterface();
    void* getServiceInterface();

    // The object behind a handle of either table (read from the table's reserved slot).
    static TolkaHIDService* fromInterface(void* handle);

    virtual Host::Result probeWithService(uint32_t service, const PropertyValue* properties, int32_t* outScore);
    virtual Host::Result startWithService(uint32_t service, const PropertyValue* properties);
    virtual Host::Result stop();
    virtual bool openWithOptions(uint32_t options);
    virtual void closeWithOptions(uint32_t options);
    virtual PropertyValue getPropertyForKey(const char* key);
    virtual bool setProperty(const PropertyValue& value, const char* key);
    virtual void setEventCallback(Host::HIDEventCallback callback, void* target, void* refcon);
    virtual void scheduleWithDispatchQueue(const DispatchQueueRef& queue);
    virtual void unscheduleWithDispatchQueue(const DispatchQueueRef& queue);
    virtual HIDEventRef copyEventWithType(uint32_t type, const HIDEventRef& matching, uint32_t options);
    virtual Host::Result setOutputEvent(const HIDEventRef& event);

protected:
    // Only release() deletes.
    virtual ~TolkaHIDService();

    // Frees the service table, then the plug-in table; a derived service calls it at the point of
    // its own teardown where the tables must go, the destructor again (a no-op by then).
    void freeInterfaceTables();

private:
    Host::PlugInInterface* _pluginInterface;
    Host::HIDServiceInterface* _serviceInterface;
    std::atomic<uint32_t> _retainCount{1};
};

}  // namespace TolkaTouch

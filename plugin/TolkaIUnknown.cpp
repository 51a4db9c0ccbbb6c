#include "plugin/TolkaIUnknown.h"

#include <exception>

#include "platform/Log.h"
#include "plugin/TolkaHIDService.h"

namespace TolkaTouch::TolkaIUnknown {

namespace {

TolkaHIDService* serviceOf(void* self) {
    return TolkaHIDService::fromInterface(self);
}

// A host operation must not let an exception reach the host's code: it is logged and the
// operation answers its "not supported" value.
void logEscapedException(const char* operation) {
    Log log("com.zantor.hid.TolkaTouch", "HIDService");
    try {
        throw;
    } catch (const std::exception& e) {
        log.error("%s failed: %s", operation, e.what());
    } catch (...) {
        log.error("%s failed", operation);
    }
}

// Holds one reference on the service for the length of a shim, so the object cannot go away in
// the middle of the call, even when the call itself drops the host's last reference.
class TemporaryReference {
public:
    explicit TemporaryReference(TolkaHIDService* service) : _service(service) { _service->retain(); }
    ~TemporaryReference() { _service->release(); }
    TemporaryReference(const TemporaryReference&) = delete;
    TemporaryReference& operator=(const TemporaryReference&) = delete;

private:
    TolkaHIDService* _service;
};

}  // namespace

Host::Result QueryInterface(void* self, Host::UUIDBytes interfaceID, void** outInterface) {
    TolkaHIDService* service = serviceOf(self);
    TemporaryReference hold(service);
    // Only the base lifetime interface and the service interface are answered; the plug-in
    // interface is reached through the factory and the base identifier.
    if (interfaceID == Host::kIUnknownInterfaceID) {
        *outInterface = service->getPluginInterface();
    } else if (interfaceID == Host::kHIDServiceInterfaceID) {
        *outInterface = service->getServiceInterface();
    } else {
        return Host::kResultNoInterface;
    }
    service->retain();
    return Host::kResultSuccess;
}

// The count is read while the temporary reference is held, so the answer is one above what
// remains once the call returns. Hosts treat it as informational; it is kept as it is.
uint32_t AddRef(void* self) {
    TolkaHIDService* service = serviceOf(self);
    uint32_t count;
    {
        TemporaryReference hold(service);
        count = service->retainCount();
        service->retain();
    }
    return count + 1;
}

uint32_t Release(void* self) {
    TolkaHIDService* service = serviceOf(self);
    uint32_t count;
    {
        TemporaryReference hold(service);
        count = service->retainCount();
        service->release();
    }
    return count - 1;
}

Host::Result Probe(void* self, const PropertyValue* matchingProperties, uint32_t service, int32_t* outScore) {
    try {
        return serviceOf(self)->probeWithService(service, matchingProperties, outScore);
    } catch (...) {
        logEscapedException("probeWithService:properties:outScore:");
        return Host::kResultUnsupported;
    }
}

Host::Result Start(void* self, const PropertyValue* properties, uint32_t service) {
    try {
        return serviceOf(self)->startWithService(service, properties);
    } catch (...) {
        logEscapedException("startWithService:properties:");
        return Host::kResultUnsupported;
    }
}

Host::Result Stop(void* self) {
    try {
        return serviceOf(self)->stop();
    } catch (...) {
        logEscapedException("stop");
        return Host::kResultUnsupported;
    }
}

bool open(void* self, uint32_t options) {
    try {
        return serviceOf(self)->openWithOptions(options);
    } catch (...) {
        logEscapedException("openWithOptions:");
        return false;
    }
}

void close(void* self, uint32_t options) {
    try {
        serviceOf(self)->closeWithOptions(options);
    } catch (...) {
        logEscapedException("closeWithOptions:");
    }
}

PropertyValue copyProperty(void* self, const char* key) {
    try {
        return serviceOf(self)->getPropertyForKey(key);
    } catch (...) {
        logEscapedException("getPropertyForKey:");
        return {};
    }
}

bool setProperty(void* self, const char* key, const PropertyValue* value) {
    try {
        return serviceOf(self)->setProperty(value ? *value : PropertyValue(), key);
    } catch (...) {
        logEscapedException("setProperty:forKey:");
        return false;
    }
}

void setEventCallback(void* self, Host::HIDEventCallback callback, void* target, void* refcon) {
    try {
        serviceOf(self)->setEventCallback(callback, target, refcon);
    } catch (...) {
        logEscapedException("setEventCallback:target:refcon:");
    }
}

void scheduleWithDispatchQueue(void* self, const DispatchQueueRef* queue) {
    try {
        serviceOf(self)->scheduleWithDispatchQueue(queue ? *queue : DispatchQueueRef());
    } catch (...) {
        logEscapedException("scheduleWithDispatchQueue:");
    }
}

void unscheduleFromDispatchQueue(void* self, const DispatchQueueRef* queue) {
    try {
        serviceOf(self)->unscheduleWithDispatchQueue(queue ? *queue : DispatchQueueRef());
    } catch (...) {
        logEscapedException("unscheduleWithDispatchQueue:");
    }
}

HIDEventRef copyEvent(void* self, uint32_t type, const HIDEventRef* matching, uint32_t options) {
    try {
        return serviceOf(self)->copyEventWithType(type, matching ? *matching : HIDEventRef(), options);
    } catch (...) {
        logEscapedException("copyEventWithType:matching:options:");
        return nullptr;
    }
}

Host::Result setOutputEvent(void* self, const HIDEventRef* event) {
    try {
        return serviceOf(self)->setOutputEvent(event ? *event : HIDEventRef());
    } catch (...) {
        logEscapedException("setOutputEvent:");
        return Host::kResultUnsupported;
    }
}

}  // namespace TolkaTouch::TolkaIUnknown

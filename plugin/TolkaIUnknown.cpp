#include "plugin/TolkaIUnknown.h"

#include <exception>
#include <type_traits>

#include "platform/Log.h"
#include "plugin/TolkaHIDService.h"

namespace TolkaTouch::TolkaIUnknown {

namespace {

TolkaHIDService* serviceOf(void* self) {
    return TolkaHIDService::fromInterface(self);
}

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

// What a table slot that answers nothing answers when its operation fails.
struct Nothing {};
constexpr Nothing kNothing;

// Runs one host operation. An exception must not reach the host's code: it is logged under the
// operation's selector and the slot answers `failure` instead.
template <typename Failure, typename Call>
auto shielded(const char* selector, [[maybe_unused]] Failure failure, Call&& call) -> std::invoke_result_t<Call> {
    using Answer = std::invoke_result_t<Call>;
    try {
        return call();
    } catch (...) {
        logEscapedException(selector);
        if constexpr (!std::is_void_v<Answer>) return Answer(failure);
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
        return HIDResult::NoInterface;
    }
    service->retain();
    return HIDResult::Success;
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
    return shielded("probeWithService:properties:outScore:", HIDResult::Unsupported,
                    [&] { return serviceOf(self)->probeWithService(service, matchingProperties, outScore); });
}

Host::Result Start(void* self, const PropertyValue* properties, uint32_t service) {
    return shielded("startWithService:properties:", HIDResult::Unsupported,
                    [&] { return serviceOf(self)->startWithService(service, properties); });
}

Host::Result Stop(void* self) {
    return shielded("stop", HIDResult::Unsupported, [&] { return serviceOf(self)->stop(); });
}

bool open(void* self, uint32_t options) {
    return shielded("openWithOptions:", false, [&] { return serviceOf(self)->openWithOptions(options); });
}

void close(void* self, uint32_t options) {
    shielded("closeWithOptions:", kNothing, [&] { serviceOf(self)->closeWithOptions(options); });
}

PropertyValue copyProperty(void* self, const char* key) {
    return shielded("getPropertyForKey:", PropertyValue(), [&] { return serviceOf(self)->getPropertyForKey(key); });
}

bool setProperty(void* self, const char* key, const PropertyValue* value) {
    return shielded("setProperty:forKey:", false,
                    [&] { return serviceOf(self)->setProperty(value ? *value : PropertyValue(), key); });
}

void setEventCallback(void* self, Host::HIDEventCallback callback, void* target, void* refcon) {
    shielded("setEventCallback:target:refcon:", kNothing,
             [&] { serviceOf(self)->setEventCallback(callback, target, refcon); });
}

void scheduleWithDispatchQueue(void* self, const DispatchQueueRef* queue) {
    shielded("scheduleWithDispatchQueue:", kNothing,
             [&] { serviceOf(self)->scheduleWithDispatchQueue(queue ? *queue : DispatchQueueRef()); });
}

void unscheduleFromDispatchQueue(void* self, const DispatchQueueRef* queue) {
    shielded("unscheduleWithDispatchQueue:", kNothing,
             [&] { serviceOf(self)->unscheduleWithDispatchQueue(queue ? *queue : DispatchQueueRef()); });
}

HIDEventRef copyEvent(void* self, uint32_t type, const HIDEventRef* matching, uint32_t options) {
    return shielded("copyEventWithType:matching:options:", HIDEventRef(), [&] {
        return serviceOf(self)->copyEventWithType(type, matching ? *matching : HIDEventRef(), options);
    });
}

Host::Result setOutputEvent(void* self, const HIDEventRef* event) {
    return shielded("setOutputEvent:", HIDResult::Unsupported,
                    [&] { return serviceOf(self)->setOutputEvent(event ? *event : HIDEventRef()); });
}

}  // namespace TolkaTouch::TolkaIUnknown

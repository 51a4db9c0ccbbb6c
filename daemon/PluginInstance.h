#pragma once
// PluginInstance: one HID service from the plug-in, serving one device, reached only through the
// plug-in's two interface tables. Brought up in the host's order (probe, start, open, event
// callback, schedule on the daemon's dispatch queue) and torn down in the reverse one (unschedule,
// close, stop, release). Properties are read and written from any thread; the service locks, and
// the teardown waits for a property call in progress (after it, they answer nothing).

#include <cstdint>
#include <shared_mutex>
#include <string>

#include "daemon/PluginLibrary.h"
#include "platform/DispatchQueue.h"
#include "platform/PropertyValue.h"

namespace TolkaTouch {

class PluginInstance {
public:
    struct EventCallback {
        Host::HIDEventCallback function = nullptr;
        void* target = nullptr;
        void* refcon = nullptr;
    };

    // Creates the service for the registered service handle `service` and brings it up; events
    // then arrive on `queue`. Throws std::runtime_error naming the step that failed, after undoing
    // the steps that succeeded.
    PluginInstance(const PluginLibrary& library, uint32_t service, const PropertyValue& matching,
                   EventCallback callback, DispatchQueueRef queue);
    ~PluginInstance();  // tears down, if shutdown() has not
    PluginInstance(const PluginInstance&) = delete;
    PluginInstance& operator=(const PluginInstance&) = delete;

    uint32_t service() const { return _service; }

    // Unschedule (the input report thread has ended when it returns), close, stop, release.
    // Events already queued on the dispatch queue may still arrive afterwards. Idempotent.
    void shutdown();

    PropertyValue copyProperty(const std::string& key) const;
    // As copyProperty, but null at once while the teardown holds the instance: for the service's
    // own report thread, which the teardown waits for.
    PropertyValue tryCopyProperty(const std::string& key) const;
    bool setProperty(const std::string& key, const PropertyValue& value);

private:
    void undo();

    uint32_t _service;
    DispatchQueueRef _queue;
    // Property calls hold it shared; the teardown holds it alone.
    mutable std::shared_mutex _lifetime;
    Host::PlugInInterface** _plugin = nullptr;
    Host::HIDServiceInterface** _hidService = nullptr;
    bool _started = false;
    bool _opened = false;
    bool _scheduled = false;
};

}  // namespace TolkaTouch

#include "daemon/PluginInstance.h"

#include <cstdio>
#include <mutex>
#include <stdexcept>

namespace TolkaTouch {

namespace {
std::string hex(uint32_t code) {
    char text[16];
    std::snprintf(text, sizeof(text), "0x%08x", code);
    return text;
}
}  // namespace

PluginInstance::PluginInstance(const PluginLibrary& library, uint32_t service, const PropertyValue& matching,
                               EventCallback callback, DispatchQueueRef queue)
    : _service(service), _queue(std::move(queue)) {
    std::string name = "service " + std::to_string(service);
    _plugin = library.createService();
    if (!_plugin) throw std::runtime_error("the plug-in's factory made no service for " + name);

    void* interface = nullptr;
    Host::Result result = (*_plugin)->QueryInterface(_plugin, Host::kHIDServiceInterfaceID, &interface);
    if (result != HIDResult::Success || !interface) {
        undo();
        throw std::runtime_error("the plug-in offers no HID service interface (" + hex(result) + ")");
    }
    _hidService = static_cast<Host::HIDServiceInterface**>(interface);

    int32_t score = 0;
    result = (*_plugin)->Probe(_plugin, &matching, service, &score);
    if (result != HIDResult::Success) {
        undo();
        throw std::runtime_error("probe of " + name + " failed (" + hex(result) + ")");
    }
    result = (*_plugin)->Start(_plugin, &matching, service);
    _started = true;  // a failed start is still followed by stop, as the service expects
    if (result != HIDResult::Success) {
        undo();
        throw std::runtime_error("start of " + name + " failed (" + hex(result) + ")");
    }
    if (!(*_hidService)->open(_hidService, 0)) {
        undo();
        throw std::runtime_error("open of " + name + " failed");
    }
    _opened = true;
    (*_hidService)->setEventCallback(_hidService, callback.function, callback.target, callback.refcon);
    (*_hidService)->scheduleWithDispatchQueue(_hidService, &_queue);
    _scheduled = true;
}

PluginInstance::~PluginInstance() {
    shutdown();
}

void PluginInstance::shutdown() {
    std::unique_lock lock(_lifetime);
    undo();
}

void PluginInstance::undo() {
    if (_scheduled) {
        (*_hidService)->unscheduleFromDispatchQueue(_hidService, &_queue);
        _scheduled = false;
    }
    if (_opened) {
        (*_hidService)->close(_hidService, 0);
        _opened = false;
    }
    if (_started) {
        (*_plugin)->Stop(_plugin);
        _started = false;
    }
    if (_hidService) {
        (*_hidService)->Release(_hidService);
        _hidService = nullptr;
    }
    if (_plugin) {
        (*_plugin)->Release(_plugin);
        _plugin = nullptr;
    }
}

PropertyValue PluginInstance::copyProperty(const std::string& key) const {
    std::shared_lock lock(_lifetime);
    if (!_hidService) return PropertyValue();
    return (*_hidService)->copyProperty(_hidService, key.c_str());
}

PropertyValue PluginInstance::tryCopyProperty(const std::string& key) const {
    std::shared_lock lock(_lifetime, std::try_to_lock);
    if (!lock.owns_lock() || !_hidService) return PropertyValue();
    return (*_hidService)->copyProperty(_hidService, key.c_str());
}

bool PluginInstance::setProperty(const std::string& key, const PropertyValue& value) {
    std::shared_lock lock(_lifetime);
    if (!_hidService) return false;
    return (*_hidService)->setProperty(_hidService, key.c_str(), &value);
}

}  // namespace TolkaTouch

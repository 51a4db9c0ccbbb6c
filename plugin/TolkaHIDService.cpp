#include "plugin/TolkaHIDService.h"

#include <cstdlib>

#include "plugin/TolkaIUnknown.h"

namespace TolkaTouch {

// The tables are plain heap blocks, as the host's component model lays them out: only the slots
// are written, the plug-in table's padding after the revision is left as it comes. A failed
// allocation is not handled; the process cannot serve a host without its tables anyway.
TolkaHIDService::TolkaHIDService() {
    _pluginInterface = static_cast<Host::PlugInInterface*>(std::malloc(sizeof(Host::PlugInInterface)));
    _pluginInterface->_reserved = static_cast<void*>(this);
    _pluginInterface->QueryInterface = TolkaIUnknown::QueryInterface;
    _pluginInterface->AddRef = TolkaIUnknown::AddRef;
    _pluginInterface->Release = TolkaIUnknown::Release;
    _pluginInterface->version = 1;
    _pluginInterface->revision = 0;
    _pluginInterface->Probe = TolkaIUnknown::Probe;
    _pluginInterface->Start = TolkaIUnknown::Start;
    _pluginInterface->Stop = TolkaIUnknown::Stop;

    _serviceInterface = static_cast<Host::HIDServiceInterface*>(std::malloc(sizeof(Host::HIDServiceInterface)));
    _serviceInterface->_reserved = static_cast<void*>(this);
    _serviceInterface->QueryInterface = TolkaIUnknown::QueryInterface;
    _serviceInterface->AddRef = TolkaIUnknown::AddRef;
    _serviceInterface->Release = TolkaIUnknown::Release;
    _serviceInterface->open = TolkaIUnknown::open;
    _serviceInterface->close = TolkaIUnknown::close;
    _serviceInterface->copyProperty = TolkaIUnknown::copyProperty;
    _serviceInterface->setProperty = TolkaIUnknown::setProperty;
    _serviceInterface->setEventCallback = TolkaIUnknown::setEventCallback;
    _serviceInterface->scheduleWithDispatchQueue = TolkaIUnknown::scheduleWithDispatchQueue;
    _serviceInterface->unscheduleFromDispatchQueue = TolkaIUnknown::unscheduleFromDispatchQueue;
    _serviceInterface->copyEvent = TolkaIUnknown::copyEvent;
    _serviceInterface->setOutputEvent = TolkaIUnknown::setOutputEvent;
}

TolkaHIDService::~TolkaHIDService() {
    freeInterfaceTables();
}

void TolkaHIDService::freeInterfaceTables() {
    std::free(_serviceInterface);
    _serviceInterface = nullptr;
    std::free(_pluginInterface);
    _pluginInterface = nullptr;
}

void TolkaHIDService::retain() {
    _retainCount.fetch_add(1, std::memory_order_relaxed);
}

void TolkaHIDService::release() {
    if (_retainCount.fetch_sub(1, std::memory_order_acq_rel) == 1) {
        delete this;
    }
}

uint32_t TolkaHIDService::retainCount() const {
    return _retainCount.load(std::memory_order_acquire);
}

void* TolkaHIDService::getPluginInterface() {
    return &_pluginInterface;
}

void* TolkaHIDService::getServiceInterface() {
    return &_serviceInterface;
}

TolkaHIDService* TolkaHIDService::fromInterface(void* handle) {
    // Both tables start with the reserved slot, so a handle of either reads the same way.
    void* table = *static_cast<void**>(handle);
    return static_cast<TolkaHIDService*>(*static_cast<void**>(table));
}

Host::Result TolkaHIDService::probeWithService(uint32_t, const PropertyValue*, int32_t*) {
    return HIDResult::Unsupported;
}

Host::Result TolkaHIDService::startWithService(uint32_t, const PropertyValue*) {
    return HIDResult::Unsupported;
}

Host::Result TolkaHIDService::stop() {
    return HIDResult::Unsupported;
}

bool TolkaHIDService::openWithOptions(uint32_t) {
    return false;
}

void TolkaHIDService::closeWithOptions(uint32_t) {}

PropertyValue TolkaHIDService::getPropertyForKey(const char*) {
    return {};
}

bool TolkaHIDService::setProperty(const PropertyValue&, const char*) {
    return false;
}

void TolkaHIDService::setEventCallback(Host::HIDEventCallback, void*, void*) {}

void TolkaHIDService::scheduleWithDispatchQueue(const DispatchQueueRef&) {}

void TolkaHIDService::unscheduleWithDispatchQueue(const DispatchQueueRef&) {}

HIDEventRef TolkaHIDService::copyEventWithType(uint32_t, const HIDEventRef&, uint32_t) {
    return nullptr;
}

Host::Result TolkaHIDService::setOutputEvent(const HIDEventRef&) {
    return HIDResult::Unsupported;
}

}  // namespace TolkaTouch

#include "daemon/CountingHIDDevice.h"

namespace TolkaTouch {

CountingHIDDevice::CountingHIDDevice(HIDDeviceRef inner) : _inner(std::move(inner)) {}

uint64_t CountingHIDDevice::deliveredCount() const {
    std::lock_guard lock(_mutex);
    return _delivered;
}

void CountingHIDDevice::waitForDelivered(uint64_t count, const std::function<bool()>& abandon) {
    std::unique_lock lock(_mutex);
    _changed.wait(lock, [&] { return _delivered >= count || abandon(); });
}

void CountingHIDDevice::wakeWaiters() {
    std::lock_guard lock(_mutex);
    _changed.notify_all();
}

void CountingHIDDevice::registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                                    void* context) {
    if (!callback) {
        // The inner device waits for a callback in flight, after which ours is no longer used.
        _inner->registerInputReportCallback(buffer, length, nullptr, nullptr);
        _callback = nullptr;
        _context = nullptr;
        return;
    }
    _callback = callback;
    _context = context;
    _inner->registerInputReportCallback(buffer, length, &CountingHIDDevice::deliver, this);
}

void CountingHIDDevice::deliver(void* context, uint32_t result, void* sender, HIDReportType type, uint32_t reportID,
                                const uint8_t* report, size_t length, uint64_t timestamp) {
    auto* self = static_cast<CountingHIDDevice*>(context);
    self->_callback(self->_context, result, sender, type, reportID, report, length, timestamp);
    std::lock_guard lock(self->_mutex);
    ++self->_delivered;
    self->_changed.notify_all();
}

}  // namespace TolkaTouch

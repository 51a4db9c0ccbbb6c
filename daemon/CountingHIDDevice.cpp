#include "daemon/CountingHIDDevice.h"

namespace TolkaTouch {

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

void CountingHIDDevice::afterInputReport() {
    std::lock_guard lock(_mutex);
    ++_delivered;
    _changed.notify_all();
}

}  // namespace TolkaTouch

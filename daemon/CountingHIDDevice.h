#pragma once
// CountingHIDDevice: a device handle that passes every call on to another one and counts the
// input reports whose callback has returned. The simulation uses it to apply a recorded setting
// only after the service has finished with every report recorded before it, as on the device.

#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>

#include "daemon/WrappingHIDDevice.h"

namespace TolkaTouch {

class CountingHIDDevice : public WrappingHIDDevice {
public:
    explicit CountingHIDDevice(HIDDeviceRef inner) : WrappingHIDDevice(std::move(inner)) {}

    // Input reports handled by the registered callback so far.
    uint64_t deliveredCount() const;
    // Waits until `count` reports have been handled, or `abandon` answers true after a wake-up.
    void waitForDelivered(uint64_t count, const std::function<bool()>& abandon);
    // Wakes waitForDelivered so that it asks `abandon` again.
    void wakeWaiters();

protected:
    void afterInputReport() override;

private:
    mutable std::mutex _mutex;
    std::condition_variable _changed;
    uint64_t _delivered = 0;
};

}  // namespace TolkaTouch

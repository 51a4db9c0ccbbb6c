#pragma once
// CountingHIDDevice: a device handle that passes every call on to another one and counts the
// input reports whose callback has returned. The simulation uses it to apply a recorded setting
// only after the service has finished with every report recorded before it, as on the device.

#include <condition_variable>
#include <cstdint>
#include <mutex>

#include "platform/HIDDevice.h"

namespace TolkaTouch {

class CountingHIDDevice : public HIDDevice {
public:
    explicit CountingHIDDevice(HIDDeviceRef inner);

    // Input reports handled by the registered callback so far.
    uint64_t deliveredCount() const;
    // Waits until `count` reports have been handled, or `abandon` answers true after a wake-up.
    void waitForDelivered(uint64_t count, const std::function<bool()>& abandon);
    // Wakes waitForDelivered so that it asks `abandon` again.
    void wakeWaiters();

    uint32_t open(uint32_t options) override { return _inner->open(options); }
    uint32_t close(uint32_t options) override { return _inner->close(options); }
    PropertyValue getProperty(std::string_view key) const override { return _inner->getProperty(key); }
    bool setProperty(std::string_view key, PropertyValue value) override {
        return _inner->setProperty(key, std::move(value));
    }
    uint32_t getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, size_t& length) override {
        return _inner->getReport(type, reportID, buffer, length);
    }
    void registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                     void* context) override;
    void scheduleWithRunLoop(RunLoop& runLoop, const std::string& mode) override {
        _inner->scheduleWithRunLoop(runLoop, mode);
    }
    void unscheduleFromRunLoop(RunLoop& runLoop, const std::string& mode) override {
        _inner->unscheduleFromRunLoop(runLoop, mode);
    }
    void setRemovalHandler(std::function<void()> handler) override {
        _inner->setRemovalHandler(std::move(handler));
    }

private:
    static void deliver(void* context, uint32_t result, void* sender, HIDReportType type, uint32_t reportID,
                        const uint8_t* report, size_t length, uint64_t timestamp);

    HIDDeviceRef _inner;
    // Set only while no report is in flight (registration waits for a callback that runs).
    InputReportCallback _callback = nullptr;
    void* _context = nullptr;

    mutable std::mutex _mutex;
    std::condition_variable _changed;
    uint64_t _delivered = 0;
};

}  // namespace TolkaTouch

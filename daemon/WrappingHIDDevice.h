#pragma once
// WrappingHIDDevice: a device handle that passes every call on to another one, with a step of its
// own before and after the service handles each input report. What the daemon adds around a
// device (the log's context, the count of handled reports) derives from it.

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

#include "platform/HIDDevice.h"

namespace TolkaTouch {

class WrappingHIDDevice : public HIDDevice {
public:
    explicit WrappingHIDDevice(HIDDeviceRef inner) : _inner(std::move(inner)) {}

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

protected:
    // On the report thread, around the service's callback for one input report.
    virtual void beforeInputReport(const uint8_t* /*report*/, size_t /*length*/) {}
    virtual void afterInputReport() {}

private:
    static void deliver(void* context, uint32_t result, void* sender, HIDReportType type, uint32_t reportID,
                        const uint8_t* report, size_t length, uint64_t timestamp);

    HIDDeviceRef _inner;
    // Set only while no report is in flight (registration waits for a callback that runs).
    InputReportCallback _callback = nullptr;
    void* _context = nullptr;
};

}  // namespace TolkaTouch

#pragma once
// ContextHIDDevice: a device handle that passes every call on to another one and, while the
// service handles one of its input reports, gives the log the device's node, its service number and
// the report's frame number, so that every line written about the report carries them.

#include <cstdint>
#include <memory>
#include <string>

#include "platform/HIDDevice.h"

namespace TolkaTouch {

class WatchHub;

class ContextHIDDevice : public HIDDevice {
public:
    // `watch`, when given, also gets every input report while anyone watches.
    ContextHIDDevice(HIDDeviceRef inner, std::string node, uint32_t service, std::shared_ptr<WatchHub> watch = nullptr);

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
    std::string _node;
    uint32_t _service;
    std::shared_ptr<WatchHub> _watch;
    // Set only while no report is in flight (registration waits for a callback that runs).
    InputReportCallback _callback = nullptr;
    void* _context = nullptr;
};

}  // namespace TolkaTouch

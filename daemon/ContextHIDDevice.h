#pragma once
// ContextHIDDevice: a device handle that passes every call on to another one and, while the
// service handles one of its input reports, gives the log the device's node, its service number and
// the report's frame number, so that every line written about the report carries them. After an
// image report has been handled it calls the frame hook, when given (still on the report thread).

#include <cstdint>
#include <functional>
#include <memory>
#include <string>

#include "daemon/WrappingHIDDevice.h"

namespace TolkaTouch {

class WatchHub;

class ContextHIDDevice : public WrappingHIDDevice {
public:
    // `watch`, when given, also gets every input report while anyone watches.
    ContextHIDDevice(HIDDeviceRef inner, std::string node, uint32_t service, std::shared_ptr<WatchHub> watch = nullptr,
                     std::function<void()> afterFrame = nullptr);

protected:
    void beforeInputReport(const uint8_t* report, size_t length) override;
    void afterInputReport() override;

private:
    std::string _node;
    uint32_t _service;
    std::shared_ptr<WatchHub> _watch;
    std::function<void()> _afterFrame;
    bool _handlingImage = false;  // the report thread's own
};

}  // namespace TolkaTouch

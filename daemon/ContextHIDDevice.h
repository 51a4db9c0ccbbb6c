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
#include "platform/Log.h"

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
    uint32_t _service;
    std::shared_ptr<WatchHub> _watch;
    std::function<void()> _afterFrame;
    // The report thread's own: the context given to the log, only its frame changing per report.
    LogContext _context;
    bool _handlingImage = false;
};

}  // namespace TolkaTouch

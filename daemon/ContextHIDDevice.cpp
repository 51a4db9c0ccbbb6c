#include "daemon/ContextHIDDevice.h"

#include "common/Reports.h"
#include "daemon/WatchHub.h"
#include "platform/Log.h"

namespace TolkaTouch {

ContextHIDDevice::ContextHIDDevice(HIDDeviceRef inner, std::string node, uint32_t service,
                                   std::shared_ptr<WatchHub> watch, std::function<void()> afterFrame)
    : WrappingHIDDevice(std::move(inner)),
      _service(service),
      _watch(std::move(watch)),
      _afterFrame(std::move(afterFrame)),
      _context{std::move(node), service, std::nullopt} {}

void ContextHIDDevice::beforeInputReport(const uint8_t* report, size_t length) {
    if (_watch && _watch->active()) _watch->report(_service, report, length);
    const auto image = InputReport::Image::parse(report, length);
    _context.frame = image ? std::optional<uint64_t>(image->frameNumber) : std::nullopt;
    _handlingImage = image.has_value();
    SystemLog::setThreadContext(_context);
}

void ContextHIDDevice::afterInputReport() {
    if (_handlingImage && _afterFrame) _afterFrame();
    SystemLog::clearThreadContext();
}

}  // namespace TolkaTouch

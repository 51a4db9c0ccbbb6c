#include "daemon/ContextHIDDevice.h"

#include "common/Reports.h"
#include "daemon/WatchHub.h"
#include "platform/Log.h"

namespace TolkaTouch {

ContextHIDDevice::ContextHIDDevice(HIDDeviceRef inner, std::string node, uint32_t service,
                                   std::shared_ptr<WatchHub> watch, std::function<void()> afterFrame)
    : WrappingHIDDevice(std::move(inner)),
      _node(std::move(node)),
      _service(service),
      _watch(std::move(watch)),
      _afterFrame(std::move(afterFrame)) {}

void ContextHIDDevice::beforeInputReport(const uint8_t* report, size_t length) {
    if (_watch && _watch->active()) _watch->report(_service, report, length);
    LogContext logContext{_node, _service, std::nullopt};
    const auto image = InputReport::Image::parse(report, length);
    if (image) logContext.frame = image->frameNumber;
    _handlingImage = image.has_value();
    SystemLog::setThreadContext(std::move(logContext));
}

void ContextHIDDevice::afterInputReport() {
    if (_handlingImage && _afterFrame) _afterFrame();
    SystemLog::clearThreadContext();
}

}  // namespace TolkaTouch

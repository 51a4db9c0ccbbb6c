#include "daemon/ContextHIDDevice.h"

#include "common/Reports.h"
#include "daemon/WatchHub.h"
#include "platform/Log.h"

namespace TolkaTouch {

ContextHIDDevice::ContextHIDDevice(HIDDeviceRef inner, std::string node, uint32_t service,
                                   std::shared_ptr<WatchHub> watch)
    : WrappingHIDDevice(std::move(inner)), _node(std::move(node)), _service(service), _watch(std::move(watch)) {}

void ContextHIDDevice::beforeInputReport(const uint8_t* report, size_t length) {
    if (_watch && _watch->active()) _watch->report(_service, report, length);
    LogContext logContext{_node, _service, std::nullopt};
    if (auto image = InputReport::Image::parse(report, length)) logContext.frame = image->frameNumber;
    SystemLog::setThreadContext(std::move(logContext));
}

void ContextHIDDevice::afterInputReport() { SystemLog::clearThreadContext(); }

}  // namespace TolkaTouch

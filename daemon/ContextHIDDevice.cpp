#include "daemon/ContextHIDDevice.h"

#include "common/Reports.h"
#include "daemon/WatchHub.h"
#include "platform/Log.h"

namespace TolkaTouch {

ContextHIDDevice::ContextHIDDevice(HIDDeviceRef inner, std::string node, uint32_t service,
                                   std::shared_ptr<WatchHub> watch)
    : _inner(std::move(inner)), _node(std::move(node)), _service(service), _watch(std::move(watch)) {}

void ContextHIDDevice::registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                                   void* context) {
    if (!callback) {
        // The inner device waits for a callback in flight, after which ours is no longer used.
        _inner->registerInputReportCallback(buffer, length, nullptr, nullptr);
        _callback = nullptr;
        _context = nullptr;
        return;
    }
    _callback = callback;
    _context = context;
    _inner->registerInputReportCallback(buffer, length, &ContextHIDDevice::deliver, this);
}

void ContextHIDDevice::deliver(void* context, uint32_t result, void* sender, HIDReportType type, uint32_t reportID,
                               const uint8_t* report, size_t length, uint64_t timestamp) {
    auto* self = static_cast<ContextHIDDevice*>(context);
    if (self->_watch && self->_watch->active()) self->_watch->report(self->_service, report, length);
    LogContext logContext{self->_node, self->_service, std::nullopt};
    if (auto image = InputReport::Image::parse(report, length)) logContext.frame = image->frameNumber;
    SystemLog::setThreadContext(std::move(logContext));
    self->_callback(self->_context, result, sender, type, reportID, report, length, timestamp);
    SystemLog::clearThreadContext();
}

}  // namespace TolkaTouch

#include "daemon/WrappingHIDDevice.h"

namespace TolkaTouch {

void WrappingHIDDevice::registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
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
    _inner->registerInputReportCallback(buffer, length, &WrappingHIDDevice::deliver, this);
}

void WrappingHIDDevice::deliver(void* context, uint32_t result, void* sender, HIDReportType type, uint32_t reportID,
                                const uint8_t* report, size_t length, uint64_t timestamp) {
    auto* self = static_cast<WrappingHIDDevice*>(context);
    self->beforeInputReport(report, length);
    self->_callback(self->_context, result, sender, type, reportID, report, length, timestamp);
    self->afterInputReport();
}

}  // namespace TolkaTouch

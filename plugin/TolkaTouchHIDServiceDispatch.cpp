// Report intake on the input report thread, the pipeline's probes, and the delivery of events to
// the host's callback on the host's dispatch queue.
#include <cinttypes>

#include "platform/Trace.h"
#include "plugin/TolkaTouchHIDService.h"

namespace TolkaTouch {

namespace {

// Kernel trace point codes: class 0x2B, subclass 0x15, a code of their own, no function qualifier.
constexpr uint32_t traceCode(uint32_t traceClass, uint32_t subclass, uint32_t code) {
    return (traceClass << 24) | (subclass << 16) | (code << 2);
}
constexpr uint32_t kTraceInputReport = traceCode(0x2B, 0x15, 0x60);
constexpr uint32_t kTraceDispatchLanded = traceCode(0x2B, 0x15, 0x61);
constexpr uint32_t kTraceDispatchEvent = traceCode(0x2B, 0x15, 0x62);
constexpr uint32_t kTraceFirmwareEvent = traceCode(0x2B, 0x15, 0x63);
static_assert(kTraceInputReport == 0x2B150180 && kTraceDispatchLanded == 0x2B150184);
static_assert(kTraceDispatchEvent == 0x2B150188 && kTraceFirmwareEvent == 0x2B15018C);

uint64_t byteOrZero(const uint8_t* report, uint64_t length, uint64_t index) {
    return index < length ? report[index] : 0;
}

}  // namespace

void TolkaTouchHIDService::handleInputReport(int32_t type, uint8_t reportID, const uint8_t* report,
                                             uint64_t length, uint64_t timestamp) {
    if (_log.debugEnabled()) {
        _log.debug("Received input report (type %ju, reportID %ju, reportLength %ju, timestampMach %ju)",
                   static_cast<uintmax_t>(type), static_cast<uintmax_t>(reportID), static_cast<uintmax_t>(length),
                   static_cast<uintmax_t>(timestamp));
    }
    // The time stamp is only logged: the recording stamps the report with its own clock reading.
    std::lock_guard lock(_pipelineLock);
    _recording.handleInputReport(report, length);
}

void TolkaTouchHIDService::installProbes(const DispatchEventInfo* dispatchEventInfo) {
    _pipeline->inputReportProbe = [this](const uint8_t* report, size_t length) { inputReportProbe(report, length); };
    _pipeline->invalidInputReportProbe = [this](const uint8_t* report, size_t length) {
        invalidInputReportProbe(report, length);
    };
    _pipeline->firmwareEventProbe = [this](const InputReport::FirmwareEvent& event) { firmwareEventProbe(event); };
    _pipeline->imageProbe = [this](const InputReport::Image& image) { imageProbe(image); };
    _pipeline->disjointImageProbe = [this](uint32_t previousFrameNumber, const InputReport::Image& image) {
        disjointImageProbe(previousFrameNumber, image);
    };
    _pipeline->hidEventsProbe = [this, dispatchEventInfo](const EventList& events) {
        hidEventsProbe(events, *dispatchEventInfo);
    };
}

void TolkaTouchHIDService::removeProbes() {
    _pipeline->inputReportProbe = nullptr;
    _pipeline->invalidInputReportProbe = nullptr;
    _pipeline->firmwareEventProbe = nullptr;
    _pipeline->imageProbe = nullptr;
    _pipeline->disjointImageProbe = nullptr;
    _pipeline->hidEventsProbe = nullptr;
}

void TolkaTouchHIDService::inputReportProbe(const uint8_t* report, uint64_t length) {
    _log.debug("%s", "Input report probe");
    Trace::point(kTraceInputReport, byteOrZero(report, length, 0), byteOrZero(report, length, 1),
                 byteOrZero(report, length, 2), byteOrZero(report, length, 3));
}

void TolkaTouchHIDService::invalidInputReportProbe(const uint8_t* report, uint64_t length) {
    if (length != 0) {
        _log.debug("Invalid input report with ID %ju", static_cast<uintmax_t>(report[0]));
    } else {
        _log.debug("%s", "Invalid input report len==0");
    }
}

void TolkaTouchHIDService::firmwareEventProbe(const InputReport::FirmwareEvent& event) {
    uint64_t context = event.contextValue();
    _log.log("Firmware event probe; event: %jx, context: %jx", static_cast<uintmax_t>(event.event),
             static_cast<uintmax_t>(context));
    Trace::point(kTraceFirmwareEvent, event.event, context, 0, 0);
}

void TolkaTouchHIDService::imageProbe(const InputReport::Image& image) {
    _log.log("Received image frame: %ju", static_cast<uintmax_t>(image.frameNumber));
}

void TolkaTouchHIDService::disjointImageProbe(uint32_t previousFrameNumber, const InputReport::Image& image) {
    _log.error("Disjoint image (frame number: %ju -> %ju)\n\n", static_cast<uintmax_t>(previousFrameNumber),
               static_cast<uintmax_t>(image.frameNumber));
}

// Runs on the input report thread with _pipelineLock held: it only queues the delivery and never
// waits for the host.
void TolkaTouchHIDService::hidEventsProbe(const EventList& events, const DispatchEventInfo& dispatchEventInfo) {
    EventList probed = events;
    if (_log.debugEnabled()) _log.debug("HID events probe: %ju event(s)", static_cast<uintmax_t>(probed.size()));
    if (probed.empty()) return;
    if (_log.debugEnabled()) _log.debug("Dispatch %ju event(s) takeoff", static_cast<uintmax_t>(probed.size()));

    DispatchQueueRef queue = dispatchEventInfo.queue;
    if (!queue) return;  // scheduled without a queue: nowhere to deliver

    // The task keeps the service alive until it has run: a delivery queued just before the host's
    // last Release still finds its log.
    retain();
    std::shared_ptr<TolkaTouchHIDService> service(this, [](TolkaTouchHIDService* held) { held->release(); });
    queue->async([service, events = EventList(probed), info = DispatchEventInfo(dispatchEventInfo)]() mutable {
        service->dispatchEvents(events, info);
        events.clear();
        info.queue.reset();
    });
}

// Runs on the host's dispatch queue, one task per report, in the order of the reports.
void TolkaTouchHIDService::dispatchEvents(const EventList& events, const DispatchEventInfo& dispatchEventInfo) {
    Trace::point(kTraceDispatchLanded, events.size(), 0, 0, 0);
    if (_log.debugEnabled()) _log.debug("Dispatch %ju event(s) land", static_cast<uintmax_t>(events.size()));
    for (const HIDEventRef& event : events) {
        Trace::point(kTraceDispatchEvent, static_cast<uint32_t>(event->type), event->phase, 0, 0);
        _log.log("Dispatch event: %s", event->description().c_str());
        dispatchEventInfo.callback(dispatchEventInfo.target, dispatchEventInfo.refcon, dispatchEventInfo.sender,
                                   event, 0);
    }
}

}  // namespace TolkaTouch

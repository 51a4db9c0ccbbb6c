#include "pipeline/Pipeline.h"

#include <utility>

#include "common/Util.h"
#include "tolkatouch/Gesture.h"

namespace TolkaTouch {

namespace {
const std::string kAlgsDomain = "Algs";
}

void Pipeline::setTime(uint64_t time) {
    if (setTimeProbe) setTimeProbe(time);
    currentTime = time;
}

void Pipeline::setState(const std::string& key, PropertyValue value) {
    if (setStateProbe) setStateProbe(key, value);
    std::string algsKey = key;
    // The pipeline has no writable state of its own; only the recognizer's keys go anywhere.
    if (Util::stripDomainFromKey(algsKey, kAlgsDomain)) algs.setState(algsKey, std::move(value));
}

PropertyValue Pipeline::getState(const std::string& key) const {
    if (getStateProbe) getStateProbe(key);
    std::string algsKey = key;
    if (Util::stripDomainFromKey(algsKey, kAlgsDomain)) return algs.getState(algsKey);
    if (key == "DebugInfo") {
        return PropertyValue(PropertyValue::Dictionary{
            {"ResetCount", PropertyValue(resetCount)},
            {"DisjointImageCount", PropertyValue(disjointImageCount)},
        });
    }
    return PropertyValue();
}

void Pipeline::handleInputReport(const uint8_t* bytes, size_t length) {
    if (inputReportProbe) inputReportProbe(bytes, length);
    if (auto event = InputReport::FirmwareEvent::parse(bytes, length)) {
        handleFirmwareEvent(*event);
        return;
    }
    auto image = InputReport::Image::parse(bytes, length);
    if (!image) {
        if (invalidInputReportProbe) invalidInputReportProbe(bytes, length);
        return;
    }
    handleImage(*image);
}

void Pipeline::handleFirmwareEvent(const InputReport::FirmwareEvent& event) {
    if (firmwareEventProbe) firmwareEventProbe(event);
    // Other firmware notices are only observed.
    if (event.event != InputReport::FirmwareEvent::kReset) return;
    ++resetCount;
    // An all-zero frame lets the recognizer end a touch that was in progress at the reset.
    EventList events = algs.handleReset();
    events.push_back(GestureCodec::encode(GestureKind::Reset));
    handleHIDEvents(events);
    // The frame counter is left alone: a firmware that restarts its numbering after a reset is
    // counted once as disjoint.
}

void Pipeline::handleImage(const InputReport::Image& image) {
    if (imageProbe) imageProbe(image);
    if (hasLastFrame && image.frameNumber != static_cast<uint32_t>(lastFrameNumber + 1u)) {
        ++disjointImageCount;
        if (disjointImageProbe) disjointImageProbe(lastFrameNumber, image);
    }
    lastFrameNumber = image.frameNumber;
    hasLastFrame = true;
    EventList events = algs.handleImage(image);
    handleHIDEvents(events);
}

void Pipeline::handleHIDEvents(const EventList& events) {
    for (const HIDEventRef& event : events) event->timestamp = currentTime;
    if (hidEventsProbe && !events.empty()) hidEventsProbe(events);
}

}  // namespace TolkaTouch

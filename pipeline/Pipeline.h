#pragma once
// Pipeline: the single road from raw device reports to host events. It tells firmware events
// from images, checks frame-number continuity, runs images (and firmware resets) through the
// touch recognizer it owns, stamps the resulting events with its current time and hands them to
// hidEventsProbe. State keys "Algs.<key>" are routed to the recognizer; "DebugInfo" answers the
// pipeline's own two counters.
//
// Public API (single-threaded; the owner serialises every call and every probe with one lock):
//   void setTime(uint64_t ticks);                                    // setTimeProbe, then currentTime = ticks
//   void setState(const std::string& key, PropertyValue value);      // setStateProbe; "Algs." keys to algs
//   void handleInputReport(const uint8_t* bytes, size_t length);    // parse, count, recognise, stamp, emit
//   PropertyValue getState(const std::string& key) const;            // getStateProbe; "Algs." keys, "DebugInfo"
//   void handleHIDEvents(const EventList& events);                   // stamp with currentTime, then hidEventsProbe
// Probes are plain std::function members: assign them directly, each may stay empty.

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>

#include "algs/Algs.h"
#include "pipeline/PipelineInput.h"
#include "pipeline/PipelineOutput.h"
#include "common/Reports.h"
#include "platform/EventList.h"
#include "platform/HIDEvent.h"
#include "platform/PropertyValue.h"

namespace TolkaTouch {

class Pipeline final : public PipelineInput, public PipelineOutput {
public:
    Pipeline() = default;

    void setTime(uint64_t time) override;
    void setState(const std::string& key, PropertyValue value) override;
    void handleInputReport(const uint8_t* bytes, size_t length) override;
    PropertyValue getState(const std::string& key) const override;

    // Stamps every event with currentTime, even when nobody listens, and passes a non-empty list
    // to hidEventsProbe.
    void handleHIDEvents(const EventList& events);

    // Observers of each step, called synchronously on the calling thread.
    std::function<void(uint64_t time)> setTimeProbe;
    std::function<void(const std::string& key, const PropertyValue& value)> setStateProbe;
    std::function<void(const uint8_t* bytes, size_t length)> inputReportProbe;
    std::function<void(const uint8_t* bytes, size_t length)> invalidInputReportProbe;
    std::function<void(const InputReport::FirmwareEvent& event)> firmwareEventProbe;
    std::function<void(const InputReport::Image& image)> imageProbe;
    std::function<void(uint32_t previousFrameNumber, const InputReport::Image& image)> disjointImageProbe;
    std::function<void(const EventList& events)> hidEventsProbe;
    std::function<void(const std::string& key)> getStateProbe;

    uint64_t currentTime = 0;     // host clock ticks; the time stamp of every event produced
    uint32_t lastFrameNumber = 0; // frame number of the last accepted image
    bool hasLastFrame = false;    // whether lastFrameNumber is valid
    uint32_t resetCount = 0;          // firmware resets seen ("ResetCount")
    uint32_t disjointImageCount = 0;  // images not numbered previous + 1 ("DisjointImageCount")

    Algs algs;

private:
    void handleFirmwareEvent(const InputReport::FirmwareEvent& event);
    void handleImage(const InputReport::Image& image);
};

}  // namespace TolkaTouch

#pragma once
// Algs: the touch recognizer's driver. Turns one image frame into at most one gesture event and
// keeps the recognizer's settings and counters, reachable by state key.
// (Interface agreed with the pipeline; the touch-recognition work fills in the members.)

#include <cstdint>
#include <string>

#include "pipeline/common/Reports.h"
#include "platform/HIDEvent.h"
#include "platform/PropertyValue.h"

namespace TolkaTouch {

class Algs {
public:
    Algs();

    EventList handleImage(const InputReport::Image& image);
    EventList handleReset();
    void processTouchFrame(const int16_t* readings, uint32_t frameNumber, uint32_t timeMs, EventList& out);
    void Reset();

    PropertyValue getState(const std::string& key) const;
    void setState(const std::string& key, PropertyValue value);

    static HIDEventRef createMayBeginEvent(PixelRegion region);
    static HIDEventRef createHoldStartEvent(PixelRegion region);
    static HIDEventRef createHoldChangeEvent(PixelRegion region);
    static HIDEventRef createHoldEndEvent(PixelRegion region);
    static HIDEventRef createTapEvent(PixelRegion region);
    static HIDEventRef createCancelEvent();
};

}  // namespace TolkaTouch

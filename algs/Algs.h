#pragma once
// Algs: the touch recognizer's driver. Turns one image frame into at most one gesture event and
// keeps the recognizer's settings and counters, reachable by state key.
// Owned by value by the pipeline, which serialises every call.

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "algs/EventStats.h"
#include "algs/HandStats.h"
#include "algs/Pixel.h"
#include "algs/PixelBank.h"
#include "algs/VirtualImage.h"
#include "algs/VirtualPixel.h"
#include "common/Reports.h"
#include "platform/EventList.h"
#include "platform/HIDEvent.h"
#include "platform/Log.h"
#include "platform/PropertyValue.h"
#include "tolkatouch/FrameSnapshot.h"

namespace TolkaTouch {

class Algs {
public:
    // Gains of pixels A..O. They are uneven by design (the sensing pixels differ in size and
    // coupling) and must be kept exactly.
    static constexpr std::array<float, kPixelCount> pixelGains{
        1.9219f, 1.8833f, 1.9281f, 1.8837f, 1.9163f, 1.8105f, 1.0081f, 1.0f,
        1.4851f, 1.5033f, 2.4154f, 1.5378f, 1.5431f, 1.04f,   1.0493f,
    };

    Algs();

    EventList handleImage(const InputReport::Image& image);
    // A firmware reset: an all-zero frame (number 0, time 0) ends any touch by the ordinary rules.
    EventList handleReset();
    void processTouchFrame(const int16_t* readings, uint32_t frameNumber, uint32_t timeMs, EventList& out);
    // Closes a touch's statistics: the pixels' per-touch fields and the hand's score record.
    void Reset();

    PropertyValue getState(const std::string& key) const;
    void setState(const std::string& key, PropertyValue value);

    // What the last frame did, and every number it left: what the counters, the description
    // lines, evaluation and plots read.
    const FrameVerdict& verdict() const { return _verdict; }
    FrameSnapshot snapshot() const;

    // One line each of the state a frame left, for people tuning the recognizer.
    std::string touchStateDescription(const int16_t* readings, uint32_t timeMs) const;
    std::string virtualStateDescription(const int16_t* readings, uint32_t timeMs) const;

    static HIDEventRef createMayBeginEvent(PixelRegion region);
    static HIDEventRef createHoldStartEvent(PixelRegion region);
    static HIDEventRef createHoldChangeEvent(PixelRegion region);
    static HIDEventRef createHoldEndEvent(PixelRegion region);
    static HIDEventRef createTapEvent(PixelRegion region);
    static HIDEventRef createCancelEvent();

    // The recognizer's state, open for inspection.
    Log log;
    // The pixels are kept field by field, so that a frame updates each row as vector operations.
    RealPixels pixels;            // A..O
    VirtualImage virtualImage;    // the groups, their sums and factors
    VirtualPixels virtualPixels;  // one per group, in group order; named by virtualPixelName
    HandStats handStats;                      // also holds the tuning settings
    EventStats eventStats;
    int16_t lastEventPhase = 0;  // phase of the last event emitted

private:
    FrameSnapshot snapshotOf(const int16_t* readings, uint32_t frameNumber, uint32_t timeMs) const;
    HIDEventRef eventFor(const FrameVerdict& verdict);

    FrameVerdict _verdict;
    std::array<int16_t, kPixelCount> _readings{};  // of the last frame
    uint32_t _frameNumber = 0;
    uint32_t _timeMs = 0;
};

}  // namespace TolkaTouch

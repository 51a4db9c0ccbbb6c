#pragma once
// What the recognizer decided and computed for one frame: the frame verdict (what the frame did to
// the touch, decided once by the hand state machine) and a plain, copyable snapshot of every
// per-frame number. Events, counters, description lines, evaluation and plots all read these.

#include <array>
#include <cstddef>
#include <cstdint>

#include "tolkatouch/PixelRegion.h"

namespace TolkaTouch {

inline constexpr size_t kVirtualPixelCount = 23;

// What one frame did to the touch, in the order the hand state machine decides it.
enum class Transition : uint8_t {
    Idle,           // nothing on the surface, nothing ended
    TouchBegan,     // a touch appeared: may-begin
    Touching,       // a touch goes on, not a hold (yet)
    HoldBegan,      // the touch outlasted the hold timeout: hold start
    HoldRecovered,  // a suppressed touch whose score recovered became a hold: hold start
    Holding,        // a hold goes on in its region
    HoldMoved,      // a hold goes on in another region: hold change
    HoldEnded,      // a hold ended: hold end
    TapAccepted,    // a short touch ended and stands as a tap: tap
    TapRejected,    // a short touch ended and the tap rejection turned it down
    TouchEnded,     // a touch ended as neither tap nor hold
};

// Where the touch stands against the hold timeout, this frame against the last.
enum class HoldClock : uint8_t {
    Before,   // not past the timeout
    Reached,  // past it from this frame on
    Past,     // past it in this frame and the last
    Dropped,  // past it in the last frame, no longer
};

struct FrameVerdict {
    Transition transition = Transition::Idle;
    // The hold is suppressed in this frame. With hold suppression switched off the state machine
    // stops deciding it, so it keeps its last value; counters and descriptions read it as it stands.
    bool holdSuppressed = false;
    HoldClock holdClock = HoldClock::Before;
    PixelRegion region = PixelRegion::None;  // the active region the frame left
};

// Every number of one frame, as the frame left it (after any end-of-touch reset of the score).
struct FrameSnapshot {
    uint32_t frameNumber = 0;
    uint32_t timeMs = 0;  // the firmware's frame time
    std::array<int16_t, kPixelCount> readings{};
    std::array<int32_t, kPixelCount> pixelValues{};  // gain x reading
    std::array<float, kPixelCount> pixelNormalized{};
    std::array<bool, kPixelCount> pixelOn{};
    std::array<int32_t, kVirtualPixelCount> virtualValues{};
    std::array<float, kVirtualPixelCount> virtualNormalized{};
    std::array<bool, kVirtualPixelCount> virtualOn{};
    float touchScore = 0.0f;
    float svmScore = 0.0f;  // the classifier's score of this frame
    // Tap features and score.
    float strengthRate = 0.0f;
    float strengthPerDuration = 0.0f;
    float durationRatio = 0.0f;
    int32_t activePixelCount = 0;
    float tapScore = 0.0f;
    bool touching = false;
    bool aboveNoise = false;
    int32_t sinceTouchStartMs = 0;  // frame time - touch start, signed
    int32_t touchLengthMs = 0;      // recorded touch end - touch start, signed
    FrameVerdict verdict;
};

// The letters of virtual pixel group i ("ABE" ... "MNO"), i below kVirtualPixelCount.
const char* virtualPixelName(size_t i);

}  // namespace TolkaTouch

#pragma once
// EventStats: counters of what the hand state machine decided, frame by frame: dispatched taps
// and holds by the button their region stands for, and rejected or suppressed ones.

#include <cstdint>

#include "platform/PropertyValue.h"
#include "tolkatouch/FrameSnapshot.h"

namespace TolkaTouch {

class EventStats {
public:
    EventStats() = default;

    // All counters back to 0.
    void Reset();
    // Adds this frame's outcome, as its verdict says. Region 1 is play/pause (tap) and the
    // voice-assistant call (hold), region 2 volume down, region 3 volume up.
    void update(const FrameVerdict& verdict);
    // {"Dispatched": {12 counters}, "Rejected": {12 counters}}, unsigned numbers.
    PropertyValue statsDictionary() const;

    uint64_t numTaps = 0;
    uint64_t numBeginHold = 0;
    uint64_t numIncrementHold = 0;
    uint64_t numEndHold = 0;
    uint64_t numVolumeUp = 0;
    uint64_t numVolumeDown = 0;
    uint64_t numPlayPause = 0;
    uint64_t numKalioCall = 0;
    uint64_t numKalioCallIncrement = 0;
    uint64_t numVolumeIncrement = 0;
    uint64_t numVolumeDecrement = 0;
    uint64_t numRejectedTap = 0;
    uint64_t numRejectedBeginHold = 0;
    uint64_t numRejectedIncrementHold = 0;
    uint64_t numRejectedEndHold = 0;
    uint64_t numRejectedVolumeUp = 0;
    uint64_t numRejectedVolumeDown = 0;
    uint64_t numRejectedPlayPause = 0;
    uint64_t numRejectedKalioCall = 0;
    uint64_t numRejectedKalioCallIncrement = 0;
    uint64_t numRejectedVolumeIncrement = 0;
    uint64_t numRejectedVolumeDecrement = 0;
    uint64_t numSuppressed2Holding = 0;
    uint64_t numHolding2Suppressed = 0;
};

}  // namespace TolkaTouch

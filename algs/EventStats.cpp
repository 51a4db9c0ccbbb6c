#include "algs/EventStats.h"

#include <utility>

#include "algs/HandStats.h"

namespace TolkaTouch {

void EventStats::Reset() { *this = EventStats(); }

void EventStats::update(const HandStats& hand) {
    const PixelRegion r = hand.activeRegion;
    constexpr PixelRegion kRegion1 = PixelRegion::PlayPause;
    constexpr PixelRegion kRegion2 = PixelRegion::VolumeDown;
    constexpr PixelRegion kRegion3 = PixelRegion::VolumeUp;

    // Nothing is counted in the frame a touch starts.
    if (hand.touching && !hand.wasTouching) return;

    if (hand.isHoldSuppressed) {
        // 1. A suppressed hold.
        if (hand.wasHolding) ++numHolding2Suppressed;
        if (!hand.holdTimeExceeded) {
            if (r == kRegion2) ++numRejectedVolumeDecrement;
            if (r == kRegion3) ++numRejectedVolumeIncrement;
        } else if (hand.wasHoldTimeExceeded) {
            ++numRejectedIncrementHold;
            if (r == kRegion2) ++numRejectedVolumeDecrement;
            if (r == kRegion1) ++numRejectedKalioCallIncrement;
            if (r == kRegion3) ++numRejectedVolumeIncrement;
        } else {
            // The hold timeout passed in this frame.
            ++numRejectedBeginHold;
            if (r == kRegion2) ++numRejectedVolumeDecrement;
            if (r == kRegion1) ++numRejectedKalioCall;
            if (r == kRegion3) ++numRejectedVolumeIncrement;
        }
    } else if (hand.holding) {
        // 2. A hold, counted every frame it lasts.
        if (hand.wasHolding) {
            ++numIncrementHold;
            if (r == kRegion1) ++numKalioCallIncrement;
        } else {
            if (hand.wasHoldSuppressed) ++numSuppressed2Holding;
            ++numBeginHold;
            if (r == kRegion1) ++numKalioCall;
        }
        if (r == kRegion2) ++numVolumeDecrement;
        if (r == kRegion3) ++numVolumeIncrement;
    } else if (hand.wasHolding) {
        // 3. The hold ended.
        ++numEndHold;
    } else if (!hand.holdTimeExceeded && hand.wasHoldTimeExceeded) {
        // 4. A suppressed hold ended ...
        ++numRejectedEndHold;
    } else if (hand.tapDetected) {
        // ... or a tap stands ...
        ++numTaps;
        if (r == kRegion1) ++numPlayPause;
        if (r == kRegion2) ++numVolumeDown;
        if (r == kRegion3) ++numVolumeUp;
    } else if (hand.tapCandidate) {
        // ... or was rejected.
        ++numRejectedTap;
        if (r == kRegion1) ++numRejectedPlayPause;
        if (r == kRegion2) ++numRejectedVolumeDown;
        if (r == kRegion3) ++numRejectedVolumeUp;
    }
}

PropertyValue EventStats::statsDictionary() const {
    // "numHolding2Suppressed" stands under "Dispatched" and "numSuppressed2Holding" under
    // "Rejected", crosswise; readers expect them there.
    PropertyValue::Dictionary dispatched{
        {"numTaps", PropertyValue(numTaps)},
        {"numBeginHold", PropertyValue(numBeginHold)},
        {"numIncrementHold", PropertyValue(numIncrementHold)},
        {"numEndHold", PropertyValue(numEndHold)},
        {"numHolding2Suppressed", PropertyValue(numHolding2Suppressed)},
        {"numVolumeUp", PropertyValue(numVolumeUp)},
        {"numVolumeIncrement", PropertyValue(numVolumeIncrement)},
        {"numVolumeDown", PropertyValue(numVolumeDown)},
        {"numVolumeDecrement", PropertyValue(numVolumeDecrement)},
        {"numPlayPause", PropertyValue(numPlayPause)},
        {"numKalioCall", PropertyValue(numKalioCall)},
        {"numKalioCallIncrement", PropertyValue(numKalioCallIncrement)},
    };
    PropertyValue::Dictionary rejected{
        {"numRejectedTap", PropertyValue(numRejectedTap)},
        {"numRejectedBeginHold", PropertyValue(numRejectedBeginHold)},
        {"numRejectedIncrementHold", PropertyValue(numRejectedIncrementHold)},
        {"numRejectedEndHold", PropertyValue(numRejectedEndHold)},
        {"numSuppressed2Holding", PropertyValue(numSuppressed2Holding)},
        {"numRejectedVolumeUp", PropertyValue(numRejectedVolumeUp)},
        {"numRejectedVolumeIncrement", PropertyValue(numRejectedVolumeIncrement)},
        {"numRejectedVolumeDown", PropertyValue(numRejectedVolumeDown)},
        {"numRejectedVolumeDecrement", PropertyValue(numRejectedVolumeDecrement)},
        {"numRejectedPlayPause", PropertyValue(numRejectedPlayPause)},
        {"numRejectedKalioCall", PropertyValue(numRejectedKalioCall)},
        {"numRejectedKalioCallIncrement", PropertyValue(numRejectedKalioCallIncrement)},
    };
    return PropertyValue(PropertyValue::Dictionary{
        {"Dispatched", PropertyValue(std::move(dispatched))},
        {"Rejected", PropertyValue(std::move(rejected))},
    });
}

}  // namespace TolkaTouch

#include "algs/EventStats.h"

#include <utility>


namespace TolkaTouch {

void EventStats::Reset() { *this = EventStats(); }

void EventStats::update(const FrameVerdict& verdict) {
    const PixelRegion r = verdict.region;
    constexpr PixelRegion kRegion1 = PixelRegion::PlayPause;
    constexpr PixelRegion kRegion2 = PixelRegion::VolumeDown;
    constexpr PixelRegion kRegion3 = PixelRegion::VolumeUp;
    const Transition t = verdict.transition;
    const bool heldBefore = t == Transition::Holding || t == Transition::HoldMoved || t == Transition::HoldEnded;

    // Nothing is counted in the frame a touch starts.
    if (t == Transition::TouchBegan) return;

    if (verdict.holdSuppressed) {
        // 1. A suppressed hold, counted every frame it lasts.
        if (heldBefore) ++numHolding2Suppressed;
        switch (verdict.holdClock) {
        case HoldClock::Before:
        case HoldClock::Dropped:
            if (r == kRegion2) ++numRejectedVolumeDecrement;
            if (r == kRegion3) ++numRejectedVolumeIncrement;
            break;
        case HoldClock::Past:
            ++numRejectedIncrementHold;
            if (r == kRegion2) ++numRejectedVolumeDecrement;
            if (r == kRegion1) ++numRejectedKalioCallIncrement;
            if (r == kRegion3) ++numRejectedVolumeIncrement;
            break;
        case HoldClock::Reached:
            ++numRejectedBeginHold;
            if (r == kRegion2) ++numRejectedVolumeDecrement;
            if (r == kRegion1) ++numRejectedKalioCall;
            if (r == kRegion3) ++numRejectedVolumeIncrement;
            break;
        }
        return;
    }

    switch (t) {
    case Transition::HoldRecovered:
        ++numSuppressed2Holding;
        [[fallthrough]];
    case Transition::HoldBegan:
        // 2. A hold, counted every frame it lasts.
        ++numBeginHold;
        if (r == kRegion1) ++numKalioCall;
        if (r == kRegion2) ++numVolumeDecrement;
        if (r == kRegion3) ++numVolumeIncrement;
        return;
    case Transition::Holding:
    case Transition::HoldMoved:
        ++numIncrementHold;
        if (r == kRegion1) ++numKalioCallIncrement;
        if (r == kRegion2) ++numVolumeDecrement;
        if (r == kRegion3) ++numVolumeIncrement;
        return;
    case Transition::HoldEnded:
        // 3. The hold ended.
        ++numEndHold;
        return;
    default:
        break;
    }

    if (verdict.holdClock == HoldClock::Dropped) {
        // 4. A suppressed hold ended ...
        ++numRejectedEndHold;
    } else if (t == Transition::TapAccepted) {
        // ... or a tap stands ...
        ++numTaps;
        if (r == kRegion1) ++numPlayPause;
        if (r == kRegion2) ++numVolumeDown;
        if (r == kRegion3) ++numVolumeUp;
    } else if (t == Transition::TapRejected) {
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

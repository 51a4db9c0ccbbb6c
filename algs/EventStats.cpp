#include "algs/EventStats.h"

#include <utility>


namespace TolkaTouch {

void EventStats::Reset() { *this = EventStats(); }

namespace {

// Adds one to the counter of the region, where the region has one: play/pause (1), volume down
// (2), volume up (3).
void countIn(PixelRegion region, uint64_t* playPause, uint64_t* volumeDown, uint64_t* volumeUp) {
    uint64_t* counter = nullptr;
    switch (region) {
    case PixelRegion::PlayPause: counter = playPause; break;
    case PixelRegion::VolumeDown: counter = volumeDown; break;
    case PixelRegion::VolumeUp: counter = volumeUp; break;
    case PixelRegion::None: break;
    }
    if (counter != nullptr) ++*counter;
}

}  // namespace

void EventStats::update(const FrameVerdict& verdict) {
    const PixelRegion r = verdict.region;
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
            countIn(r, nullptr, &numRejectedVolumeDecrement, &numRejectedVolumeIncrement);
            break;
        case HoldClock::Past:
            ++numRejectedIncrementHold;
            countIn(r, &numRejectedKalioCallIncrement, &numRejectedVolumeDecrement, &numRejectedVolumeIncrement);
            break;
        case HoldClock::Reached:
            ++numRejectedBeginHold;
            countIn(r, &numRejectedKalioCall, &numRejectedVolumeDecrement, &numRejectedVolumeIncrement);
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
        countIn(r, &numKalioCall, &numVolumeDecrement, &numVolumeIncrement);
        return;
    case Transition::Holding:
    case Transition::HoldMoved:
        ++numIncrementHold;
        countIn(r, &numKalioCallIncrement, &numVolumeDecrement, &numVolumeIncrement);
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
        countIn(r, &numPlayPause, &numVolumeDown, &numVolumeUp);
    } else if (t == Transition::TapRejected) {
        // ... or was rejected.
        ++numRejectedTap;
        countIn(r, &numRejectedPlayPause, &numRejectedVolumeDown, &numRejectedVolumeUp);
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

#include "algs/Algs.h"

#include <algorithm>
#include <sstream>
#include <stdexcept>
#include <utility>

#include "algs/Descriptions.h"
#include "algs/SnapshotDictionary.h"
#include "common/Util.h"
#include "tolkatouch/Gesture.h"

namespace TolkaTouch {

namespace {

constexpr const char* kSubsystem = "com.zantor.hid.TolkaTouch";
constexpr const char* kCategory = "Algs";

constexpr const char* kFactorsKey = "VirtualNormalizationFactors";

// The group index after "VirtualNormalizationFactors.", read as a stream reads an unsigned
// number: white space skipped, digits up to the first other character, 0 when none. A leading
// "-" reads as a huge number, so it never addresses a group.
uint64_t factorIndex(const std::string& text) {
    uint64_t index = 0;
    std::istringstream stream(text);
    stream >> index;
    return index;
}

RealPixels makePixels() {
    std::array<int32_t, kPixelCount> indices;
    for (size_t i = 0; i < kPixelCount; ++i) indices[i] = static_cast<int32_t>(i);
    return RealPixels(Algs::pixelGains, indices);
}

// The factor is copied into the virtual pixel: a later "VirtualNormalizationFactors" change
// reaches the virtual image's list only. The index starts as the first letter's character code;
// the first frame replaces it with the strongest member's pixel index.
VirtualPixels makeVirtualPixels(const VirtualImage& image) {
    std::array<float, kVirtualPixelCount> gains;
    std::array<int32_t, kVirtualPixelCount> indices;
    for (size_t i = 0; i < kVirtualPixelCount; ++i) {
        gains[i] = image.normalizationFactors.at(i);
        indices[i] = static_cast<int32_t>(static_cast<signed char>(image.groups.at(i)[0]));
    }
    return VirtualPixels(gains, indices);
}

}  // namespace

// The virtual image, hand state and counters are built by their own defaults.
Algs::Algs()
    : log(kSubsystem, kCategory),
      pixels(makePixels()),
      virtualPixels(makeVirtualPixels(virtualImage)) {}

EventList Algs::handleImage(const InputReport::Image& image) {
    EventList out;
    processTouchFrame(image.pixels, image.frameNumber, image.timeMs, out);
    return out;
}

EventList Algs::handleReset() {
    const int16_t zeros[kPixelCount] = {};
    EventList out;
    processTouchFrame(zeros, 0, 0, out);
    return out;
}

void Algs::processTouchFrame(const int16_t* readings, uint32_t frameNumber, uint32_t timeMs, EventList& out) {
    const float threshold = handStats.ActivationThreshold;

    // 1. The real pixels, in index order.
    pixels.update(std::span<const int16_t, kPixelCount>(readings, kPixelCount), threshold);

    // 2. The group sums, and each as its virtual pixel reads it: narrowed to 16 bits.
    VirtualPixels::Row<int32_t> groupReadings;
    virtualImage.updateValues(pixels.value, groupReadings);

    // 3. The virtual pixels.
    if (virtualImage.values.size() < kVirtualPixelCount || virtualImage.strongest.size() < kVirtualPixelCount) {
        throw std::out_of_range("vector");
    }
    virtualPixels.update(groupReadings, threshold);
    std::copy_n(virtualImage.strongest.begin(), kVirtualPixelCount, virtualPixels.index.begin());

    // 4. The hand state machine reads both pixel rows, and decides once what the frame did.
    handStats.updateHandState(pixels, virtualPixels, timeMs);
    _verdict = handStats.verdict();
    std::copy(readings, readings + kPixelCount, _readings.begin());
    _frameNumber = frameNumber;
    _timeMs = timeMs;

    // 5., 6. At most one event, chosen by the verdict.
    if (HIDEventRef event = eventFor(_verdict)) {
        event->setIntegerValue(kDigitizerFrameNumberField, frameNumber);
        lastEventPhase = static_cast<int16_t>(event->phase);
        out.push_back(std::move(event));
    }

    // 7. Counted on every frame, with or without an event.
    eventStats.update(_verdict);

    // 8. The diagnostic lines are costly; they are built only when someone reads them.
    if (log.debugEnabled()) {
        log.debug("Frame %u @%ums, *** Event Stats ***\n%s", frameNumber, timeMs,
                  eventStats.statsDictionary().description().c_str());
        const FrameSnapshot frame = snapshot();
        log.debug("Frame %u @%ums, *** Touch State Description ***\n%s", frameNumber, timeMs,
                  touchStateLine(frame).c_str());
        log.debug("Frame %u @%ums, *** Virtual State Description ***\n%s", frameNumber, timeMs,
                  virtualStateLine(frame).c_str());
    }
}

HIDEventRef Algs::eventFor(const FrameVerdict& verdict) {
    switch (verdict.transition) {
    case Transition::TouchBegan: return createMayBeginEvent(verdict.region);
    case Transition::HoldBegan:
    case Transition::HoldRecovered: return createHoldStartEvent(verdict.region);
    case Transition::HoldMoved: return createHoldChangeEvent(verdict.region);
    case Transition::HoldEnded:
        Reset();
        return createHoldEndEvent(verdict.region);
    case Transition::TapAccepted:
        Reset();
        return createTapEvent(verdict.region);
    case Transition::TapRejected:
    case Transition::TouchEnded: {
        // Announced, but became neither a hold nor a tap.
        const bool announced = lastEventPhase == static_cast<int16_t>(HIDEventPhase::MayBegin);
        Reset();
        return announced ? createCancelEvent() : nullptr;
    }
    default: return nullptr;
    }
}

void Algs::Reset() {
    pixels.resetGlobalStats();
    virtualPixels.resetGlobalStats();
    handStats.Reset();
}

PropertyValue Algs::getState(const std::string& key) const {
    if (key == "EnableHoldSuppression") return PropertyValue(handStats.EnableHoldSuppression);
    if (key == "EnableTapSuppression") return PropertyValue(handStats.EnableTapSuppression);
    if (key == "HoldTimeoutMilliseconds") return PropertyValue(handStats.HoldTimeoutMilliseconds);
    if (key == "ActivationThreshold") return PropertyValue(handStats.ActivationThreshold);
    if (std::string rest = key; Util::stripDomainFromKey(rest, kFactorsKey)) {
        const uint64_t index = factorIndex(rest);
        if (index >= virtualImage.normalizationFactors.size()) return PropertyValue();
        return PropertyValue(virtualImage.normalizationFactors[index]);
    }
    if (key == "EventStats") return eventStats.statsDictionary();
    if (key == "DebugInfo") return PropertyValue(PropertyValue::Dictionary{{"EventStats", eventStats.statsDictionary()}});
    // Every number of the last frame, for a host that follows the recognizer live.
    if (key == "FrameSnapshot") return snapshotDictionary(snapshot());
    return PropertyValue();
}

void Algs::setState(const std::string& key, PropertyValue value) {
    // A value that is not a number counts as 0 (false, 0.0, 0 ms).
    if (key == "EnableHoldSuppression") {
        handStats.EnableHoldSuppression = value.toBool();
    } else if (key == "EnableTapSuppression") {
        handStats.EnableTapSuppression = value.toBool();
    } else if (key == "ResetEventStats") {
        eventStats.Reset();
    } else if (key == "ActivationThreshold") {
        handStats.ActivationThreshold = value.toFloat();
    } else if (std::string rest = key; Util::stripDomainFromKey(rest, kFactorsKey)) {
        const uint64_t index = factorIndex(rest);
        if (index < virtualImage.normalizationFactors.size()) virtualImage.normalizationFactors[index] = value.toFloat();
    } else if (key == "HoldTimeoutMilliseconds") {
        handStats.HoldTimeoutMilliseconds = static_cast<uint32_t>(value.toUInt64());
    }
}

FrameSnapshot Algs::snapshot() const { return snapshotOf(_readings.data(), _frameNumber, _timeMs); }

FrameSnapshot Algs::snapshotOf(const int16_t* readings, uint32_t frameNumber, uint32_t timeMs) const {
    const HandStats& hand = handStats;
    FrameSnapshot frame;
    frame.frameNumber = frameNumber;
    frame.timeMs = timeMs;
    for (size_t i = 0; i < kPixelCount; ++i) {
        frame.readings[i] = readings[i];
        frame.pixelValues[i] = pixels.value[i];
        frame.pixelNormalized[i] = pixels.normalized[i];
        frame.pixelOn[i] = pixels.isOn[i] != 0;
    }
    for (size_t i = 0; i < kVirtualPixelCount; ++i) {
        frame.virtualValues[i] = virtualPixels.value[i];
        frame.virtualNormalized[i] = virtualPixels.normalized[i];
        frame.virtualOn[i] = virtualPixels.isOn[i] != 0;
    }
    frame.touchScore = hand.touchScore;
    frame.svmScore = hand.svm.score;
    frame.strengthRate = hand.strengthRate;
    frame.strengthPerDuration = hand.strengthPerDuration;
    frame.durationRatio = hand.durationRatio;
    frame.activePixelCount = hand.activePixelCount;
    frame.tapScore = hand.tapScore;
    frame.touching = hand.touching();
    frame.aboveNoise = hand.isAboveNoise();
    // Signed 32-bit durations, as the firmware clock wraps.
    frame.sinceTouchStartMs = static_cast<int32_t>(timeMs - hand.touchStartTime);
    frame.touchLengthMs = static_cast<int32_t>(hand.touchEndTime - hand.touchStartTime);
    frame.verdict = hand.verdict();
    return frame;
}

std::string Algs::touchStateDescription(const int16_t* readings, uint32_t timeMs) const {
    return touchStateLine(snapshotOf(readings, _frameNumber, timeMs));
}

std::string Algs::virtualStateDescription(const int16_t* readings, uint32_t timeMs) const {
    return virtualStateLine(snapshotOf(readings, _frameNumber, timeMs));
}

HIDEventRef Algs::createMayBeginEvent(PixelRegion region) { return GestureCodec::encode(GestureKind::MayBegin, region); }

HIDEventRef Algs::createHoldStartEvent(PixelRegion region) { return GestureCodec::encode(GestureKind::HoldStart, region); }

HIDEventRef Algs::createHoldChangeEvent(PixelRegion region) {
    return GestureCodec::encode(GestureKind::HoldChange, region);
}

HIDEventRef Algs::createHoldEndEvent(PixelRegion region) { return GestureCodec::encode(GestureKind::HoldEnd, region); }

HIDEventRef Algs::createTapEvent(PixelRegion region) { return GestureCodec::encode(GestureKind::Tap, region); }

HIDEventRef Algs::createCancelEvent() { return GestureCodec::encode(GestureKind::Cancel); }

}  // namespace TolkaTouch

#include "algs/Algs.h"

#include <sstream>

#include "pipeline/common/Util.h"
#include "platform/Format.h"

namespace TolkaTouch {

namespace {

constexpr const char* kSubsystem = "com.zantor.hid.TolkaTouch";
constexpr const char* kCategory = "Algs";

constexpr const char* kFactorsKey = "VirtualNormalizationFactors";

double regionNumber(PixelRegion region) { return static_cast<double>(static_cast<uint32_t>(region)); }

int regionInt(PixelRegion region) { return static_cast<int>(region); }

const char* onMark(const Pixel& pixel) { return pixel.isOn ? "<==ON" : ""; }

// The group index after "VirtualNormalizationFactors.", read as a stream reads an unsigned
// number: white space skipped, digits up to the first other character, 0 when none. A leading
// "-" reads as a huge number, so it never addresses a group.
uint64_t factorIndex(const std::string& text) {
    uint64_t index = 0;
    std::istringstream stream(text);
    stream >> index;
    return index;
}

}  // namespace

Algs::Algs() : log(kSubsystem, kCategory) {
    // The virtual image, hand state and counters are built by their own defaults; the pixels next.
    pixels.reserve(kPixelCount);
    for (size_t i = 0; i < kPixelCount; ++i) pixels.emplace_back(static_cast<int>(i), pixelGains[i]);

    // The factor is copied into the virtual pixel: a later "VirtualNormalizationFactors" change
    // reaches the virtual image's list only. The index starts as the first letter's character code;
    // the first frame replaces it with the strongest member's pixel index.
    virtualPixels.reserve(virtualImage.groups.size());
    for (size_t i = 0; i < virtualImage.groups.size(); ++i) {
        const std::string& group = virtualImage.groups[i];
        virtualPixels.emplace_back(static_cast<int>(static_cast<signed char>(group[0])),
                                   virtualImage.normalizationFactors[i], group);
    }
    lastEventPhase = 0;
}

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

    // 1. The real pixels.
    for (size_t i = 0; i < kPixelCount; ++i) pixels[i].updatePixelState(readings[i], threshold);

    // 2. The group sums.
    virtualImage.updateValues(pixels);

    // 3. The virtual pixels. The group sum is narrowed to 16 bits, so one above 32767 wraps to a
    // negative value; the tuned factors and thresholds expect exactly that.
    for (size_t i = 0; i < virtualImage.groups.size(); ++i) {
        const int value = static_cast<int16_t>(virtualImage.values.at(i));
        virtualPixels.at(i).updatePixelState(value, threshold, virtualImage.strongest.at(i));
    }

    // 4. The hand state machine reads this frame's snapshot of both pixel lists.
    handStats.updateHandState(pixels, virtualPixels, timeMs);

    // 5. At most one event; the first rule that applies wins.
    const HandStats& hand = handStats;
    HIDEventRef event;
    if (hand.touching && !hand.wasTouching) {
        event = createMayBeginEvent(hand.activeRegion);
    } else if (hand.holding && !hand.wasHolding) {
        event = createHoldStartEvent(hand.activeRegion);
    } else if (hand.holding && hand.wasHolding && hand.previousActiveRegion != hand.activeRegion) {
        event = createHoldChangeEvent(hand.activeRegion);
    } else if (!hand.holding && hand.wasHolding) {
        event = createHoldEndEvent(hand.activeRegion);
        Reset();
    } else if (hand.tapDetected) {
        event = createTapEvent(hand.activeRegion);
        Reset();
    } else if (!hand.touching && hand.wasTouching && lastEventPhase == static_cast<int16_t>(HIDEventPhase::MayBegin)) {
        // Announced, but became neither a hold nor a tap.
        event = createCancelEvent();
        Reset();
    } else if (!hand.touching && hand.wasTouching) {
        Reset();
    }

    // 6.
    if (event) {
        event->setIntegerValue(kDigitizerFrameNumberField, frameNumber);
        lastEventPhase = static_cast<int16_t>(event->phase);
        out.push_back(std::move(event));
    }

    // 7. Counted on every frame, with or without an event.
    eventStats.update(handStats);

    // 8. The diagnostic lines are costly; they are built only when someone reads them.
    if (log.debugEnabled()) {
        if (log.debugEnabled()) {
            log.debug("Frame %u @%ums, *** Event Stats ***\n%s", frameNumber, timeMs,
                      eventStats.statsDictionary().description().c_str());
        }
        if (log.debugEnabled()) {
            log.debug("Frame %u @%ums, *** Touch State Description ***\n%s", frameNumber, timeMs,
                      touchStateDescription(readings, timeMs).c_str());
        }
        if (log.debugEnabled()) {
            log.debug("Frame %u @%ums, *** Virtual State Description ***\n%s", frameNumber, timeMs,
                      virtualStateDescription(readings, timeMs).c_str());
        }
    }
}

void Algs::Reset() {
    for (Pixel& pixel : pixels) pixel.resetGlobalStats();
    for (VirtualPixel& pixel : virtualPixels) pixel.resetGlobalStats();
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

std::string Algs::touchPhaseDescription(uint32_t timeMs) const {
    const HandStats& hand = handStats;
    // Signed 32-bit durations; all but a rejected tap are measured to the recorded end of the touch.
    const int sinceStart = static_cast<int32_t>(timeMs - hand.touchStartTime);
    const int touchLength = static_cast<int32_t>(hand.touchEndTime - hand.touchStartTime);
    const int region = regionInt(hand.activeRegion);
    const char* noise = hand.isAboveNoise ? "ABOVENOISE" : "BELOWNOISE";

    if (hand.touching && !hand.wasTouching) return formatString("STARTTOUCH %dms ActiveRegion=%d", sinceStart, region);
    if (hand.holding && hand.wasHolding) return formatString("HOLDING %dms ActiveRegion=%d", sinceStart, region);
    if (hand.holding && !hand.wasHolding) return formatString("STARTHOLD %dms ActiveRegion=%d", sinceStart, region);
    if (hand.isHoldSuppressed) return formatString("SUPPRESSHOLD %dms ActiveRegion=%d", sinceStart, region);
    if (hand.touching) return formatString("TOUCHING %dms ActiveRegion=%d", sinceStart, region);
    if (hand.wasHolding) return formatString("ENDHOLD %dms ActiveRegion=%d %s", touchLength, region, noise);
    if (hand.tapCandidate && hand.tapDetected) {
        return formatString("TAP %dms ActiveRegion=%d %s", touchLength, region, noise);
    }
    if (hand.tapCandidate && !hand.tapDetected) {
        return formatString("SUPPRESSTAP %dms ActiveRegion=%d %s", sinceStart, region, noise);
    }
    if (hand.tapDetected) return formatString("TAP %dms ActiveRegion=%d %s", touchLength, region, noise);
    if (hand.wasTouching) return formatString("ENDTOUCH %dms ActiveRegion=%d %s", touchLength, region, noise);
    return std::string();
}

std::string Algs::touchStateDescription(const int16_t* readings, uint32_t timeMs) const {
    const HandStats& h = handStats;
    const auto& p = pixels;
    const auto letter = [&](size_t i) { return 'A' + p.at(i).index; };
    return formatString(
        "ts=%f, sd=%f, tsd=%f, NonActivePixels=%d, TimeDurationRatio=%f, TapSVMScore=%f, "
        "[%c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, "
        "%c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, %c=%4d %4d%s, "
        "%c=%4d %4d%s] %s",
        static_cast<double>(h.touchScore), static_cast<double>(h.strengthRate),
        static_cast<double>(h.strengthPerDuration), h.activePixelCount, static_cast<double>(h.durationRatio),
        static_cast<double>(h.tapScore),
        letter(0), readings[0], p.at(0).value, onMark(p.at(0)),
        letter(1), readings[1], p.at(1).value, onMark(p.at(1)),
        letter(2), readings[2], p.at(2).value, onMark(p.at(2)),
        letter(3), readings[3], p.at(3).value, onMark(p.at(3)),
        letter(4), readings[4], p.at(4).value, onMark(p.at(4)),
        letter(5), readings[5], p.at(5).value, onMark(p.at(5)),
        letter(6), readings[6], p.at(6).value, onMark(p.at(6)),
        letter(7), readings[7], p.at(7).value, onMark(p.at(7)),
        letter(8), readings[8], p.at(8).value, onMark(p.at(8)),
        letter(9), readings[9], p.at(9).value, onMark(p.at(9)),
        letter(10), readings[10], p.at(10).value, onMark(p.at(10)),
        letter(11), readings[11], p.at(11).value, onMark(p.at(11)),
        letter(12), readings[12], p.at(12).value, onMark(p.at(12)),
        letter(13), readings[13], p.at(13).value, onMark(p.at(13)),
        letter(14), readings[14], p.at(14).value, onMark(p.at(14)),
        touchPhaseDescription(timeMs).c_str());
}

std::string Algs::virtualStateDescription(const int16_t* /*readings: not shown*/, uint32_t timeMs) const {
    const HandStats& h = handStats;
    const auto& v = virtualPixels;
    const auto name = [&](size_t i) { return v.at(i).name.c_str(); };
    return formatString(
        "ts=%f, sd=%f, tsd=%f, NonActivePixels=%d, TimeDurationRatio=%f, TapSVMScore=%f, "
        "[%s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, "
        "%s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, %s=%4d%s, "
        "%s=%4d%s, %s=%4d%s, %s=%4d%s] %s",
        static_cast<double>(h.touchScore), static_cast<double>(h.strengthRate),
        static_cast<double>(h.strengthPerDuration), h.activePixelCount, static_cast<double>(h.durationRatio),
        static_cast<double>(h.tapScore),
        name(0), v.at(0).value, onMark(v.at(0)), name(1), v.at(1).value, onMark(v.at(1)),
        name(2), v.at(2).value, onMark(v.at(2)), name(3), v.at(3).value, onMark(v.at(3)),
        name(4), v.at(4).value, onMark(v.at(4)), name(5), v.at(5).value, onMark(v.at(5)),
        name(6), v.at(6).value, onMark(v.at(6)), name(7), v.at(7).value, onMark(v.at(7)),
        name(8), v.at(8).value, onMark(v.at(8)), name(9), v.at(9).value, onMark(v.at(9)),
        name(10), v.at(10).value, onMark(v.at(10)), name(11), v.at(11).value, onMark(v.at(11)),
        name(12), v.at(12).value, onMark(v.at(12)), name(13), v.at(13).value, onMark(v.at(13)),
        name(14), v.at(14).value, onMark(v.at(14)), name(15), v.at(15).value, onMark(v.at(15)),
        name(16), v.at(16).value, onMark(v.at(16)), name(17), v.at(17).value, onMark(v.at(17)),
        name(18), v.at(18).value, onMark(v.at(18)), name(19), v.at(19).value, onMark(v.at(19)),
        name(20), v.at(20).value, onMark(v.at(20)), name(21), v.at(21).value, onMark(v.at(21)),
        name(22), v.at(22).value, onMark(v.at(22)),
        touchPhaseDescription(timeMs).c_str());
}

HIDEventRef Algs::createMayBeginEvent(PixelRegion region) {
    return makeDigitizerEvent(0, HIDEventPhase::MayBegin, regionNumber(region));
}

HIDEventRef Algs::createHoldStartEvent(PixelRegion region) {
    return makeDigitizerEvent(2, HIDEventPhase::Began, regionNumber(region));
}

HIDEventRef Algs::createHoldChangeEvent(PixelRegion region) {
    return makeDigitizerEvent(2, HIDEventPhase::Changed, regionNumber(region));
}

HIDEventRef Algs::createHoldEndEvent(PixelRegion region) {
    return makeDigitizerEvent(2, HIDEventPhase::Ended, regionNumber(region));
}

HIDEventRef Algs::createTapEvent(PixelRegion region) {
    // Created without a phase on purpose: it reads back as 0.
    return makeDigitizerEvent(0x20000, HIDEventPhase::None, regionNumber(region));
}

HIDEventRef Algs::createCancelEvent() { return makeDigitizerEvent(0, HIDEventPhase::Cancelled, 0.0); }

}  // namespace TolkaTouch

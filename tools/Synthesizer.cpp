#include "tools/Synthesizer.h"

#include <algorithm>
#include <cmath>
#include <numbers>
#include <optional>

#include "tools/FingerModel.h"
#include "tools/SeededRandom.h"

namespace TolkaTouch::Tools {

namespace {

constexpr double kLeadInMs = 304.0;     // quiet frames before the first gesture
constexpr double kTrailMs = 600.0;      // quiet frames after the last one, so the last touch ends
constexpr double kRebootMs = 48.0;      // no frames while the touch controller restarts
constexpr uint32_t kFirstFrameNumber = 1000;
constexpr uint32_t kFirmwareStartMs = 20000;
constexpr double kArrivalLatencyMinUs = 100.0;  // USB arrival after the firmware's frame time
constexpr double kArrivalLatencyMaxUs = 700.0;

// A deliberate fingertip: a firm press.
constexpr double kPressStrength = 700.0;
constexpr double kPressRadius = 2.0;
constexpr double kLightPressScale = 0.75;
constexpr double kLightPressRadius = 1.7;
constexpr double kHeavyPressScale = 1.35;
constexpr double kHeavyPressRadius = 2.4;
constexpr double kRampMs = 24.0;          // contact builds up and fades over three frames
constexpr double kSlideMoveMs = 96.0;     // a slide crosses to the other zone this quickly
constexpr double kSlideHoldMs = 640.0;    // and only after being held this long
// A brush: the finger hovers in, grazes the surface lightly for a moment and is gone.
constexpr double kBrushStrength = 300.0;
constexpr double kBrushRadius = 2.6;
constexpr double kBrushHoverLevel = 0.38;  // of the graze's strength: sensed, but not a touch
// The graze lasts one frame period, so exactly one frame sees it, and comes at least four frame
// periods after the finger is first sensed.
constexpr double kShortestGrazingBrushMs = 64.0;
constexpr double kGrazeBeforeLeavingMs = 14.0;

struct Segment {
    const Gesture* gesture = nullptr;
    double startMs = 0.0;
    double endMs = 0.0;
    // Per-gesture variation: where the finger lands and how firmly.
    SurfacePoint offset;
    double strength = 0.0;
    double wobblePhase = 0.0;
    double radius = kPressRadius;
};

struct TimedItem {
    const Gesture* gesture = nullptr;
    double timeMs = 0.0;
};

double smoothstep(double x) {
    x = std::clamp(x, 0.0, 1.0);
    return x * x * (3.0 - 2.0 * x);
}

// Builds up over the ramp at the start and fades over the ramp at the end.
double pressEnvelope(double u, double duration) {
    const double ramp = std::min(kRampMs, duration / 3.0);
    if (!(ramp > 0.0)) return 0.0;
    return smoothstep(u / ramp) * smoothstep((duration - u) / ramp);
}

SurfacePoint plus(SurfacePoint a, SurfacePoint b) { return SurfacePoint{a.x + b.x, a.y + b.y}; }

SurfacePoint between(SurfacePoint a, SurfacePoint b, double t) {
    return SurfacePoint{a.x + (b.x - a.x) * t, a.y + (b.y - a.y) * t};
}

std::optional<FingerContact> contactAt(const Segment& segment, double timeMs) {
    const Gesture& gesture = *segment.gesture;
    const double u = timeMs - segment.startMs;
    const double duration = segment.endMs - segment.startMs;
    const SurfacePoint home = plus(FingerModel::zoneCentre(gesture.zone), segment.offset);
    // A held finger is never quite still: its pressure breathes a little.
    const double wobble = 1.0 + 0.04 * std::sin(2.0 * std::numbers::pi * u / 700.0 + segment.wobblePhase);

    switch (gesture.kind) {
    case GestureKind::Tap:
    case GestureKind::Hold:
        return FingerContact{home, segment.strength * wobble * pressEnvelope(u, duration), segment.radius};
    case GestureKind::Slide: {
        const SurfacePoint away = plus(FingerModel::zoneCentre(gesture.toZone), segment.offset);
        const double moveStart = std::max(kSlideHoldMs, (duration - kSlideMoveMs) / 2.0);
        const SurfacePoint where = between(home, away, smoothstep((u - moveStart) / kSlideMoveMs));
        return FingerContact{where, segment.strength * wobble * pressEnvelope(u, duration), segment.radius};
    }
    case GestureKind::Brush: {
        // The finger sweeps sideways across the zone just above it: sensed all the way, never
        // pressing. A brush long enough to dip grazes the surface for less than a frame's time
        // just before it leaves; the long sensed approach before that short contact is what the
        // tap rejection turns down. A shorter one passes without ever reaching the surface.
        const SurfacePoint where = plus(home, SurfacePoint{-1.5 + 3.0 * u / duration, 0.0});
        double level = kBrushHoverLevel * smoothstep(u / kFramePeriodMs) * smoothstep((duration - u) / kFramePeriodMs);
        const double grazeStart = duration - kGrazeBeforeLeavingMs;
        if (duration >= kShortestGrazingBrushMs && u >= grazeStart && u < grazeStart + kFramePeriodMs) {
            level = 1.0;
        }
        return FingerContact{where, segment.strength * level, segment.radius};
    }
    default:
        return std::nullopt;
    }
}

void appendLittleEndian(std::vector<uint8_t>& bytes, uint64_t value, int size) {
    for (int i = 0; i < size; ++i) bytes.push_back(static_cast<uint8_t>(value >> (8 * i)));
}

std::vector<uint8_t> imageReport(uint32_t frameNumber, uint32_t timeMs, const SensorReadings& readings) {
    std::vector<uint8_t> bytes;
    bytes.reserve(InputReport::Image::kReportLength);
    bytes.push_back(InputReport::kImageReportID);
    appendLittleEndian(bytes, frameNumber, 4);
    appendLittleEndian(bytes, timeMs, 4);
    bytes.insert(bytes.end(), 4, 0);  // aux0..aux3
    for (uint16_t raw : readings.rawPixels) appendLittleEndian(bytes, raw, 2);
    for (int16_t pixel : readings.pixels) appendLittleEndian(bytes, static_cast<uint16_t>(pixel), 2);
    return bytes;
}

std::vector<uint8_t> firmwareResetReport() {
    std::vector<uint8_t> bytes(InputReport::FirmwareEvent::kReportLength, 0);
    bytes[0] = InputReport::kFirmwareEventReportID;
    bytes[1] = InputReport::FirmwareEvent::kReset;
    return bytes;
}

uint64_t nanosecondsAt(double timeMs) { return kSynthesisStartNs + static_cast<uint64_t>(std::llround(timeMs * 1e6)); }

}  // namespace

std::string_view fingerName(Finger finger) {
    switch (finger) {
    case Finger::Light: return "light";
    case Finger::Normal: return "normal";
    case Finger::Heavy: return "heavy";
    }
    return "";
}

std::optional<Finger> fingerFromName(std::string_view name) {
    for (Finger finger : {Finger::Light, Finger::Normal, Finger::Heavy}) {
        if (fingerName(finger) == name) return finger;
    }
    return std::nullopt;
}

Synthesis synthesize(const GestureScript& script, uint64_t seed, const SynthesisOptions& options) {
    SeededRandom random(seed);
    FingerModel model(seed ^ 0x5eed5eed5eed5eedull, options.noiseDeviation);
    const double pressScale = options.finger == Finger::Light ? kLightPressScale : options.finger == Finger::Heavy ? kHeavyPressScale : 1.0;
    const double pressRadius = options.finger == Finger::Light ? kLightPressRadius : options.finger == Finger::Heavy ? kHeavyPressRadius : kPressRadius;

    // Lay the gestures out in time.
    std::vector<Segment> segments;
    std::vector<TimedItem> items;  // resets and settings, in time order
    std::vector<std::pair<double, double>> spanTimes;
    double cursor = kLeadInMs;
    double lastTouchStart = cursor;
    for (const Gesture& gesture : script.gestures) {
        switch (gesture.kind) {
        case GestureKind::Tap:
        case GestureKind::Hold:
        case GestureKind::Slide:
        case GestureKind::Brush: {
            Segment segment;
            segment.gesture = &gesture;
            segment.startMs = cursor;
            segment.endMs = cursor + gesture.durationMs;
            const double angle = random.uniform(0.0, 2.0 * std::numbers::pi);
            const double distance = random.uniform(0.0, 0.35);
            segment.offset = SurfacePoint{distance * std::cos(angle), distance * std::sin(angle)};
            const double base = gesture.kind == GestureKind::Brush ? kBrushStrength : kPressStrength * pressScale;
            segment.radius = gesture.kind == GestureKind::Brush ? kBrushRadius : pressRadius;
            segment.strength = base * random.uniform(0.9, 1.1);
            segment.wobblePhase = random.uniform(0.0, 2.0 * std::numbers::pi);
            segments.push_back(segment);
            spanTimes.emplace_back(cursor, segment.endMs);
            lastTouchStart = cursor;
            cursor = segment.endMs;
            break;
        }
        case GestureKind::Wait:
            spanTimes.emplace_back(cursor, cursor + gesture.durationMs);
            cursor += gesture.durationMs;
            break;
        case GestureKind::Reset:
            if (gesture.hasOffset) {
                const double at = lastTouchStart + gesture.durationMs;
                items.push_back(TimedItem{&gesture, at});
                spanTimes.emplace_back(at, at);
            } else {
                items.push_back(TimedItem{&gesture, cursor});
                spanTimes.emplace_back(cursor, cursor + kRebootMs);
                cursor += kRebootMs;
            }
            break;
        case GestureKind::Set:
            items.push_back(TimedItem{&gesture, cursor});
            spanTimes.emplace_back(cursor, cursor);
            break;
        }
    }
    const double endMs = cursor + kTrailMs;
    std::stable_sort(items.begin(), items.end(), [](const TimedItem& a, const TimedItem& b) { return a.timeMs < b.timeMs; });

    Synthesis synthesis;
    for (size_t i = 0; i < script.gestures.size(); ++i) {
        synthesis.spans.push_back(GestureSpan{script.gestures[i], nanosecondsAt(spanTimes[i].first), nanosecondsAt(spanTimes[i].second)});
    }

    // Run the firmware's frame clock over the timeline.
    double frameTime = 0.0;
    double firmwareOrigin = 0.0;
    uint32_t firmwareBaseMs = kFirmwareStartMs;
    uint32_t frameNumber = kFirstFrameNumber;
    uint64_t lastTimestamp = 0;
    size_t nextItem = 0;
    size_t segmentIndex = 0;
    synthesis.frames.reserve(static_cast<size_t>(endMs / kFramePeriodMs) + items.size() + 1);
    for (;;) {
        while (nextItem < items.size() && items[nextItem].timeMs <= frameTime) {
            const TimedItem& item = items[nextItem++];
            const uint64_t timestamp = std::max(nanosecondsAt(item.timeMs), lastTimestamp + 1000);
            lastTimestamp = timestamp;
            if (item.gesture->kind == GestureKind::Set) {
                synthesis.frames.push_back(PipelineRecording::Frame::state(timestamp, item.gesture->key, item.gesture->value));
            } else {
                synthesis.frames.push_back(PipelineRecording::Frame::inputReport(timestamp, firmwareResetReport()));
                // The controller restarts: silence, then a fresh frame counter and clock.
                frameTime = std::max(frameTime, item.timeMs + kRebootMs);
                firmwareOrigin = frameTime;
                firmwareBaseMs = 0;
                frameNumber = 0;
            }
        }
        if (frameTime > endMs) break;

        while (segmentIndex < segments.size() && segments[segmentIndex].endMs <= frameTime) ++segmentIndex;
        std::optional<FingerContact> contact;
        if (segmentIndex < segments.size() && segments[segmentIndex].startMs <= frameTime) {
            contact = contactAt(segments[segmentIndex], frameTime);
        }
        const SensorReadings readings = model.read(contact);
        const uint32_t timeMs = firmwareBaseMs + static_cast<uint32_t>(std::lround(frameTime - firmwareOrigin));
        const double latencyUs = random.uniform(kArrivalLatencyMinUs, kArrivalLatencyMaxUs);
        const uint64_t timestamp = std::max(nanosecondsAt(frameTime) + static_cast<uint64_t>(latencyUs * 1000.0), lastTimestamp + 1000);
        lastTimestamp = timestamp;
        synthesis.frames.push_back(PipelineRecording::Frame::inputReport(timestamp, imageReport(frameNumber, timeMs, readings)));
        ++frameNumber;
        frameTime += kFramePeriodMs;
    }
    return synthesis;
}

PipelineRecording recordingFromSynthesis(const Synthesis& synthesis) {
    PipelineRecording recording;
    for (const PipelineRecording::Frame& frame : synthesis.frames) recording.appendFrame(frame);
    return recording;
}

}  // namespace TolkaTouch::Tools

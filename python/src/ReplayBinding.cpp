#include "ReplayBinding.h"

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <pybind11/numpy.h>
#include <pybind11/stl.h>

#include "common/Util.h"
#include "pipeline/Pipeline.h"
#include "tolkatouch/FrameSnapshot.h"
#include "tolkatouch/Gesture.h"
#include "tolkatouch/Settings.h"

#include "ArrayColumns.h"
#include "RecordingBinding.h"

namespace TolkaTouch::Python {

namespace {

// One row of the events array.
struct EventRow {
    int64_t frame;     // the image's frame number; -1 for the firmware reset
    uint64_t time;     // host clock ticks, as `replay --json` prints "timestamp"
    double seconds;    // since the recording's first frame
    uint32_t phase;
    uint32_t region;
    uint8_t kind;      // GestureKind: may-begin 0 ... reset 6; 255 for an event that is not a gesture
};

constexpr uint8_t kNotAGesture = 255;

// Every per-frame number of the snapshot, one column each.
struct FrameColumns {
    std::vector<uint32_t> frame;
    std::vector<int64_t> time;
    std::vector<uint64_t> hostTime;
    std::vector<double> seconds;
    std::vector<int16_t> readings;
    std::vector<int32_t> pixelValues;
    std::vector<float> normalized;
    std::vector<uint8_t> on;
    std::vector<int32_t> virtualValues;
    std::vector<float> virtualNormalized;
    std::vector<uint8_t> virtualOn;
    std::vector<float> touchScore, svmScore, strengthRate, strengthPerDuration, durationRatio, tapScore;
    std::vector<int32_t> activePixelCount, sinceTouchStartMs, touchLengthMs;
    std::vector<uint8_t> touching, aboveNoise, transition, holdSuppressed, holdClock, region;

    void reserve(size_t n) {
        frame.reserve(n);
        time.reserve(n);
        hostTime.reserve(n);
        seconds.reserve(n);
        readings.reserve(n * kPixelCount);
        pixelValues.reserve(n * kPixelCount);
        normalized.reserve(n * kPixelCount);
        on.reserve(n * kPixelCount);
        virtualValues.reserve(n * kVirtualPixelCount);
        virtualNormalized.reserve(n * kVirtualPixelCount);
        virtualOn.reserve(n * kVirtualPixelCount);
        for (auto* column : {&touchScore, &svmScore, &strengthRate, &strengthPerDuration, &durationRatio, &tapScore}) {
            column->reserve(n);
        }
        for (auto* column : {&activePixelCount, &sinceTouchStartMs, &touchLengthMs}) column->reserve(n);
        for (auto* column : {&touching, &aboveNoise, &transition, &holdSuppressed, &holdClock, &region}) column->reserve(n);
    }

    void append(const FrameSnapshot& s, uint64_t ticks, double sinceStart) {
        frame.push_back(s.frameNumber);
        time.push_back(s.timeMs);
        hostTime.push_back(ticks);
        seconds.push_back(sinceStart);
        readings.insert(readings.end(), s.readings.begin(), s.readings.end());
        pixelValues.insert(pixelValues.end(), s.pixelValues.begin(), s.pixelValues.end());
        normalized.insert(normalized.end(), s.pixelNormalized.begin(), s.pixelNormalized.end());
        on.insert(on.end(), s.pixelOn.begin(), s.pixelOn.end());
        virtualValues.insert(virtualValues.end(), s.virtualValues.begin(), s.virtualValues.end());
        virtualNormalized.insert(virtualNormalized.end(), s.virtualNormalized.begin(), s.virtualNormalized.end());
        virtualOn.insert(virtualOn.end(), s.virtualOn.begin(), s.virtualOn.end());
        touchScore.push_back(s.touchScore);
        svmScore.push_back(s.svmScore);
        strengthRate.push_back(s.strengthRate);
        strengthPerDuration.push_back(s.strengthPerDuration);
        durationRatio.push_back(s.durationRatio);
        tapScore.push_back(s.tapScore);
        activePixelCount.push_back(s.activePixelCount);
        sinceTouchStartMs.push_back(s.sinceTouchStartMs);
        touchLengthMs.push_back(s.touchLengthMs);
        touching.push_back(s.touching);
        aboveNoise.push_back(s.aboveNoise);
        transition.push_back(static_cast<uint8_t>(s.verdict.transition));
        holdSuppressed.push_back(s.verdict.holdSuppressed);
        holdClock.push_back(static_cast<uint8_t>(s.verdict.holdClock));
        region.push_back(static_cast<uint8_t>(s.verdict.region));
    }

    py::dict arrays() && {
        py::dict d;
        d["frame"] = arrayFrom(std::move(frame));
        d["time"] = arrayFrom(std::move(time));
        d["host_time"] = arrayFrom(std::move(hostTime));
        d["seconds"] = arrayFrom(std::move(seconds));
        d["readings"] = arrayFrom(std::move(readings), kPixelCount);
        d["pixel_values"] = arrayFrom(std::move(pixelValues), kPixelCount);
        d["normalized"] = arrayFrom(std::move(normalized), kPixelCount);
        d["on"] = boolArrayFrom(std::move(on), kPixelCount);
        d["virtual_values"] = arrayFrom(std::move(virtualValues), kVirtualPixelCount);
        d["virtual_normalized"] = arrayFrom(std::move(virtualNormalized), kVirtualPixelCount);
        d["virtual_on"] = boolArrayFrom(std::move(virtualOn), kVirtualPixelCount);
        d["touch_score"] = arrayFrom(std::move(touchScore));
        d["svm_score"] = arrayFrom(std::move(svmScore));
        d["strength_rate"] = arrayFrom(std::move(strengthRate));
        d["strength_per_duration"] = arrayFrom(std::move(strengthPerDuration));
        d["duration_ratio"] = arrayFrom(std::move(durationRatio));
        d["active_pixel_count"] = arrayFrom(std::move(activePixelCount));
        d["tap_score"] = arrayFrom(std::move(tapScore));
        d["touching"] = boolArrayFrom(std::move(touching));
        d["above_noise"] = boolArrayFrom(std::move(aboveNoise));
        d["since_touch_start_ms"] = arrayFrom(std::move(sinceTouchStartMs));
        d["touch_length_ms"] = arrayFrom(std::move(touchLengthMs));
        d["transition"] = arrayFrom(std::move(transition));
        d["hold_suppressed"] = boolArrayFrom(std::move(holdSuppressed));
        d["hold_clock"] = arrayFrom(std::move(holdClock));
        d["region"] = arrayFrom(std::move(region));
        return d;
    }
};

struct ReplayColumns {
    std::vector<EventRow> events;
    FrameColumns frames;
};

double secondsBetween(uint64_t origin, uint64_t ticks) {
    // A document whose frames go back in time puts an event before the first frame.
    if (ticks < origin) return -static_cast<double>(Util::nanosecondsFromMachTime(origin - ticks)) / 1e9;
    return static_cast<double>(Util::nanosecondsFromMachTime(ticks - origin)) / 1e9;
}

// Plays every frame at once into a fresh pipeline with the host clock at the recorded times, as
// the recording's own playback does for `replay --fast`, taking the recognizer's snapshot after
// every image.
ReplayColumns play(const PipelineRecording& recording, const std::vector<CheckedSetting>& settings) {
    ReplayColumns out;
    const auto& frames = recording.frames();
    if (frames.empty()) return out;
    out.frames.reserve(frames.size());

    Pipeline pipeline;
    const uint64_t firstNs = frames.front().timestamp;
    const uint64_t origin = Util::machTimeFromNanoseconds(firstNs);
    bool imageSeen = false;
    pipeline.imageProbe = [&imageSeen](const InputReport::Image&) { imageSeen = true; };
    pipeline.hidEventsProbe = [&](const EventList& events) {
        for (const HIDEventRef& event : events) {
            EventRow row{};
            row.time = event->timestamp;
            row.seconds = secondsBetween(origin, event->timestamp);
            row.phase = event->phase;
            const bool digitizer = event->type == HIDEventType::Digitizer;
            row.frame = digitizer ? event->integerValue(kDigitizerFrameNumberField) : -1;
            row.region = digitizer ? static_cast<uint32_t>(static_cast<int64_t>(event->y)) : 0;
            const auto gesture = GestureCodec::decode(*event);
            row.kind = gesture ? static_cast<uint8_t>(gesture->kind) : kNotAGesture;
            out.events.push_back(row);
        }
    };
    pipeline.setTime(origin);
    for (const CheckedSetting& setting : settings) pipeline.setState(setting.setting->algsKey(), setting.value);

    for (const PipelineRecording::Frame& frame : frames) {
        pipeline.setTime(origin + Util::machTimeFromNanoseconds(frame.timestamp - firstNs));
        if (frame.type == PipelineRecording::FrameType::InputReport) {
            pipeline.handleInputReport(frame.report.data(), frame.report.size());
            if (imageSeen) {
                imageSeen = false;
                out.frames.append(pipeline.algs.snapshot(), pipeline.currentTime, secondsBetween(origin, pipeline.currentTime));
            }
        } else {
            // A state frame read from a document without a "Value" is replayed as null.
            pipeline.setState(frame.key, frame.value.value_or(PropertyValue()));
        }
    }
    return out;
}

}  // namespace

void addReplay(py::module_& module) {
    PYBIND11_NUMPY_DTYPE(EventRow, frame, time, seconds, phase, region, kind);

    module.def(
        "replay_arrays",
        [](const Recording& recording, const std::vector<std::string>& assignments) {
            // Checked as `replay --set` checks them, before anything is played.
            std::vector<CheckedSetting> settings;
            for (const std::string& assignment : assignments) settings.push_back(checkSettingAssignment(assignment));
            ReplayColumns columns;
            {
                py::gil_scoped_release unlocked;
                columns = play(recording.recording(), settings);
            }
            py::array events = arrayFrom(std::move(columns.events));
            return py::make_tuple(events, std::move(columns.frames).arrays());
        },
        py::arg("recording"), py::arg("settings"),
        "Plays the recording with the settings ('KEY=VALUE', checked like `replay --set`); returns (events, "
        "frame columns). Use tolkatouch.replay instead.");
}

}  // namespace TolkaTouch::Python

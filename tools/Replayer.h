#pragma once
// Replayer: plays a recording into a fresh Pipeline, as `tolkatouch replay` does, and hands
// every event the pipeline's HID events probe receives to the caller as it happens.
//
// The replay clock starts at the first frame's recorded time, so the events carry the host
// clock times at which the recorded frames arrived, whatever the speed. Pacing sleeps on the
// host clock unless the replay is fast.

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "pipeline/Pipeline.h"
#include "pipeline/PipelineRecording.h"

namespace TolkaTouch::Tools {

// Speeds a paced replay takes: slower than a hundredth would turn seconds into hours, faster than
// a thousand is what --fast is for.
inline constexpr float kMinReplaySpeed = 0.01f;
inline constexpr float kMaxReplaySpeed = 1000.0f;
// The longest pause a paced replay makes: a longer gap in a recording (a device left idle, or a
// broken time stamp) is cut to this.
inline constexpr uint64_t kMaxReplayPauseMicroseconds = 10'000'000;

struct ReplayOptions {
    float speed = 1.0f;
    bool fast = false;  // every frame at once, no sleeping
    std::vector<std::pair<std::string, PropertyValue>> settings;  // applied before the first frame
    // How a paced replay waits, and who hears of a pause that was cut (the pause asked for).
    std::function<void(uint64_t microseconds)> sleep;
    std::function<void(uint64_t microseconds)> onPauseCut;
};

class Replayer {
public:
    // Hands out the next frame; false at the end.
    using FrameSource = std::function<bool(PipelineRecording::Frame& frame)>;

    explicit Replayer(PipelineRecording recording);
    // Plays frames as the source hands them out, holding none of them: a recording of any length
    // replays in the memory of one frame. Reads the first frame at once, for the replay clock.
    explicit Replayer(FrameSource source);

    // Plays every frame once; onEvent sees each event after the pipeline stamped it.
    void run(const ReplayOptions& options, const std::function<void(const HIDEvent&)>& onEvent);

    // The replay clock at the first frame, in host clock ticks.
    uint64_t origin() const { return _origin; }
    // Seconds from the first frame to an event's time stamp.
    double secondsSinceStart(const HIDEvent& event) const;

    Pipeline& pipeline() { return *_pipeline; }

private:
    PipelineRecording _recording;
    FrameSource _source;
    PipelineRecording::Frame _firstFrame;
    bool _hasFirstFrame = false;
    std::shared_ptr<Pipeline> _pipeline;
    uint64_t _origin = 0;
};

}  // namespace TolkaTouch::Tools

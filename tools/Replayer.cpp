#include "tools/Replayer.h"

#include "common/Util.h"
#include "platform/HostClock.h"

namespace TolkaTouch::Tools {

Replayer::Replayer(PipelineRecording recording)
    : _recording(std::move(recording)), _pipeline(std::make_shared<Pipeline>()) {
    _recording.pipeline = _pipeline;
    if (!_recording.frames().empty()) _origin = Util::machTimeFromNanoseconds(_recording.frames().front().timestamp);
}

Replayer::Replayer(FrameSource source) : _source(std::move(source)), _pipeline(std::make_shared<Pipeline>()) {
    _recording.pipeline = _pipeline;
    _hasFirstFrame = _source(_firstFrame);
    if (_hasFirstFrame) _origin = Util::machTimeFromNanoseconds(_firstFrame.timestamp);
}

void Replayer::run(const ReplayOptions& options, const std::function<void(const HIDEvent&)>& onEvent) {
    const uint64_t origin = _origin;
    _recording.clock.now = [origin] { return origin; };
    if (options.fast) {
        _recording.clock.sleepMicroseconds = [](uint64_t) {};
    } else {
        std::function<void(uint64_t)> sleep = options.sleep ? options.sleep : Host::sleepMicroseconds;
        _recording.clock.sleepMicroseconds = [sleep, cut = options.onPauseCut](uint64_t microseconds) {
            if (microseconds > kMaxReplayPauseMicroseconds) {
                if (cut) cut(microseconds);
                microseconds = kMaxReplayPauseMicroseconds;
            }
            sleep(microseconds);
        };
    }

    _pipeline->hidEventsProbe = [&onEvent](const EventList& events) {
        for (const HIDEventRef& event : events) onEvent(*event);
    };
    _pipeline->setTime(origin);
    for (const auto& [key, value] : options.settings) _pipeline->setState(key, value);

    _recording.playReset();
    if (_source) {
        if (_hasFirstFrame) {
            _recording.playFrame(_firstFrame, options.speed);
            PipelineRecording::Frame frame;
            while (_source(frame)) _recording.playFrame(frame, options.speed);
        }
    } else {
        while (_recording.playCanContinue()) _recording.playNextFrame(options.speed);
    }
    _pipeline->hidEventsProbe = nullptr;
}

double Replayer::secondsSinceStart(const HIDEvent& event) const {
    // A document whose frames go back in time puts an event before the first frame.
    if (event.timestamp < _origin) return -static_cast<double>(Util::nanosecondsFromMachTime(_origin - event.timestamp)) / 1e9;
    return static_cast<double>(Util::nanosecondsFromMachTime(event.timestamp - _origin)) / 1e9;
}

}  // namespace TolkaTouch::Tools

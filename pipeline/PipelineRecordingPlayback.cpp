// Playback: delivers the recorded frames to the wrapped pipeline in order, pacing input reports
// by their recorded spacing and telling the pipeline a clock that reproduces the recorded times.

#include <cstdint>
#include <stdexcept>

#include "pipeline/PipelineRecording.h"
#include "common/Util.h"

namespace TolkaTouch {

namespace {

// The pause before a report: the recorded gap in single precision, divided by the speed and by
// 1000 to microseconds, cut toward zero. Gaps too long for the count saturate.
uint64_t pacingMicroseconds(uint64_t gapNanoseconds, float speed) {
    const float microseconds = static_cast<float>(gapNanoseconds) / speed / 1000.0f;
    if (!(microseconds < 18446744073709551616.0f)) return UINT64_MAX;
    return static_cast<uint64_t>(microseconds);
}

}  // namespace

void PipelineRecording::playReset() {
    _play.valid = true;
    _play.iterator = _frames.begin();
    _play.startTimeMach = clock.now();
    _play.lastInputReportTimeNs.reset();
    _play.firstTimestampNs.reset();
    if (!_frames.empty()) _play.firstTimestampNs = _frames.front().timestamp;
}

bool PipelineRecording::playCanContinue() const { return _play.valid && _play.iterator != _frames.end(); }

void PipelineRecording::playNextFrame(float speed) {
    if (!playCanContinue()) throw std::runtime_error("playback finished");
    if (!(speed > 0.0f)) speed = 1.0f;  // zero, negative or not a number

    // Advance before delivering: a frame that makes the pipeline fail is not delivered twice.
    const Frame& frame = *_play.iterator;
    ++_play.iterator;
    deliver(frame, speed);
}

void PipelineRecording::playFrame(const Frame& frame, float speed) {
    if (!(speed > 0.0f)) speed = 1.0f;
    if (!_play.firstTimestampNs) _play.firstTimestampNs = frame.timestamp;
    deliver(frame, speed);
}

void PipelineRecording::deliver(const Frame& frame, float speed) {
    if (frame.type == FrameType::InputReport) {
        if (_play.lastInputReportTimeNs && frame.timestamp > *_play.lastInputReportTimeNs) {
            clock.sleepMicroseconds(pacingMicroseconds(frame.timestamp - *_play.lastInputReportTimeNs, speed));
        }
        _play.lastInputReportTimeNs = frame.timestamp;
    }

    if (!pipeline) return;
    // The clock follows the recorded spacing whatever the speed, so the recognizer sees the
    // times it saw when the frames were recorded.
    pipeline->setTime(_play.startTimeMach + Util::machTimeFromNanoseconds(frame.timestamp - *_play.firstTimestampNs));
    switch (frame.type) {
    case FrameType::InputReport:
        pipeline->handleInputReport(frame.report.data(), frame.report.size());
        break;
    case FrameType::State:
        // A state frame read from a document without a "Value" is replayed as null.
        pipeline->setState(frame.key, frame.value.value_or(PropertyValue()));
        break;
    default:
        break;
    }
}

}  // namespace TolkaTouch

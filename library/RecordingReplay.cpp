#include "tolkatouch/RecordingReplay.h"

#include <exception>
#include <memory>
#include <optional>
#include <vector>

#include "common/Util.h"
#include "pipeline/Pipeline.h"
#include "pipeline/PipelineRecording.h"

namespace TolkaTouch {

void replayDocument(std::span<const uint8_t> document, const std::function<void(const HIDEvent&)>& onEvent) {
    const std::vector<uint8_t> bytes(document.begin(), document.end());
    std::optional<PipelineRecording> recording;
    try {
        recording.emplace(&bytes);
    } catch (const std::exception& error) {
        throw DocumentError(error.what());
    }

    auto pipeline = std::make_shared<Pipeline>();
    recording->pipeline = pipeline;
    // The replay clock stays at the first frame's recorded time and never sleeps: the recording
    // sets each frame's own time on the pipeline, so events carry the times the frames arrived.
    const uint64_t origin =
        recording->frames().empty() ? 0 : Util::machTimeFromNanoseconds(recording->frames().front().timestamp);
    recording->clock.now = [origin] { return origin; };
    recording->clock.sleepMicroseconds = [](uint64_t) {};
    pipeline->hidEventsProbe = [&onEvent](const EventList& events) {
        for (const HIDEventRef& event : events) onEvent(*event);
    };
    pipeline->setTime(origin);

    recording->playReset();
    while (recording->playCanContinue()) recording->playNextFrame(1.0f);
}

}  // namespace TolkaTouch

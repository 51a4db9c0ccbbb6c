// Any bytes given as a recording document: reading either succeeds or raises an exception with
// one of the reader's messages. A document that reads must write, read back to the same frames
// and write again to the same text, and must play through a pipeline.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <exception>
#include <memory>
#include <vector>

#include "pipeline/Pipeline.h"
#include "pipeline/PipelineRecording.h"

using TolkaTouch::HostClock;
using TolkaTouch::Pipeline;
using TolkaTouch::PipelineRecording;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<uint8_t> document(data, data + size);
    std::unique_ptr<PipelineRecording> recording;
    try {
        recording = std::make_unique<PipelineRecording>(&document);
    } catch (const std::exception&) {
        return 0;
    }

    const std::vector<uint8_t> written = recording->json();
    PipelineRecording reread(&written);  // must not throw: what the writer writes, the reader reads
    if (reread.frames().size() != recording->frames().size()) std::abort();
    if (reread.json() != written) std::abort();

    // Played on a clock that never sleeps, so long gaps in the document cost nothing.
    recording->pipeline = std::make_shared<Pipeline>();
    recording->clock = HostClock{[] { return uint64_t{1000}; }, [](uint64_t) {}};
    recording->playReset();
    while (recording->playCanContinue()) recording->playNextFrame(1.0f);
    return 0;
}

// Any bytes as a run of input reports through a pipeline: each report is a length byte and up to
// that many bytes. Short, long, foreign and disjoint reports must all be taken without a crash,
// and the counters must stay readable.

#include <cstddef>
#include <cstdint>

#include "pipeline/Pipeline.h"

using namespace TolkaTouch;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Pipeline pipeline;
    size_t events = 0;
    pipeline.hidEventsProbe = [&events](const EventList& list) { events += list.size(); };
    size_t at = 0;
    uint64_t time = 0;
    while (at < size) {
        const size_t length = data[at++];
        const size_t available = size - at < length ? size - at : length;
        pipeline.setTime(time += 8'000'000);
        pipeline.handleInputReport(data + at, available);
        at += available;
    }
    (void)pipeline.getState("DebugInfo");
    (void)pipeline.getState("Algs.EventStats");
    return 0;
}

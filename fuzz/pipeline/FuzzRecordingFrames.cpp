// Any bytes as a recording in either form, read a frame at a time as replay, show, convert and the
// feeder read it: each frame reads or the reader raises one of its errors. What reads, written in
// the line form, must read back to the same frames.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <exception>
#include <list>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

#include "pipeline/RecordingFrameReader.h"
#include "pipeline/RecordingLines.h"

using namespace TolkaTouch;

namespace {

bool sameFrame(const PipelineRecording::Frame& a, const PipelineRecording::Frame& b) {
    return a.type == b.type && a.timestamp == b.timestamp && a.report == b.report && a.key == b.key &&
           a.value == b.value;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::list<PipelineRecording::Frame> frames;
    try {
        auto reader = RecordingFrameReader::fromBytes(std::vector<uint8_t>(data, data + size), [](const std::string&) {});
        PipelineRecording::Frame frame;
        while (reader->next(frame)) frames.push_back(frame);
    } catch (const RecordingReadError&) {
        return 0;
    } catch (const std::invalid_argument&) {
        return 0;
    } catch (const std::runtime_error&) {
        return 0;
    }

    std::string written;
    {
        RecordingLinesWriter writer([&](std::string_view bytes) { written.append(bytes); }, RecordingLinesHeader{});
        for (const auto& frame : frames) writer.writeFrame(frame);
    }
    auto again = RecordingFrameReader::fromBytes(std::vector<uint8_t>(written.begin(), written.end()));
    PipelineRecording::Frame frame;
    for (const auto& expected : frames) {
        if (!again->next(frame) || !sameFrame(frame, expected)) std::abort();
    }
    if (again->next(frame)) std::abort();
    return 0;
}

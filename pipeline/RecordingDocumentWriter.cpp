#include "pipeline/RecordingDocumentWriter.h"

#include <utility>

#include "pipeline/RecordingFrameJson.h"

namespace TolkaTouch {

namespace {
constexpr int kIndent = 4;
constexpr size_t kBufferLimit = 256 * 1024;
}  // namespace

RecordingDocumentWriter::RecordingDocumentWriter(Sink sink) : _sink(std::move(sink)) {
    _buffer = "{\n    \"Version\": 1,\n    \"Frames\": [";
}

void RecordingDocumentWriter::writeFrame(const PipelineRecording::Frame& frame) {
    using Type = PipelineRecording::FrameType;
    if (frame.type != Type::InputReport && frame.type != Type::State) return;
    _buffer += _anyFrame ? ",\n        " : "\n        ";
    _anyFrame = true;
    RecordingFrameJson::appendFrame(_buffer, frame, kIndent, 2);
    if (_sink && _buffer.size() >= kBufferLimit) flush();
}

void RecordingDocumentWriter::finish(std::string_view after) {
    _buffer += _anyFrame ? "\n    ]\n}" : "]\n}";
    _buffer += after;
    flush();
}

void RecordingDocumentWriter::flush() {
    if (!_sink || _buffer.empty()) return;
    _sink(_buffer);
    _buffer.clear();
}

}  // namespace TolkaTouch

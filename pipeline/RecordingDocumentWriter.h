#pragma once
// RecordingDocumentWriter: writes the document form a frame at a time, in the indented layout
// the recording's json() has always produced, without holding the frames or a tree of them.

#include <string>
#include <string_view>

#include "pipeline/PipelineRecording.h"
#include "pipeline/RecordingLines.h"

namespace TolkaTouch {

class RecordingDocumentWriter {
public:
    using Sink = RecordingLinesWriter::Sink;

    // Text collects in `out`; the sink, if any, takes it whenever it grows past a few pages
    // and at flush().
    explicit RecordingDocumentWriter(Sink sink);
    RecordingDocumentWriter(const RecordingDocumentWriter&) = delete;
    RecordingDocumentWriter& operator=(const RecordingDocumentWriter&) = delete;

    // Frames of a type other than state or input report are skipped.
    void writeFrame(const PipelineRecording::Frame& frame);
    // Closes the document, followed by `after` (the document itself ends at its brace), and flushes.
    void finish(std::string_view after = {});
    void flush();

    // Without a sink: the document so far, for a caller that wants the bytes.
    std::string& text() { return _buffer; }

private:
    Sink _sink;
    std::string _buffer;
    bool _anyFrame = false;
};

}  // namespace TolkaTouch

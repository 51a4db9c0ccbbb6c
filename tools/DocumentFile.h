#pragma once
// Reading and writing the files the tool works on, with the one-line errors it reports:
// ToolError carries "<path>: <message>", which main prints after "tolkatouch: ". The path "-"
// stands for standard input or standard output.

#include <cstdint>
#include <stdexcept>
#include <string>
#include <vector>

#include <memory>
#include <utility>

#include "pipeline/PipelineRecording.h"
#include "pipeline/RecordingFrameReader.h"

namespace TolkaTouch::Tools {

class ToolError : public std::runtime_error {
public:
    ToolError(const std::string& subject, const std::string& message, std::string detail = {})
        : std::runtime_error(subject + ": " + message), _detail(std::move(detail)) {}
    // A second line for the error: the parser's reason and where it stopped; may be empty.
    const std::string& detail() const { return _detail; }

private:
    std::string _detail;
};

// The whole file, or all of standard input for "-"; ToolError with the system's reason otherwise.
std::vector<uint8_t> readFileBytes(const std::string& path);

// Writes the bytes to the file (replacing it), or to standard output for "-".
void writeFileBytes(const std::string& path, const std::vector<uint8_t>& bytes);

// A recording built from the document's bytes (either form); the reader's own message becomes a
// ToolError naming `subject`, its reason and position the error's detail.
PipelineRecording recordingFromDocument(const std::vector<uint8_t>& document, const std::string& subject);

// The frames of the recording at `path` ("-": standard input), read as they are asked for. A
// warning (a cut-off last line) goes to standard error at once. Errors: as recordingFromDocument.
class RecordingFile {
public:
    explicit RecordingFile(const std::string& path);
    // The next frame; false at the end. Throws ToolError.
    bool next(PipelineRecording::Frame& frame);
    RecordingFrameReader& reader() { return *_reader; }
    const std::string& path() const { return _path; }

private:
    std::string _path;
    std::unique_ptr<RecordingFrameReader> _reader;
};

// Every frame of the recording at `path`, as a recording.
PipelineRecording loadRecording(const std::string& path);

}  // namespace TolkaTouch::Tools

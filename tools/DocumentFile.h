#pragma once
// Reading and writing the files the tool works on, with the one-line errors it reports:
// ToolError carries "<path>: <message>", which main prints after "tolkatouch: ". The path "-"
// stands for standard input or standard output.

#include <cstdint>
#include <stdexcept>
#include <string>
#include <vector>

#include "pipeline/PipelineRecording.h"

namespace TolkaTouch::Tools {

class ToolError : public std::runtime_error {
public:
    ToolError(const std::string& subject, const std::string& message) : std::runtime_error(subject + ": " + message) {}
};

// The whole file, or all of standard input for "-"; ToolError with the system's reason otherwise.
std::vector<uint8_t> readFileBytes(const std::string& path);

// Writes the bytes to the file (replacing it), or to standard output for "-".
void writeFileBytes(const std::string& path, const std::vector<uint8_t>& bytes);

// A recording built from the document's bytes; the reader's own message becomes a ToolError
// naming `subject`.
PipelineRecording recordingFromDocument(const std::vector<uint8_t>& document, const std::string& subject);

// readFileBytes, then recordingFromDocument.
PipelineRecording loadRecording(const std::string& path);

}  // namespace TolkaTouch::Tools

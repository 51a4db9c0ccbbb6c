#pragma once
// Reading the document form of a recording (version 1, and the older version 0) from its bytes,
// with simdjson's on-demand parser where the document is as the writer makes it and the general
// reader otherwise, so the frames and every error (message and kind) are the same either way.
// Also: which form some bytes are in, and the position and reason behind a reading's error.

#include <cstddef>
#include <cstdint>
#include <list>
#include <optional>
#include <string_view>
#include <string>

#include "pipeline/PipelineRecording.h"

namespace TolkaTouch::RecordingDocumentReader {

// The frames of a document; throws std::invalid_argument or std::runtime_error with the reader's
// messages ("migrateSerializedContainer failed: invalid container", "invalid frame type", ...).
std::list<PipelineRecording::Frame> read(const uint8_t* data, size_t size);

// read(), but a failure also leaves in `detail` the parser's reason and where it stopped (byte
// offset, line and column, or the frame), control characters escaped; before rethrowing.
std::list<PipelineRecording::Frame> read(const uint8_t* data, size_t size, std::string& detail);

// The general reader alone (a tree of the whole document); the fast reader's reference.
std::list<PipelineRecording::Frame> readGeneral(const uint8_t* data, size_t size);

// True when the first line is the header of the line-per-report form ({"Format":"lines",...}).
bool isLinesForm(const uint8_t* data, size_t size);

// Why JSON text does not parse, and where: "byte 12 (line 2, column 3): <reason>"; empty when
// it parses as a document (an object or array no deeper than the reader's limit).
std::string syntaxProblem(const uint8_t* data, size_t size);

// The same as parts: the byte offset where the parser stopped (none for a problem without a
// place) and its reason, escaped; an empty reason when the text parses.
struct SyntaxProblem {
    std::optional<size_t> offset;
    std::string reason;
};
SyntaxProblem findSyntaxProblem(const uint8_t* data, size_t size);

}  // namespace TolkaTouch::RecordingDocumentReader

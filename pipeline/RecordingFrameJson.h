#pragma once
// RecordingFrameJson: the frame objects of a recording, read with simdjson's on-demand parser
// and written as compact or indented text without building a tree. Shared by the document form
// and the line-per-report form.
//
// The fast reader decides only the frames it can decide exactly (the layouts the writers make,
// in any member order and formatting); anything else (an error, an unknown member, an escape in
// a key) answers false, and the caller asks the general reader, which gives the exact result
// or message. So both readers always agree.

#include <cstdint>
#include <string>
#include <string_view>

#include <simdjson.h>

#include "pipeline/PipelineRecording.h"

namespace TolkaTouch::RecordingFrameJson {

// What the fast reader made of one frame object.
enum class Read { Frame, Event, Undecided };

// Reads one frame object. An "Event" frame (a line of the line-per-report form) leaves its
// event object's JSON text in `event` and its timestamp in frame.timestamp.
Read readFrame(simdjson::ondemand::object object, PipelineRecording::Frame& frame, std::string* event = nullptr);

// True when nothing but whitespace follows the document's one value.
bool atEnd(simdjson::ondemand::document& document);

// Report text as the writers make it ("01 0a ff ", the last space optional) decoded directly;
// any other text through the general hex reader (which throws "invalid hex string").
std::vector<uint8_t> reportBytesFromHexText(std::string_view text);

// Appends the report's hex text ("01 0a ff ") to `out`.
void appendHexText(std::string& out, const uint8_t* bytes, size_t length);

// Appends a JSON string literal (quotes included) as the document writer has always written
// it: UTF-8 kept, text that is not UTF-8 replaced by U+FFFD, control characters escaped.
void appendJsonString(std::string& out, std::string_view text);

// Appends the state value's JSON text; indent < 0 writes it compact, otherwise indented by
// `indent` spaces per level starting at `depth` levels (nested lines included).
void appendStateValue(std::string& out, const PropertyValue& value, int indent, int depth);

// Appends one frame object; indent < 0 writes it on one line (the line form), otherwise as the
// document writes it at nesting `depth` (its opening brace not indented, its closing one is).
void appendFrame(std::string& out, const PipelineRecording::Frame& frame, int indent, int depth);

}  // namespace TolkaTouch::RecordingFrameJson

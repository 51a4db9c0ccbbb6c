#include "pipeline/RecordingDocumentReader.h"

#include <algorithm>
#include <cstring>
#include <exception>
#include <optional>
#include <stdexcept>
#include <vector>

#include <nlohmann/json.hpp>
#include <simdjson.h>

#include "common/PrintableText.h"
#include "pipeline/RecordingFrameJson.h"
#include "platform/PropertyValueJson.h"

namespace TolkaTouch::RecordingDocumentReader {

namespace {

using Frame = PipelineRecording::Frame;

// Where the fast reader stopped, for the detail of an error the general reader then raises.
struct Stop {
    bool done = false;      // the fast reader decided the whole document
    long frameIndex = -1;   // the frame it could not decide, counted from 0; -1 outside the frames
    size_t offset = 0;      // byte offset of that frame
};

// The fast reader: the layout the writer makes (members in any order, any formatting), version 1.
// Anything else stops it; the general reader then decides.
Stop readFast(const uint8_t* data, size_t size, std::list<Frame>& frames) {
    Stop stop;
    // The parser reads past the end of the text, so it works on a copy with room after it. A
    // service's recording (well under a megabyte) is copied into storage kept for the next read,
    // which spares the allocator a large block per document; larger ones get storage of their own.
    constexpr size_t kKeptStorage = size_t{1} << 20;
    static thread_local std::vector<char> kept;
    std::vector<char> own;
    std::vector<char>& storage = size + simdjson::SIMDJSON_PADDING <= kKeptStorage ? kept : own;
    storage.resize(size + simdjson::SIMDJSON_PADDING);
    if (size != 0) std::memcpy(storage.data(), data, size);
    std::memset(storage.data() + size, 0, simdjson::SIMDJSON_PADDING);
    const simdjson::padded_string_view text(storage.data(), size, storage.size());
    static thread_local simdjson::ondemand::parser parser;
    simdjson::ondemand::document document;
    if (parser.iterate(text).get(document)) return stop;
    simdjson::ondemand::object top;
    if (document.get_object().get(top)) return stop;
    bool sawVersion = false;
    bool sawFrames = false;
    for (auto result : top) {
        simdjson::ondemand::field field;
        if (std::move(result).get(field)) return stop;
        const simdjson::ondemand::raw_json_string key = field.key();
        simdjson::ondemand::value& member = field.value();
        if (key == "Version") {
            uint64_t version = 0;
            if (sawVersion || member.get_uint64().get(version) || version != 1) return stop;
            sawVersion = true;
        } else if (key == "Frames") {
            simdjson::ondemand::array array;
            if (sawFrames || member.get_array().get(array)) return stop;
            sawFrames = true;
            long index = 0;
            for (auto element : array) {
                stop.frameIndex = index;
                if (const char* at = nullptr; !document.current_location().get(at)) {
                    stop.offset = static_cast<size_t>(at - text.data());
                }
                simdjson::ondemand::object object;
                if (element.get_object().get(object)) return stop;
                // Read straight into the list's new node, without a move.
                if (RecordingFrameJson::readFrame(object, frames.emplace_back()) != RecordingFrameJson::Read::Frame) {
                    frames.pop_back();
                    return stop;
                }
                ++index;
            }
            stop.frameIndex = -1;
        } else {
            return stop;
        }
    }
    if (!sawVersion || !sawFrames || !RecordingFrameJson::atEnd(document)) return stop;
    stop.done = true;
    return stop;
}

std::string position(const uint8_t* data, size_t size, size_t offset) {
    offset = std::min(offset, size);
    size_t line = 1;
    size_t lineStart = 0;
    for (size_t i = 0; i < offset; ++i) {
        if (data[i] == '\n') {
            ++line;
            lineStart = i + 1;
        }
    }
    return "byte " + std::to_string(offset) + " (line " + std::to_string(line) + ", column " +
           std::to_string(offset - lineStart + 1) + ")";
}

// Listens to the general parser only for its error and the nesting depth.
class ProblemFinder final : public nlohmann::json_sax<nlohmann::json> {
public:
    bool null() override { return scalar(); }
    bool boolean(bool) override { return scalar(); }
    bool number_integer(number_integer_t) override { return scalar(); }
    bool number_unsigned(number_unsigned_t) override { return scalar(); }
    bool number_float(number_float_t, const string_t&) override { return scalar(); }
    bool string(string_t&) override { return scalar(); }
    bool binary(binary_t&) override { return false; }
    bool start_object(std::size_t) override { return open(); }
    bool key(string_t&) override { return true; }
    bool end_object() override { return close(); }
    bool start_array(std::size_t) override { return open(); }
    bool end_array() override { return close(); }
    bool parse_error(std::size_t at, const std::string&, const nlohmann::detail::exception& error) override {
        offset = at == 0 ? 0 : at - 1;
        reason = error.what();
        // The library's own prefix ("[json.exception.parse_error.101] parse error at line 1,
        // column 5: ") repeats the position given already.
        if (const size_t colon = reason.find(": "); colon != std::string::npos) reason.erase(0, colon + 2);
        // One clause per comma reads as well, and keeps the line a single field in lists split at ';'.
        for (size_t at = reason.find("; "); at != std::string::npos; at = reason.find("; ", at)) reason[at] = ',';
        return false;
    }

    std::optional<size_t> offset;
    std::string reason;
    bool tooDeep = false;
    bool scalarTop = false;

private:
    bool scalar() {
        if (_depth == 0) scalarTop = true;
        return true;
    }
    bool open() {
        if (++_depth > PropertyValueJson::kMaxNestingDepth) {
            tooDeep = true;
            return false;
        }
        return true;
    }
    bool close() {
        --_depth;
        return true;
    }
    size_t _depth = 0;
};

// The detail of a wrapped error whose text parses: what about the container is wrong.
std::string containerProblem(const std::string& message) {
    const std::string inner = message.substr(message.find(": ") + 2);
    if (inner == "invalid container") return "the top level is an array, not an object";
    if (inner == "invalid version") return "\"Version\" is missing or is not a number";
    if (inner.rfind("invalid container version: ", 0) == 0) return "the versions this program reads are 0 and 1";
    if (inner == "frame lacks Timestamp") return "a report of \"Reports\" has no \"Timestamp\"";
    if (inner == "frame lacks ReportData") return "a report of \"Reports\" has no \"ReportData\"";
    return "at the top level of the document";
}

}  // namespace

SyntaxProblem findSyntaxProblem(const uint8_t* data, size_t size) {
    static const uint8_t empty = 0;
    if (data == nullptr) data = &empty, size = 0;
    ProblemFinder finder;
    const bool parsed = nlohmann::json::sax_parse(data, data + size, &finder);
    if (finder.tooDeep) {
        return {std::nullopt,
                "arrays and objects nested deeper than " + std::to_string(PropertyValueJson::kMaxNestingDepth) + " levels"};
    }
    if (!parsed && finder.offset) return {finder.offset, printableText(finder.reason)};
    if (finder.scalarTop) return {std::nullopt, "the text is a single value, not an object"};
    return {};
}

std::string syntaxProblem(const uint8_t* data, size_t size) {
    const SyntaxProblem problem = findSyntaxProblem(data, size);
    if (!problem.offset) return problem.reason;
    return position(data, size, *problem.offset) + ": " + problem.reason;
}

std::list<Frame> readGeneral(const uint8_t* data, size_t size) {
    PropertyValue container;
    try {
        container = PipelineRecording::migrateSerializedContainer(PropertyValueJson::parse(data, size));
    } catch (const std::exception& error) {
        throw std::runtime_error(std::string("migrateSerializedContainer failed: ") + error.what());
    }
    return PipelineRecording::framesFromContainer(container);
}

std::list<Frame> read(const uint8_t* data, size_t size) {
    std::list<Frame> frames;
    if (readFast(data, size, frames).done) return frames;
    return readGeneral(data, size);
}

std::list<Frame> read(const uint8_t* data, size_t size, std::string& detail) {
    std::list<Frame> frames;
    const Stop stop = readFast(data, size, frames);
    if (stop.done) return frames;
    try {
        return readGeneral(data, size);
    } catch (const std::runtime_error& error) {
        // The wrapped errors: the text does not parse, or its container is not a recording.
        detail = syntaxProblem(data, size);
        if (detail.empty()) detail = containerProblem(error.what());
        throw;
    } catch (const std::exception& error) {
        const std::string message = error.what();
        if (message == "invalid frames") {
            detail = "\"Frames\" is missing or is not an array";
        } else if (stop.frameIndex >= 0) {
            detail = "in frame " + std::to_string(stop.frameIndex + 1) + ", at " + position(data, size, stop.offset);
        } else {
            detail = "in one of the document's frames";
        }
        throw;
    }
}

bool isLinesForm(const uint8_t* data, size_t size) {
    // The header is short; a first line longer than this is a document on one line.
    constexpr size_t kLongestHeader = 1 << 20;
    if (data == nullptr) return false;
    const size_t scan = std::min(size, kLongestHeader);
    const void* newline = std::memchr(data, '\n', scan);
    const size_t length = newline ? static_cast<size_t>(static_cast<const uint8_t*>(newline) - data) : scan;
    if (length == size && size > kLongestHeader) return false;
    // A cheap look first: most documents are not in this form.
    const std::string_view line(reinterpret_cast<const char*>(data), length);
    if (line.find("\"Format\"") == std::string_view::npos) return false;
    const std::optional<PropertyValue> header = PropertyValueJson::parse(data, length);
    if (!header) return false;
    const PropertyValue* format = header->find("Format");
    return format != nullptr && format->isString() && *format->string() == "lines";
}

}  // namespace TolkaTouch::RecordingDocumentReader

#include "pipeline/RecordingFrameJson.h"

#include <array>
#include <charconv>
#include <exception>
#include <optional>
#include <utility>

#include <nlohmann/json.hpp>

#include "common/Util.h"
#include "platform/Hex.h"
#include "platform/PropertyValueJson.h"

namespace TolkaTouch::RecordingFrameJson {

namespace {

using simdjson::ondemand::json_type;
using simdjson::ondemand::raw_json_string;
using simdjson::ondemand::value;

// A state value sits inside the document object, the "Frames" array and its frame object; what
// it nests beyond the reader's limit is written as null (and, read, left to the general reader).
constexpr size_t kValueNestingDepth = PropertyValueJson::kMaxNestingDepth - 3;

// The text between the quotes of a string token without escapes; nothing when it has any.
std::optional<std::string_view> plainString(value& member) {
    std::string_view token = member.raw_json_token();
    while (!token.empty() && (token.back() == ' ' || token.back() == '\n' || token.back() == '\r' || token.back() == '\t')) {
        token.remove_suffix(1);
    }
    if (token.size() < 2 || token.front() != '"' || token.back() != '"') return std::nullopt;
    token = token.substr(1, token.size() - 2);
    if (token.find('\\') != std::string_view::npos) return std::nullopt;
    return token;
}

// The JSON text of any value, containers whole.
std::optional<std::string_view> rawValueText(value& member) {
    json_type type;
    if (member.type().get(type)) return std::nullopt;
    std::string_view text;
    if (type == json_type::object) {
        simdjson::ondemand::object object;
        if (member.get_object().get(object) || object.raw_json().get(text)) return std::nullopt;
    } else if (type == json_type::array) {
        simdjson::ondemand::array array;
        if (member.get_array().get(array) || array.raw_json().get(text)) return std::nullopt;
    } else {
        text = member.raw_json_token();
    }
    return text;
}

size_t nestingDepth(const PropertyValue& value, size_t limit) {
    if (limit == 0) return 1;
    size_t deepest = 0;
    if (const auto* array = value.array()) {
        for (const PropertyValue& element : *array) deepest = std::max(deepest, nestingDepth(element, limit - 1));
        return deepest + 1;
    }
    if (const auto* dictionary = value.dictionary()) {
        for (const auto& [key, element] : *dictionary) deepest = std::max(deepest, nestingDepth(element, limit - 1));
        return deepest + 1;
    }
    return 0;
}

// A state value through the general JSON reader, so its number kinds, duplicate members and
// depth are exactly what the whole-document reader makes of them.
std::optional<PropertyValue> stateValue(value& member) {
    const std::optional<std::string_view> text = rawValueText(member);
    if (!text) return std::nullopt;
    std::string wrapped;
    wrapped.reserve(text->size() + 2);
    wrapped.append("[").append(*text).append("]");
    std::optional<PropertyValue> parsed =
        PropertyValueJson::parse(reinterpret_cast<const uint8_t*>(wrapped.data()), wrapped.size());
    if (!parsed || !parsed->isArray() || parsed->array()->size() != 1) return std::nullopt;
    const PropertyValue& element = parsed->array()->front();
    if (nestingDepth(element, kValueNestingDepth + 1) > kValueNestingDepth) return std::nullopt;
    return element;
}

bool unsignedMember(value& member, uint64_t& number) { return !member.get_uint64().get(number); }

// Any hex text the general reader takes; throws std::invalid_argument as it does.
void decodeReportHex(std::string_view text, std::vector<uint8_t>& bytes) {
    if (!Hex::bytesFromRecordingForm(text, bytes)) bytes = Util::bytesFromHexString(std::string(text));
}

}  // namespace

std::vector<uint8_t> reportBytesFromHexText(std::string_view text) {
    std::vector<uint8_t> bytes;
    decodeReportHex(text, bytes);
    return bytes;
}

Read readFrame(simdjson::ondemand::object object, PipelineRecording::Frame& frame, std::string* event) {
    enum Seen : unsigned { kType = 1, kTimestamp = 2, kKey = 4, kValue = 8, kReport = 16, kWallTime = 32, kEvent = 64 };
    unsigned seen = 0;
    enum class Type { State, InputReport, Event } type = Type::State;
    std::string_view key;
    std::string_view report;
    std::optional<PropertyValue> stateValueRead;
    std::string_view eventText;
    uint64_t timestamp = 0;

    for (auto result : object) {
        simdjson::ondemand::field field;
        if (std::move(result).get(field)) return Read::Undecided;
        const raw_json_string name = field.key();
        value& member = field.value();
        unsigned bit = 0;
        if (name == "Type") {
            bit = kType;
            raw_json_string text;
            if (member.get_raw_json_string().get(text)) return Read::Undecided;
            if (text == "InputReport") {
                type = Type::InputReport;
            } else if (text == "State") {
                type = Type::State;
            } else if (text == "Event" && event != nullptr) {
                type = Type::Event;
            } else {
                return Read::Undecided;
            }
        } else if (name == "Timestamp") {
            bit = kTimestamp;
            if (!unsignedMember(member, timestamp)) return Read::Undecided;
        } else if (name == "Report") {
            bit = kReport;
            const auto text = plainString(member);
            if (!text) return Read::Undecided;
            report = *text;
        } else if (name == "Key") {
            bit = kKey;
            const auto text = plainString(member);
            if (!text) return Read::Undecided;
            key = *text;
        } else if (name == "Value") {
            bit = kValue;
            stateValueRead = stateValue(member);
            if (!stateValueRead) return Read::Undecided;
        } else if (name == "WallTime") {
            bit = kWallTime;
            uint64_t wallTime = 0;
            if (!unsignedMember(member, wallTime)) return Read::Undecided;
        } else if (name == "Event") {
            bit = kEvent;
            simdjson::ondemand::object eventObject;
            if (member.get_object().get(eventObject) || eventObject.raw_json().get(eventText)) return Read::Undecided;
        } else {
            return Read::Undecided;
        }
        if (seen & bit) return Read::Undecided;
        seen |= bit;
    }

    if ((seen & (kType | kTimestamp)) != (kType | kTimestamp)) return Read::Undecided;
    switch (type) {
    case Type::InputReport:
        if (seen != (kType | kTimestamp | kReport) && seen != (kType | kTimestamp | kReport | kWallTime)) {
            return Read::Undecided;
        }
        // Filled in place: a reader that hands out the same frame again reuses its report's storage.
        try {
            decodeReportHex(report, frame.report);
        } catch (const std::invalid_argument&) {
            return Read::Undecided;
        }
        frame.type = PipelineRecording::FrameType::InputReport;
        frame.timestamp = timestamp;
        frame.key.clear();
        frame.value.reset();
        return Read::Frame;
    case Type::State:
        if (seen != (kType | kTimestamp | kKey) && seen != (kType | kTimestamp | kKey | kValue)) return Read::Undecided;
        // Keys are short; one without escapes is its own text, and UTF-8 was checked for the whole input.
        frame = PipelineRecording::Frame::state(timestamp, std::string(key), std::move(stateValueRead));
        return Read::Frame;
    case Type::Event:
        if (seen != (kType | kTimestamp | kEvent)) return Read::Undecided;
        frame = PipelineRecording::Frame::state(timestamp, {}, std::nullopt);
        event->assign(eventText);
        return Read::Event;
    }
    return Read::Undecided;
}

void appendHexText(std::string& out, const uint8_t* bytes, size_t length) {
    static constexpr char kDigits[] = "0123456789abcdef";
    const size_t start = out.size();
    out.resize(start + 3 * length);
    char* at = out.data() + start;
    for (size_t i = 0; i < length; ++i) {
        *at++ = kDigits[bytes[i] >> 4];
        *at++ = kDigits[bytes[i] & 15];
        *at++ = ' ';
    }
}

void appendJsonString(std::string& out, std::string_view text) {
    // The library's own escaping, as the writer has always used: invalid UTF-8 becomes U+FFFD.
    out += nlohmann::json(std::string(text)).dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
}

void appendStateValue(std::string& out, const PropertyValue& value, int indent, int depth) {
    const std::string text = PropertyValueJson::toJson(value, kValueNestingDepth)
                                 .dump(indent, ' ', false, nlohmann::ordered_json::error_handler_t::replace);
    if (indent < 0) {
        out += text;
        return;
    }
    // Newlines in the text are all between members: strings carry theirs escaped.
    const std::string pad(static_cast<size_t>(indent * depth), ' ');
    for (char c : text) {
        out += c;
        if (c == '\n') out += pad;
    }
}

namespace {

void appendUnsigned(std::string& out, uint64_t number) {
    char digits[24];
    const auto end = std::to_chars(digits, digits + sizeof digits, number).ptr;
    out.append(digits, end);
}

// Members of one frame object: the separators of the compact and of the indented layout.
struct Layout {
    std::string open, separator, colon, close;
};

Layout layoutFor(int indent, int depth) {
    if (indent < 0) return {"{", ",", ":", "}"};
    const std::string inner(static_cast<size_t>(indent * (depth + 1)), ' ');
    const std::string outer(static_cast<size_t>(indent * depth), ' ');
    return {"{\n" + inner, ",\n" + inner, ": ", "\n" + outer + "}"};
}

}  // namespace

void appendFrame(std::string& out, const PipelineRecording::Frame& frame, int indent, int depth) {
    // Layouts are few; building them per frame would cost more than the frame itself.
    static thread_local std::vector<std::pair<std::pair<int, int>, Layout>> layouts;
    const Layout* layout = nullptr;
    for (const auto& [shape, candidate] : layouts) {
        if (shape == std::make_pair(indent, depth)) layout = &candidate;
    }
    if (layout == nullptr) {
        layouts.emplace_back(std::make_pair(indent, depth), layoutFor(indent, depth));
        layout = &layouts.back().second;
    }
    using Type = PipelineRecording::FrameType;
    if (frame.type == Type::InputReport) {
        out += layout->open;
        out += "\"Type\"";
        out += layout->colon;
        out += "\"InputReport\"";
        out += layout->separator;
        out += "\"Timestamp\"";
        out += layout->colon;
        appendUnsigned(out, frame.timestamp);
        out += layout->separator;
        out += "\"Report\"";
        out += layout->colon;
        out += '"';
        appendHexText(out, frame.report.data(), frame.report.size());
        out += '"';
        out += layout->close;
        return;
    }
    out += layout->open;
    out += "\"Type\"";
    out += layout->colon;
    out += "\"State\"";
    out += layout->separator;
    out += "\"Timestamp\"";
    out += layout->colon;
    appendUnsigned(out, frame.timestamp);
    out += layout->separator;
    out += "\"Key\"";
    out += layout->colon;
    appendJsonString(out, frame.key);
    if (frame.value) {
        out += layout->separator;
        out += "\"Value\"";
        out += layout->colon;
        appendStateValue(out, *frame.value, indent, depth + 1);
    }
    out += layout->close;
}

}  // namespace TolkaTouch::RecordingFrameJson

namespace TolkaTouch::RecordingFrameJson {

bool atEnd(simdjson::ondemand::document& document) {
    // Past the last structural character there is no location left.
    return document.current_location().error() == simdjson::OUT_OF_BOUNDS;
}

}  // namespace TolkaTouch::RecordingFrameJson

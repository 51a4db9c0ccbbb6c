#include "pipeline/RecordingLines.h"

#include <cerrno>
#include <system_error>
#include <utility>

#include <nlohmann/json.hpp>

#include "common/Util.h"
#include "pipeline/RecordingFrameJson.h"
#include "platform/PropertyValueJson.h"

namespace TolkaTouch {

namespace {
// Enough for a few hundred reports between the recorder's flushes, without growing.
constexpr size_t kBufferLimit = 64 * 1024;

std::string hexText(const std::vector<uint8_t>& bytes) { return Util::hexStringFromBytes(bytes); }
}  // namespace

std::string RecordingLinesHeader::jsonLine() const {
    nlohmann::ordered_json header = nlohmann::ordered_json::object();
    header["Version"] = 1;
    header["Format"] = "lines";
    if (device) {
        nlohmann::ordered_json object = nlohmann::ordered_json::object();
        object["VendorID"] = device->vendorId;
        object["ProductID"] = device->productId;
        object["ReportDescriptor"] = hexText(device->reportDescriptor);
        nlohmann::ordered_json features = nlohmann::ordered_json::object();
        for (const auto& [id, bytes] : device->featureReports) features[std::to_string(id)] = hexText(bytes);
        object["FeatureReports"] = std::move(features);
        header["Device"] = std::move(object);
    }
    if (!settings.empty()) {
        nlohmann::ordered_json object = nlohmann::ordered_json::object();
        for (const auto& [key, value] : settings) object[key] = PropertyValueJson::toJson(value);
        header["Settings"] = std::move(object);
    }
    if (!recorder.empty()) {
        nlohmann::ordered_json object = nlohmann::ordered_json::object();
        for (const auto& [key, text] : recorder) object[key] = text;
        header["Recorder"] = std::move(object);
    }
    return header.dump(-1, ' ', false, nlohmann::ordered_json::error_handler_t::replace);
}

RecordingLinesHeader RecordingLinesHeader::fromJson(const PropertyValue& header) {
    RecordingLinesHeader result;
    if (const PropertyValue* device = header.find("Device"); device != nullptr && device->isDictionary()) {
        Device parsed;
        if (const PropertyValue* id = device->find("VendorID"); id != nullptr && id->isNumber()) {
            parsed.vendorId = static_cast<uint32_t>(id->toUInt64());
        }
        if (const PropertyValue* id = device->find("ProductID"); id != nullptr && id->isNumber()) {
            parsed.productId = static_cast<uint32_t>(id->toUInt64());
        }
        try {
            if (const PropertyValue* text = device->find("ReportDescriptor"); text != nullptr && text->isString()) {
                parsed.reportDescriptor = Util::bytesFromHexString(*text->string());
            }
            if (const PropertyValue* features = device->find("FeatureReports"); features != nullptr && features->isDictionary()) {
                for (const auto& [id, text] : *features->dictionary()) {
                    if (!text.isString() || id.empty() || id.size() > 9 || id.find_first_not_of("0123456789") != std::string::npos) {
                        continue;
                    }
                    parsed.featureReports[static_cast<uint32_t>(std::stoul(id))] = Util::bytesFromHexString(*text.string());
                }
            }
        } catch (const std::invalid_argument&) {
            // Hex text that does not read leaves what was read so far; the header is informative.
        }
        result.device = std::move(parsed);
    }
    if (const PropertyValue* settings = header.find("Settings"); settings != nullptr && settings->isDictionary()) {
        for (const auto& [key, value] : *settings->dictionary()) result.settings.emplace(key, value);
    }
    if (const PropertyValue* recorder = header.find("Recorder"); recorder != nullptr && recorder->isDictionary()) {
        for (const auto& [key, value] : *recorder->dictionary()) {
            result.recorder.emplace(key, value.isString() ? *value.string() : PropertyValueJson::toJson(value).dump());
        }
    }
    return result;
}

RecordingLinesWriter::RecordingLinesWriter(Sink sink, const RecordingLinesHeader& header) : _sink(std::move(sink)) {
    _buffer.reserve(kBufferLimit + 1024);
    _buffer += header.jsonLine();
    endLine();
}

RecordingLinesWriter::Sink RecordingLinesWriter::fileSink(std::FILE* file) {
    return [file](std::string_view bytes) {
        if (std::fwrite(bytes.data(), 1, bytes.size(), file) != bytes.size() || std::fflush(file) != 0) {
            throw std::system_error(errno ? errno : EIO, std::generic_category());
        }
    };
}

RecordingLinesWriter::~RecordingLinesWriter() {
    try {
        flush();
    } catch (...) {
        // Nobody to tell in a destructor; the owner calls flush() itself to hear of errors.
    }
}

void RecordingLinesWriter::writeFrame(const PipelineRecording::Frame& frame) {
    using Type = PipelineRecording::FrameType;
    if (frame.type != Type::InputReport && frame.type != Type::State) return;
    RecordingFrameJson::appendFrame(_buffer, frame, -1, 0);
    endLine();
}

void RecordingLinesWriter::writeInputReport(uint64_t timestamp, const uint8_t* bytes, size_t length,
                                            std::optional<uint64_t> wallTime) {
    _buffer += "{\"Type\":\"InputReport\",\"Timestamp\":";
    _buffer += std::to_string(timestamp);
    _buffer += ",\"Report\":\"";
    RecordingFrameJson::appendHexText(_buffer, bytes, length);
    _buffer += '"';
    if (wallTime) {
        _buffer += ",\"WallTime\":";
        _buffer += std::to_string(*wallTime);
    }
    _buffer += '}';
    endLine();
}

void RecordingLinesWriter::writeState(uint64_t timestamp, const std::string& key, const std::optional<PropertyValue>& value) {
    RecordingFrameJson::appendFrame(_buffer, PipelineRecording::Frame::state(timestamp, key, value), -1, 0);
    endLine();
}

void RecordingLinesWriter::writeEvent(uint64_t timestamp, std::string_view eventJson) {
    while (!eventJson.empty() && (eventJson.back() == '\n' || eventJson.back() == '\r')) eventJson.remove_suffix(1);
    _buffer += "{\"Type\":\"Event\",\"Timestamp\":";
    _buffer += std::to_string(timestamp);
    _buffer += ",\"Event\":";
    // One line per frame is the form's one rule: a newline inside would split the frame.
    for (char c : eventJson) _buffer += (c == '\n' || c == '\r') ? ' ' : c;
    _buffer += '}';
    endLine();
}

void RecordingLinesWriter::endLine() {
    _buffer += '\n';
    if (_buffer.size() >= kBufferLimit) flush();
}

void RecordingLinesWriter::flush() {
    if (_buffer.empty()) return;
    _sink(_buffer);
    _buffer.clear();
}

}  // namespace TolkaTouch

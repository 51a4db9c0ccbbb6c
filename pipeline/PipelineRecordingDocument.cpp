// The recording document: writing (json), reading (construction from data) and the migration of
// the older container layout.

#include <exception>
#include <stdexcept>
#include <string>
#include <utility>

#include <nlohmann/json.hpp>

#include "pipeline/PipelineRecording.h"
#include "platform/PropertyValueJson.h"
#include "common/Util.h"

namespace TolkaTouch {

namespace {

constexpr uint64_t kCurrentVersion = 1;

// A state value sits inside the document object, the "Frames" array and its frame object; what
// it nests beyond the reader's limit is written as null.
constexpr size_t kValueNestingDepth = PropertyValueJson::kMaxNestingDepth - 3;

const std::string kTypeState = "State";
const std::string kTypeInputReport = "InputReport";

// Every value a document can carry is acceptable as a state value; byte data is not one of them
// (the writer turns it into hex text), so it is refused when a container comes from elsewhere.
bool isDocumentValue(const PropertyValue& value) { return !value.isData(); }

int hexDigitValue(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

// Report text as the writer makes it ("01 0a ff ": two digits and one space per byte, the last
// space optional) is decoded directly; reading a long recording spends most of its time here
// otherwise. Any other text goes through the general hex reader, which gives the same bytes for
// this form and decides everything else, errors included.
std::vector<uint8_t> reportBytesFromHexText(const std::string& text) {
    std::vector<uint8_t> bytes;
    bytes.reserve(text.size() / 3 + 1);
    for (size_t at = 0; at < text.size(); at += 3) {
        const int high = hexDigitValue(text[at]);
        const int low = at + 1 < text.size() ? hexDigitValue(text[at + 1]) : -1;
        const bool separated = at + 2 >= text.size() || text[at + 2] == ' ';
        if (high < 0 || low < 0 || !separated) return Util::bytesFromHexString(text);
        bytes.push_back(static_cast<uint8_t>(high << 4 | low));
    }
    return bytes;
}

}  // namespace

std::vector<uint8_t> PipelineRecording::json() {
    if (_maxFrameCount != 0) trim(_maxFrameCount);

    nlohmann::ordered_json frames = nlohmann::ordered_json::array();
    frames.get_ref<nlohmann::ordered_json::array_t&>().reserve(_frames.size());
    for (const Frame& frame : _frames) {
        nlohmann::ordered_json object = nlohmann::ordered_json::object();
        switch (frame.type) {
        case FrameType::InputReport:
            object["Type"] = kTypeInputReport;
            object["Timestamp"] = frame.timestamp;
            object["Report"] = Util::hexStringFromBytes(frame.report);
            break;
        case FrameType::State:
            object["Type"] = kTypeState;
            object["Timestamp"] = frame.timestamp;
            object["Key"] = frame.key;
            if (frame.value) object["Value"] = PropertyValueJson::toJson(*frame.value, kValueNestingDepth);
            break;
        default:
            continue;
        }
        frames.push_back(std::move(object));
    }

    nlohmann::ordered_json document = nlohmann::ordered_json::object();
    document["Version"] = kCurrentVersion;
    document["Frames"] = std::move(frames);
    // Text that is not valid UTF-8 (a key set by a client) is replaced rather than refused: the
    // writer has no failure path.
    const std::string text = document.dump(4, ' ', false, nlohmann::ordered_json::error_handler_t::replace);
    return std::vector<uint8_t>(text.begin(), text.end());
}

PipelineRecording::PipelineRecording(const std::vector<uint8_t>* data) {
    if (data == nullptr) throw std::invalid_argument("json not supplied");
    PropertyValue container;
    try {
        container = migrateSerializedContainer(PropertyValueJson::parse(data->data(), data->size()));
    } catch (const std::exception& error) {
        throw std::runtime_error(std::string("migrateSerializedContainer failed: ") + error.what());
    }
    // Frames go straight into the list: no trimming, no clock, the document's time stamps kept.
    _frames = framesFromContainer(container);
}

std::list<PipelineRecording::Frame> PipelineRecording::framesFromContainer(const PropertyValue& container) {
    const PropertyValue* elements = container.find("Frames");
    if (elements == nullptr || !elements->isArray()) throw std::invalid_argument("invalid frames");

    std::list<Frame> frames;
    // An element that is not an object has no members, and fails on its missing "Type".
    for (const PropertyValue& element : *elements->array()) {
        const PropertyValue* type = element.find("Type");
        if (type == nullptr || !type->isString()) throw std::invalid_argument("invalid frame type");
        const PropertyValue* timestamp = element.find("Timestamp");
        if (timestamp == nullptr || !timestamp->isNumber()) throw std::invalid_argument("invalid frame timestamp");

        if (*type->string() == kTypeState) {
            const PropertyValue* key = element.find("Key");
            if (key == nullptr || !key->isString()) throw std::invalid_argument("invalid state key");
            std::optional<PropertyValue> value;
            if (const PropertyValue* member = element.find("Value")) {
                if (!isDocumentValue(*member)) throw std::invalid_argument("invalid state value class");
                value = *member;
            }
            frames.push_back(Frame::state(timestamp->toUInt64(), *key->string(), std::move(value)));
        } else if (*type->string() == kTypeInputReport) {
            const PropertyValue* report = element.find("Report");
            if (report == nullptr || !report->isString()) throw std::invalid_argument("invalid report");
            frames.push_back(Frame::inputReport(timestamp->toUInt64(), reportBytesFromHexText(*report->string())));
        } else {
            throw std::invalid_argument("invalid frame type");
        }
    }
    return frames;
}

PropertyValue PipelineRecording::migrateSerializedContainer(const std::optional<PropertyValue>& container) {
    if (!container || !container->isDictionary()) throw std::invalid_argument("invalid container");
    const PropertyValue* versionValue = container->find("Version");
    if (versionValue == nullptr || !versionValue->isNumber()) throw std::invalid_argument("invalid version");

    // Fractions are cut off, true counts as 1 and a negative number wraps to a huge version.
    const uint64_t version = versionValue->toUInt64();
    if (version == kCurrentVersion) return *container;
    if (version != 0) throw std::invalid_argument("invalid container version: " + std::to_string(version));

    // Version 0 held input reports only. Their members are carried over as they are; the reader
    // checks their types afterwards. A "Reports" that is not an array holds no reports.
    PropertyValue::Array frames;
    if (const PropertyValue* reports = container->find("Reports"); reports != nullptr && reports->isArray()) {
        frames.reserve(reports->array()->size());
        for (const PropertyValue& report : *reports->array()) {
            const PropertyValue* timestamp = report.find("Timestamp");
            if (timestamp == nullptr) throw std::invalid_argument("frame lacks Timestamp");
            const PropertyValue* reportData = report.find("ReportData");
            if (reportData == nullptr) throw std::invalid_argument("frame lacks ReportData");
            frames.emplace_back(PropertyValue::Dictionary{
                {"Type", PropertyValue(kTypeInputReport)},
                {"Timestamp", *timestamp},
                {"Report", *reportData},
            });
        }
    }
    return PropertyValue(PropertyValue::Dictionary{
        {"Version", PropertyValue(kCurrentVersion)},
        {"Frames", PropertyValue(std::move(frames))},
    });
}

}  // namespace TolkaTouch

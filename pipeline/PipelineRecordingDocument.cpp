// The recording document: writing (json), reading (construction from data) and the migration of
// the older container layout. The fast reading and the writing live in the Recording* files; the
// general reader here decides whatever the fast one does not.

#include <exception>
#include <stdexcept>
#include <string>
#include <utility>

#include "pipeline/PipelineRecording.h"
#include "pipeline/RecordingDocumentReader.h"
#include "pipeline/RecordingDocumentWriter.h"
#include "pipeline/RecordingFrameJson.h"
#include "pipeline/RecordingFrameReader.h"

namespace TolkaTouch {

namespace {

constexpr uint64_t kCurrentVersion = 1;

const std::string kTypeState = "State";
const std::string kTypeInputReport = "InputReport";

// Every value a document can carry is acceptable as a state value; byte data is not one of them
// (the writer turns it into hex text), so it is refused when a container comes from elsewhere.
bool isDocumentValue(const PropertyValue& value) { return !value.isData(); }

}  // namespace

std::vector<uint8_t> PipelineRecording::json() {
    if (_maxFrameCount != 0) trim(_maxFrameCount);
    // Written a frame at a time, in the indented layout a tree's pretty-printer gives.
    RecordingDocumentWriter writer(nullptr);
    std::string& text = writer.text();
    text.reserve(64 + _frames.size() * 300);
    for (const Frame& frame : _frames) writer.writeFrame(frame);
    writer.finish();
    return std::vector<uint8_t>(text.begin(), text.end());
}

PipelineRecording::PipelineRecording(const std::vector<uint8_t>* data) {
    if (data == nullptr) throw std::invalid_argument("json not supplied");
    // Frames go straight into the list: no trimming, no clock, the document's time stamps kept.
    if (RecordingDocumentReader::isLinesForm(data->data(), data->size())) {
        try {
            _frames = RecordingFrameReader::fromBytes(*data)->readAll();
        } catch (const RecordingReadError& error) {
            error.rethrowPlain();
        }
        return;
    }
    _frames = RecordingDocumentReader::read(data->data(), data->size());
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
            frames.push_back(Frame::inputReport(timestamp->toUInt64(),
                                                RecordingFrameJson::reportBytesFromHexText(*report->string())));
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

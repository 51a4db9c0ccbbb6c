// The service's properties: the "Pipeline" domain (read from the pipeline, written through the
// recording), the service's own keys, and pass-through of every other key to the device.
#include <array>
#include <string>

#include <fmt/format.h>

#include "common/Reports.h"
#include "common/Util.h"
#include "plugin/TolkaTouchHIDService.h"

namespace TolkaTouch {

namespace {

const char* const kPipelineDomain = "Pipeline";
const char* const kAlgsDomain = "Algs";
const char* const kDebugInfoKey = "DebugInfo";

// The firmware's diagnostic feature reports, in the order they are dumped.
constexpr std::array<uint8_t, 10> kFirmwareDebugReportIDs = {0x04, 0x10, 0x11, 0x12, 0x13,
                                                             0x1D, 0x32, 0x3B, 0x3C, 0x3F};
constexpr size_t kFirmwareDebugReportLength = 128;
constexpr size_t kFactoryResetHoldDurationLength = 32;

const char* describeKey(const char* key) {
    return key ? key : "(null)";
}

}  // namespace

PropertyValue TolkaTouchHIDService::getPropertyForKey(const char* key) {
    if (_log.debugEnabled()) _log.debug("getPropertyForKey:%s", describeKey(key));
    if (!key) return {};

    std::string subKey = key;
    if (Util::stripDomainFromKey(subKey, kPipelineDomain)) {
        std::lock_guard lock(_pipelineLock);
        return _pipeline->getState(subKey);
    }

    const std::string_view name = key;
    if (name == "Version") return PropertyValue::Array{PropertyValue(28), PropertyValue(0), PropertyValue(0)};
    if (name == "FirmwareDebugReports") return firmwareDebugReports();
    if (name == "FactoryResetHoldDuration") return factoryResetHoldDuration();
    if (name == "Recording") return recordingDocument();
    if (name == "ServicePluginDebug") return servicePluginDebug();
    return _tolkaDevice ? _tolkaDevice->getProperty(name) : PropertyValue();
}

bool TolkaTouchHIDService::setProperty(const PropertyValue& value, const char* key) {
    if (_log.debugEnabled()) _log.debug("setProperty:%s forKey:%s", value.description().c_str(), describeKey(key));
    if (!key) return false;

    // Writes go through the recording, so that every setting change is in the history before it
    // reaches the pipeline; reads go straight to the pipeline.
    std::string subKey = key;
    if (Util::stripDomainFromKey(subKey, kPipelineDomain)) {
        std::lock_guard lock(_pipelineLock);
        _recording.setState(subKey, value);
        return true;
    }
    return _tolkaDevice ? _tolkaDevice->setProperty(key, value) : false;
}

// Feature reads do not take the pipeline lock: they never touch the pipeline.
PropertyValue TolkaTouchHIDService::firmwareDebugReports() {
    PropertyValue::Dictionary reports;
    for (uint8_t reportID : kFirmwareDebugReportIDs) {
        std::array<uint8_t, kFirmwareDebugReportLength> buffer{};
        size_t length = buffer.size();
        uint32_t result = _tolkaDevice ? _tolkaDevice->getReport(HIDReportType::Feature, reportID, buffer.data(), length)
                                       : HIDResult::NotCreated;
        std::string name = fmt::format("0x{:02x}", reportID);
        if (result != HIDResult::Success) {
            reports[name] = fmt::format("Failed to get report ID 0x{:x}: 0x{:x}", reportID, result);
        } else {
            reports[name] = Util::hexStringFromBytes(std::vector<uint8_t>(buffer.begin(), buffer.begin() + length));
        }
    }
    return reports;
}

PropertyValue TolkaTouchHIDService::factoryResetHoldDuration() {
    if (!_tolkaDevice) return {};
    std::array<uint8_t, kFactoryResetHoldDurationLength> buffer{};
    size_t length = buffer.size();
    uint32_t result = _tolkaDevice->getReport(HIDReportType::Feature, FeatureReport::FactoryResetHoldDuration::kReportID,
                                              buffer.data(), length);
    if (result != HIDResult::Success) return {};
    std::optional<uint32_t> duration = FeatureReport::FactoryResetHoldDuration::parse(buffer.data(), length);
    if (!duration) return {};
    return PropertyValue(static_cast<uint64_t>(*duration));
}

// The input report thread waits only for the copy; the document is built from it afterwards.
PropertyValue TolkaTouchHIDService::recordingDocument() {
    std::unique_lock lock(_pipelineLock);
    PipelineRecording recording = _recording;
    lock.unlock();
    std::vector<uint8_t> document = recording.json();
    return std::string(document.begin(), document.end());
}

PropertyValue TolkaTouchHIDService::servicePluginDebug() {
    const std::string keys[] = {
        "Version",
        "FirmwareDebugReports",
        "Recording",
        fmt::format("{}.{}", kPipelineDomain, kDebugInfoKey),
        fmt::format("{}.{}.{}", kPipelineDomain, kAlgsDomain, kDebugInfoKey),
    };
    PropertyValue::Dictionary debug;
    for (const std::string& key : keys) {
        PropertyValue value = getPropertyForKey(key.c_str());
        if (!value.isNull()) debug[key] = std::move(value);
    }
    return debug;
}

}  // namespace TolkaTouch

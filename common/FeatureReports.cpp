#include "common/FeatureReports.h"

#include "common/ReportDescriptor.h"

namespace TolkaTouch {

std::map<uint8_t, std::vector<uint8_t>> defaultFeatureReports() {
    std::map<uint8_t, std::vector<uint8_t>> reports;
    constexpr uint32_t duration = kDefaultFactoryResetHoldDuration;
    reports[ReportDescriptor::kFactoryResetHoldDurationReport.id] = {
        ReportDescriptor::kFactoryResetHoldDurationReport.id,
        uint8_t(duration),
        uint8_t(duration >> 8),
        uint8_t(duration >> 16),
        uint8_t(duration >> 24),
    };
    // A diagnostic block's contents are the firmware's business; a recognisable pattern will do.
    for (const auto& report : ReportDescriptor::kDiagnosticReports) {
        std::vector<uint8_t> bytes(1 + report.payloadLength);
        for (size_t i = 0; i < bytes.size(); ++i) bytes[i] = uint8_t(report.id + i);
        reports[report.id] = bytes;
    }
    return reports;
}

}  // namespace TolkaTouch

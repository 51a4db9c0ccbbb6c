#pragma once
// The surface's HID report descriptor, the one place that says which reports the device declares:
// input report 1 (the 72-byte image), input report 2 (the 9-byte firmware event), feature report
// 0x1F (the 4-byte factory-reset hold duration) and the ten diagnostic feature reports, all on a
// vendor-defined usage page. The virtual surface hands these bytes to the kernel; tests parse
// them back.

#include <array>
#include <cstddef>
#include <cstdint>

#include "common/Reports.h"
#include "tolkatouch/Gesture.h"

namespace TolkaTouch {
namespace ReportDescriptor {

enum class ReportKind : uint8_t { Input, Feature };

// One report the device declares: its ID, whether the host reads it as input or on request as a
// feature report, and its length in bytes after the report ID.
struct ReportInfo {
    uint8_t id;
    ReportKind kind;
    uint8_t payloadLength;
};

// The surface speaks on the same vendor page on which its reset reaches the host as an event.
inline constexpr uint16_t kVendorUsagePage = GestureCodec::kVendorUsagePage;
inline constexpr uint8_t kApplicationUsage = 0x01;

// The firmware's diagnostic blocks, in the order the service dumps them; their contents are the
// firmware's business, the lengths are what the firmware sends.
inline constexpr std::array<ReportInfo, 10> kDiagnosticReports = {{
    {0x04, ReportKind::Feature, 8},
    {0x10, ReportKind::Feature, 16},
    {0x11, ReportKind::Feature, 16},
    {0x12, ReportKind::Feature, 16},
    {0x13, ReportKind::Feature, 16},
    {0x1D, ReportKind::Feature, 4},
    {0x32, ReportKind::Feature, 32},
    {0x3B, ReportKind::Feature, 8},
    {0x3C, ReportKind::Feature, 8},
    {0x3F, ReportKind::Feature, 64},
}};

inline constexpr ReportInfo kImageReport = {InputReport::kImageReportID, ReportKind::Input,
                                            InputReport::Image::kReportLength - 1};
inline constexpr ReportInfo kFirmwareEventReport = {InputReport::kFirmwareEventReportID, ReportKind::Input,
                                                    InputReport::FirmwareEvent::kReportLength - 1};
inline constexpr ReportInfo kFactoryResetHoldDurationReport = {
    FeatureReport::FactoryResetHoldDuration::kReportID, ReportKind::Feature,
    FeatureReport::FactoryResetHoldDuration::kReportLength - 1};

// Every report the device declares, in descriptor order.
inline constexpr std::array<ReportInfo, 13> kReports = {{
    kImageReport,
    kFirmwareEventReport,
    kFactoryResetHoldDurationReport,
    kDiagnosticReports[0],
    kDiagnosticReports[1],
    kDiagnosticReports[2],
    kDiagnosticReports[3],
    kDiagnosticReports[4],
    kDiagnosticReports[5],
    kDiagnosticReports[6],
    kDiagnosticReports[7],
    kDiagnosticReports[8],
    kDiagnosticReports[9],
}};

namespace Detail {

// Each report: Report ID, Usage (the ID again), Report Count, then Input or Feature; 8 bytes.
inline constexpr size_t kBytesPerReport = 8;
// Usage Page, Usage, Collection (Application); Logical Minimum 0, Logical Maximum 255, Report Size 8.
inline constexpr size_t kHeaderLength = 7 + 7;
inline constexpr size_t kLength = kHeaderLength + kReports.size() * kBytesPerReport + 1;

constexpr std::array<uint8_t, kLength> build() {
    std::array<uint8_t, kLength> d{};
    size_t n = 0;
    auto put = [&](std::initializer_list<uint8_t> bytes) {
        for (uint8_t b : bytes) d[n++] = b;
    };
    put({0x06, uint8_t(kVendorUsagePage & 0xFF), uint8_t(kVendorUsagePage >> 8)});  // Usage Page
    put({0x09, kApplicationUsage});                                                // Usage
    put({0xA1, 0x01});                                                             // Collection (Application)
    put({0x15, 0x00});        // Logical Minimum (0)
    put({0x26, 0xFF, 0x00});  // Logical Maximum (255)
    put({0x75, 0x08});        // Report Size (8): every field is a byte
    for (const ReportInfo& report : kReports) {
        put({0x85, report.id});             // Report ID
        put({0x09, report.id});             // Usage
        put({0x95, report.payloadLength});  // Report Count
        // Input or Feature (Data, Variable, Absolute)
        put({uint8_t(report.kind == ReportKind::Input ? 0x81 : 0xB1), 0x02});
    }
    put({0xC0});  // End Collection
    return d;
}

}  // namespace Detail

// The descriptor bytes as the device presents them to the host.
inline constexpr std::array<uint8_t, Detail::kLength> kBytes = Detail::build();

// The declared report of the given kind and ID, or nullptr.
constexpr const ReportInfo* find(ReportKind kind, uint8_t id) {
    for (const ReportInfo& report : kReports) {
        if (report.kind == kind && report.id == id) return &report;
    }
    return nullptr;
}

}  // namespace ReportDescriptor
}  // namespace TolkaTouch

#include "common/ReportDescriptor.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "common/Reports.h"

namespace TolkaTouch {
namespace {

using ReportDescriptor::ReportKind;

// What a host's HID parser makes of a descriptor: the length of every report, keyed by kind and
// ID, plus the usage page and collection each main item sat in. It follows the kernel's rules for
// short items: global state carries over between main items, local state (usages) is cleared by
// every main item, a report's length is the sum of size × count over its fields, and once any
// report ID appears every report must have one.
struct ParsedDescriptor {
    struct Report {
        uint32_t bits = 0;
        std::vector<uint32_t> usagePages;  // the page of each field
        std::vector<uint32_t> usages;      // the first usage of each field
        int collectionDepth = -1;
    };
    std::map<std::pair<ReportKind, uint8_t>, Report> reports;
    std::vector<std::pair<uint32_t, uint32_t>> applications;  // usage page, usage
    std::string error;                                        // empty when the descriptor parsed
};

uint32_t readUnsigned(const uint8_t* data, size_t size) {
    uint32_t value = 0;
    for (size_t i = 0; i < size; ++i) value |= uint32_t(data[i]) << (8 * i);
    return value;
}

int32_t readSigned(const uint8_t* data, size_t size) {
    uint32_t value = readUnsigned(data, size);
    if (size == 1) return int8_t(value);
    if (size == 2) return int16_t(value);
    return int32_t(value);
}

template <size_t N>
ParsedDescriptor parseDescriptor(const std::array<uint8_t, N>& bytes) {
    ParsedDescriptor parsed;
    uint32_t usagePage = 0;
    int32_t logicalMinimum = 0;
    int32_t logicalMaximum = 0;
    uint32_t reportSize = 0;
    uint32_t reportCount = 0;
    std::optional<uint8_t> reportID;
    bool anyReportWithoutID = false;
    std::vector<uint32_t> usages;
    int depth = 0;

    size_t i = 0;
    while (i < bytes.size()) {
        const uint8_t prefix = bytes[i];
        if (prefix == 0xFE) return parsed.error = "long item", parsed;
        const size_t size = (prefix & 3) == 3 ? 4 : (prefix & 3);
        const uint8_t type = (prefix >> 2) & 3;
        const uint8_t tag = prefix >> 4;
        if (i + 1 + size > bytes.size()) return parsed.error = "item runs past the end", parsed;
        const uint8_t* data = &bytes[i + 1];
        const uint32_t value = readUnsigned(data, size);
        i += 1 + size;

        if (type == 0) {  // main
            if (tag == 0xA) {  // Collection
                if (value == 1) {
                    parsed.applications.emplace_back(usagePage, usages.empty() ? 0 : usages.front());
                }
                ++depth;
            } else if (tag == 0xC) {  // End Collection
                if (depth == 0) return parsed.error = "end collection without collection", parsed;
                --depth;
            } else if (tag == 0x8 || tag == 0x9 || tag == 0xB) {  // Input, Output, Feature
                if (tag == 0x9) return parsed.error = "unexpected output report", parsed;
                if (reportSize == 0 || reportSize > 256) return parsed.error = "invalid report size", parsed;
                if (logicalMinimum > logicalMaximum) return parsed.error = "logical minimum above maximum", parsed;
                if (!reportID) anyReportWithoutID = true;
                const ReportKind kind = tag == 0x8 ? ReportKind::Input : ReportKind::Feature;
                ParsedDescriptor::Report& report = parsed.reports[{kind, reportID.value_or(0)}];
                report.bits += reportSize * reportCount;
                report.usagePages.push_back(usagePage);
                report.usages.push_back(usages.empty() ? 0 : usages.front());
                report.collectionDepth = depth;
            } else {
                return parsed.error = "unknown main item", parsed;
            }
            usages.clear();
        } else if (type == 1) {  // global
            switch (tag) {
            case 0x0: usagePage = value; break;
            case 0x1: logicalMinimum = readSigned(data, size); break;
            case 0x2: logicalMaximum = readSigned(data, size); break;
            case 0x7: reportSize = value; break;
            case 0x8:
                if (value == 0 || value > 255) return parsed.error = "invalid report id", parsed;
                reportID = uint8_t(value);
                break;
            case 0x9: reportCount = value; break;
            default: return parsed.error = "unexpected global item", parsed;
            }
        } else if (type == 2) {  // local
            if (tag != 0x0) return parsed.error = "unexpected local item", parsed;
            usages.push_back(size == 4 ? value : (usagePage << 16) | value);
        } else {
            return parsed.error = "reserved item type", parsed;
        }
    }
    if (depth != 0) return parsed.error = "unclosed collection", parsed;
    if (reportID && anyReportWithoutID) return parsed.error = "report without id beside numbered reports", parsed;
    return parsed;
}

const ParsedDescriptor& parsedSurface() {
    static const ParsedDescriptor parsed = parseDescriptor(ReportDescriptor::kBytes);
    return parsed;
}

uint32_t reportBytes(ReportKind kind, uint8_t id) {
    auto it = parsedSurface().reports.find({kind, id});
    return it == parsedSurface().reports.end() ? 0 : it->second.bits / 8;
}

TEST(ReportDescriptorTest, ParsesWithoutError) { EXPECT_EQ(parsedSurface().error, ""); }

TEST(ReportDescriptorTest, IsTheseExactBytes) {
    const std::vector<uint8_t> expected = {
        0x06, 0x60, 0xFF, 0x09, 0x01, 0xA1, 0x01, 0x15, 0x00, 0x26, 0xFF, 0x00, 0x75, 0x08,
        0x85, 0x01, 0x09, 0x01, 0x95, 0x48, 0x81, 0x02,  // image
        0x85, 0x02, 0x09, 0x02, 0x95, 0x09, 0x81, 0x02,  // firmware event
        0x85, 0x1F, 0x09, 0x1F, 0x95, 0x04, 0xB1, 0x02,  // hold duration
        0x85, 0x04, 0x09, 0x04, 0x95, 0x08, 0xB1, 0x02,  //
        0x85, 0x10, 0x09, 0x10, 0x95, 0x10, 0xB1, 0x02,  //
        0x85, 0x11, 0x09, 0x11, 0x95, 0x10, 0xB1, 0x02,  //
        0x85, 0x12, 0x09, 0x12, 0x95, 0x10, 0xB1, 0x02,  //
        0x85, 0x13, 0x09, 0x13, 0x95, 0x10, 0xB1, 0x02,  //
        0x85, 0x1D, 0x09, 0x1D, 0x95, 0x04, 0xB1, 0x02,  //
        0x85, 0x32, 0x09, 0x32, 0x95, 0x20, 0xB1, 0x02,  //
        0x85, 0x3B, 0x09, 0x3B, 0x95, 0x08, 0xB1, 0x02,  //
        0x85, 0x3C, 0x09, 0x3C, 0x95, 0x08, 0xB1, 0x02,  //
        0x85, 0x3F, 0x09, 0x3F, 0x95, 0x40, 0xB1, 0x02,  //
        0xC0,
    };
    EXPECT_EQ(std::vector<uint8_t>(ReportDescriptor::kBytes.begin(), ReportDescriptor::kBytes.end()), expected);
}

TEST(ReportDescriptorTest, DeclaresOneApplicationOnTheVendorPage) {
    ASSERT_EQ(parsedSurface().applications.size(), 1u);
    EXPECT_EQ(parsedSurface().applications[0].first, 0xFF60u);
    EXPECT_EQ(parsedSurface().applications[0].second, 0xFF600001u);
}

TEST(ReportDescriptorTest, DeclaresExactlyTwoInputReportsAndElevenFeatureReports) {
    std::vector<std::pair<ReportKind, uint8_t>> declared;
    for (const auto& [key, report] : parsedSurface().reports) declared.push_back(key);
    const std::vector<std::pair<ReportKind, uint8_t>> expected = {
        {ReportKind::Input, 0x01},   {ReportKind::Input, 0x02},   {ReportKind::Feature, 0x04},
        {ReportKind::Feature, 0x10}, {ReportKind::Feature, 0x11}, {ReportKind::Feature, 0x12},
        {ReportKind::Feature, 0x13}, {ReportKind::Feature, 0x1D}, {ReportKind::Feature, 0x1F},
        {ReportKind::Feature, 0x32}, {ReportKind::Feature, 0x3B}, {ReportKind::Feature, 0x3C},
        {ReportKind::Feature, 0x3F},
    };
    EXPECT_EQ(declared, expected);
}

TEST(ReportDescriptorTest, ImageReportCarriesTheSeventyTwoByteImage) {
    EXPECT_EQ(reportBytes(ReportKind::Input, 1), 72u);
    EXPECT_EQ(reportBytes(ReportKind::Input, 1), sizeof(InputReport::Image));
}

TEST(ReportDescriptorTest, FirmwareEventReportCarriesNineBytes) {
    EXPECT_EQ(reportBytes(ReportKind::Input, 2), 9u);
    EXPECT_EQ(reportBytes(ReportKind::Input, 2), sizeof(InputReport::FirmwareEvent));
}

TEST(ReportDescriptorTest, HoldDurationFeatureReportCarriesFourBytes) {
    EXPECT_EQ(reportBytes(ReportKind::Feature, 0x1F), 4u);
}

TEST(ReportDescriptorTest, DiagnosticReportsHaveTheirDeclaredLengths) {
    const std::vector<std::pair<uint8_t, uint32_t>> expected = {
        {0x04, 8},  {0x10, 16}, {0x11, 16}, {0x12, 16}, {0x13, 16},
        {0x1D, 4},  {0x32, 32}, {0x3B, 8},  {0x3C, 8},  {0x3F, 64},
    };
    std::vector<std::pair<uint8_t, uint32_t>> parsed;
    for (const auto& report : ReportDescriptor::kDiagnosticReports) {
        parsed.emplace_back(report.id, reportBytes(ReportKind::Feature, report.id));
    }
    EXPECT_EQ(parsed, expected);
}

TEST(ReportDescriptorTest, EveryDiagnosticReportFitsTheServicesBufferWithItsID) {
    for (const auto& report : ReportDescriptor::kDiagnosticReports) {
        EXPECT_LE(reportBytes(ReportKind::Feature, report.id) + 1, 128u) << int(report.id);
    }
}

TEST(ReportDescriptorTest, EveryFieldIsOneVendorUsageInsideTheApplication) {
    for (const auto& [key, report] : parsedSurface().reports) {
        EXPECT_EQ(report.collectionDepth, 1) << int(key.second);
        EXPECT_EQ(report.usagePages, std::vector<uint32_t>{0xFF60}) << int(key.second);
        EXPECT_EQ(report.usages, std::vector<uint32_t>{0xFF600000u | key.second}) << int(key.second);
    }
}

TEST(ReportDescriptorTest, ReportsOfTheDeclaredLengthsParse) {
    std::vector<uint8_t> image(1 + reportBytes(ReportKind::Input, 1), 0);
    image[0] = 1;
    EXPECT_TRUE(InputReport::Image::parse(image.data(), image.size()).has_value());

    std::vector<uint8_t> firmwareEvent(1 + reportBytes(ReportKind::Input, 2), 0);
    firmwareEvent[0] = 2;
    EXPECT_TRUE(InputReport::FirmwareEvent::parse(firmwareEvent.data(), firmwareEvent.size()).has_value());

    std::vector<uint8_t> holdDuration(1 + reportBytes(ReportKind::Feature, 0x1F), 0);
    holdDuration[0] = 0x1F;
    EXPECT_TRUE(FeatureReport::FactoryResetHoldDuration::parse(holdDuration.data(), holdDuration.size()).has_value());
}

TEST(ReportDescriptorTest, FindAnswersDeclaredReportsOnly) {
    ASSERT_NE(ReportDescriptor::find(ReportKind::Feature, 0x32), nullptr);
    EXPECT_EQ(ReportDescriptor::find(ReportKind::Feature, 0x32)->payloadLength, 32u);
    EXPECT_EQ(ReportDescriptor::find(ReportKind::Input, 0x32), nullptr);
    EXPECT_EQ(ReportDescriptor::find(ReportKind::Feature, 0x05), nullptr);
}

TEST(ReportDescriptorTest, TheWalkerRefusesWhatTheKernelRefuses) {
    // The walker must see a broken descriptor, or the tests above prove little.
    constexpr std::array<uint8_t, 15> unclosed = {0x06, 0x60, 0xFF, 0x09, 0x01, 0xA1, 0x01, 0x75,
                                                  0x08, 0x95, 0x01, 0x85, 0x01, 0x81, 0x02};
    EXPECT_EQ(parseDescriptor(unclosed).error, "unclosed collection");
    constexpr std::array<uint8_t, 18> unnumberedFirst = {0x06, 0x60, 0xFF, 0x09, 0x01, 0xA1, 0x01, 0x75, 0x08,
                                                         0x95, 0x01, 0x81, 0x02, 0x85, 0x01, 0x81, 0x02, 0xC0};
    EXPECT_EQ(parseDescriptor(unnumberedFirst).error, "report without id beside numbered reports");
    constexpr std::array<uint8_t, 2> zeroID = {0x85, 0x00};
    EXPECT_EQ(parseDescriptor(zeroID).error, "invalid report id");
}

}  // namespace
}  // namespace TolkaTouch

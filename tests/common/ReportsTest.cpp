#include "common/Reports.h"

#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <vector>

namespace TolkaTouch {
namespace {

using InputReport::FirmwareEvent;
using InputReport::Image;
using FeatureReport::FactoryResetHoldDuration;

// An image report whose every byte after the ID differs from its neighbours, so that a field read
// from the wrong offset or in the wrong byte order shows.
std::vector<uint8_t> patternedImageReport(size_t length = 73) {
    std::vector<uint8_t> bytes(length);
    bytes[0] = 1;
    for (size_t i = 1; i < length; ++i) bytes[i] = static_cast<uint8_t>(i * 7 + 3);
    return bytes;
}

void putU16(std::vector<uint8_t>& bytes, size_t offset, uint16_t value) {
    bytes[offset] = static_cast<uint8_t>(value);
    bytes[offset + 1] = static_cast<uint8_t>(value >> 8);
}

bool sameRecord(const Image& a, const Image& b) { return std::memcmp(&a, &b, sizeof a) == 0; }

TEST(ReportsTest, ImageReportOf72BytesIsRejected) {
    const auto bytes = patternedImageReport(72);
    EXPECT_FALSE(Image::parse(bytes.data(), bytes.size()).has_value());
}

TEST(ReportsTest, ImageReportOf73BytesIsAccepted) {
    const auto bytes = patternedImageReport(73);
    EXPECT_TRUE(Image::parse(bytes.data(), bytes.size()).has_value());
}

TEST(ReportsTest, ImageReportOf100BytesYieldsTheSameRecordAsItsFirst73Bytes) {
    const auto longReport = patternedImageReport(100);
    const auto shortReport = patternedImageReport(73);
    const auto fromLong = Image::parse(longReport.data(), longReport.size());
    const auto fromShort = Image::parse(shortReport.data(), shortReport.size());
    ASSERT_TRUE(fromLong.has_value());
    ASSERT_TRUE(fromShort.has_value());
    EXPECT_TRUE(sameRecord(*fromLong, *fromShort));
}

TEST(ReportsTest, ImageFieldsAreReadLittleEndianAtTheirOffsets) {
    std::vector<uint8_t> bytes(73, 0);
    bytes[0] = 1;
    bytes[1] = 0x78, bytes[2] = 0x56, bytes[3] = 0x34, bytes[4] = 0x12;  // frameNumber
    bytes[5] = 0xEF, bytes[6] = 0xBE, bytes[7] = 0xAD, bytes[8] = 0xDE;  // timeMs
    bytes[9] = 0xA0, bytes[10] = 0xA1, bytes[11] = 0xA2, bytes[12] = 0xA3;
    for (size_t i = 0; i < kPixelCount; ++i) {
        putU16(bytes, 13 + 2 * i, static_cast<uint16_t>(0x0100 * (i + 1) + i));
        putU16(bytes, 43 + 2 * i, static_cast<uint16_t>(-static_cast<int>(i) * 100 - 1));
    }
    const auto image = Image::parse(bytes.data(), bytes.size());
    ASSERT_TRUE(image.has_value());
    EXPECT_EQ(image->frameNumber, 0x12345678u);
    EXPECT_EQ(image->timeMs, 0xDEADBEEFu);
    EXPECT_EQ(image->aux0, 0xA0);
    EXPECT_EQ(image->aux1, 0xA1);
    EXPECT_EQ(image->aux2, 0xA2);
    EXPECT_EQ(image->aux3, 0xA3);
    for (size_t i = 0; i < kPixelCount; ++i) {
        EXPECT_EQ(image->rawPixels[i], 0x0100 * (i + 1) + i) << "pixel " << i;
        EXPECT_EQ(image->pixels[i], -static_cast<int>(i) * 100 - 1) << "pixel " << i;
    }
}

TEST(ReportsTest, ImageReportIsReadFromAnyAlignment) {
    const auto report = patternedImageReport(73);
    const auto aligned = Image::parse(report.data(), report.size());
    std::vector<uint8_t> shifted(report.size() + 1);
    std::memcpy(shifted.data() + 1, report.data(), report.size());
    const auto unaligned = Image::parse(shifted.data() + 1, report.size());
    ASSERT_TRUE(aligned.has_value());
    ASSERT_TRUE(unaligned.has_value());
    EXPECT_TRUE(sameRecord(*aligned, *unaligned));
    EXPECT_EQ(aligned->frameNumber, 0x1F18110Au);  // bytes 0x0A 0x11 0x18 0x1F
}

TEST(ReportsTest, ImageReportWithAnotherIdIsRejected) {
    auto bytes = patternedImageReport(73);
    for (int id : {0, 2, 31, 255}) {
        bytes[0] = static_cast<uint8_t>(id);
        EXPECT_FALSE(Image::parse(bytes.data(), bytes.size()).has_value()) << "report ID " << id;
    }
}

TEST(ReportsTest, FirmwareEventReportOf10BytesParses) {
    const std::vector<uint8_t> bytes{2, 0, 0x01, 0x23, 0x45, 0x67, 0x89, 0xAB, 0xCD, 0xEF};
    const auto event = FirmwareEvent::parse(bytes.data(), bytes.size());
    ASSERT_TRUE(event.has_value());
    EXPECT_EQ(event->event, FirmwareEvent::kReset);
    for (size_t i = 0; i < 8; ++i) EXPECT_EQ(event->context[i], bytes[2 + i]) << "context byte " << i;
}

TEST(ReportsTest, FirmwareEventReportOf9BytesDoesNotParse) {
    const std::vector<uint8_t> bytes{2, 0, 1, 2, 3, 4, 5, 6, 7};
    EXPECT_FALSE(FirmwareEvent::parse(bytes.data(), bytes.size()).has_value());
}

TEST(ReportsTest, FirmwareEventReportIsNeverTakenForAnImage) {
    auto bytes = patternedImageReport(80);
    bytes[0] = 2;
    EXPECT_FALSE(Image::parse(bytes.data(), bytes.size()).has_value());
    EXPECT_TRUE(FirmwareEvent::parse(bytes.data(), bytes.size()).has_value());
}

TEST(ReportsTest, ImageReportIsNeverTakenForAFirmwareEvent) {
    const auto bytes = patternedImageReport(73);
    EXPECT_TRUE(Image::parse(bytes.data(), bytes.size()).has_value());
    EXPECT_FALSE(FirmwareEvent::parse(bytes.data(), bytes.size()).has_value());
}

TEST(ReportsTest, FirmwareEventKeepsItsEventCode) {
    const std::vector<uint8_t> bytes{2, 0x7E, 0, 0, 0, 0, 0, 0, 0, 0, 0xFF};
    const auto event = FirmwareEvent::parse(bytes.data(), bytes.size());
    ASSERT_TRUE(event.has_value());
    EXPECT_EQ(event->event, 0x7E);
}

TEST(ReportsTest, FirmwareEventContextValueReadsTheFirstByteAsMostSignificant) {
    const std::vector<uint8_t> bytes{2, 0, 0x01, 0x23, 0x45, 0x67, 0x89, 0xAB, 0xCD, 0xEF};
    const auto event = FirmwareEvent::parse(bytes.data(), bytes.size());
    ASSERT_TRUE(event.has_value());
    EXPECT_EQ(event->contextValue(), 0x0123456789ABCDEFull);
}

TEST(ReportsTest, FirmwareEventContextValueOfAllOnesIsTheLargestNumber) {
    FirmwareEvent event{};
    std::memset(event.context, 0xFF, sizeof event.context);
    EXPECT_EQ(event.contextValue(), 0xFFFFFFFFFFFFFFFFull);
}

TEST(ReportsTest, FeatureReportOfFourBytesYieldsNoDuration) {
    const std::vector<uint8_t> bytes{31, 0x10, 0x27, 0};
    EXPECT_FALSE(FactoryResetHoldDuration::parse(bytes.data(), bytes.size()).has_value());
}

TEST(ReportsTest, FeatureReportWithAnIdOtherThan31YieldsNoDuration) {
    for (int id : {0, 1, 2, 30, 32, 255}) {
        const std::vector<uint8_t> bytes{static_cast<uint8_t>(id), 0x10, 0x27, 0, 0};
        EXPECT_FALSE(FactoryResetHoldDuration::parse(bytes.data(), bytes.size()).has_value()) << "report ID " << id;
    }
}

TEST(ReportsTest, FeatureReportOfFiveBytesYieldsTheLittleEndianDuration) {
    const std::vector<uint8_t> bytes{31, 0x10, 0x27, 0x00, 0x00};
    EXPECT_EQ(FactoryResetHoldDuration::parse(bytes.data(), bytes.size()), std::optional<uint32_t>(10000));
    const std::vector<uint8_t> large{31, 0x04, 0x03, 0x02, 0xF1};
    EXPECT_EQ(FactoryResetHoldDuration::parse(large.data(), large.size()), std::optional<uint32_t>(0xF1020304u));
}

TEST(ReportsTest, FeatureReportIgnoresBytesAfterTheDuration) {
    const std::vector<uint8_t> bytes{31, 0xE8, 0x03, 0x00, 0x00, 0xAA, 0xBB, 0xCC};
    EXPECT_EQ(FactoryResetHoldDuration::parse(bytes.data(), bytes.size()), std::optional<uint32_t>(1000));
}

TEST(ReportsTest, SignedPixelOf0xFFFFIsMinusOneWhileTheSameRawBytesAre65535) {
    std::vector<uint8_t> bytes(73, 0);
    bytes[0] = 1;
    putU16(bytes, 13 + 2 * 4, 0xFFFF);  // rawPixels[E]
    putU16(bytes, 43 + 2 * 4, 0xFFFF);  // pixels[E]
    const auto image = Image::parse(bytes.data(), bytes.size());
    ASSERT_TRUE(image.has_value());
    EXPECT_EQ(image->rawPixels[4], 65535);
    EXPECT_EQ(image->pixels[4], -1);
}

TEST(ReportsTest, SignedPixelsSpanTheWholeSixteenBitRange) {
    std::vector<uint8_t> bytes(73, 0);
    bytes[0] = 1;
    putU16(bytes, 43, 0x8000);
    putU16(bytes, 45, 0x7FFF);
    const auto image = Image::parse(bytes.data(), bytes.size());
    ASSERT_TRUE(image.has_value());
    EXPECT_EQ(image->pixels[0], -32768);
    EXPECT_EQ(image->pixels[1], 32767);
}

// Each buffer is allocated to exactly the length passed, so the address sanitizer reports any
// read past the length a parser checked.
TEST(ReportsTest, EveryParserAcceptsOrRejectsEveryLengthUpTo80WithoutReadingBeyondIt) {
    for (size_t length = 0; length <= 80; ++length) {
        for (uint8_t id : {uint8_t{1}, uint8_t{2}, uint8_t{31}, uint8_t{0}}) {
            std::unique_ptr<uint8_t[]> bytes(new uint8_t[length]);
            for (size_t i = 0; i < length; ++i) bytes[i] = static_cast<uint8_t>(0xA5 ^ i);
            if (length > 0) bytes[0] = id;
            const bool hasId = length > 0;
            EXPECT_EQ(Image::parse(bytes.get(), length).has_value(), hasId && id == 1 && length >= 73)
                << "length " << length << " id " << int{id};
            EXPECT_EQ(FirmwareEvent::parse(bytes.get(), length).has_value(), hasId && id == 2 && length >= 10)
                << "length " << length << " id " << int{id};
            EXPECT_EQ(FactoryResetHoldDuration::parse(bytes.get(), length).has_value(),
                      hasId && id == 31 && length >= 5)
                << "length " << length << " id " << int{id};
        }
    }
}

TEST(ReportsTest, NoBytesAtAllParseAsNothing) {
    EXPECT_FALSE(Image::parse(nullptr, 0).has_value());
    EXPECT_FALSE(FirmwareEvent::parse(nullptr, 0).has_value());
    EXPECT_FALSE(FactoryResetHoldDuration::parse(nullptr, 0).has_value());
}

TEST(ReportsTest, PixelRegionNumbersAreTheOnesEventsCarry) {
    EXPECT_EQ(static_cast<uint32_t>(PixelRegion::None), 0u);
    EXPECT_EQ(static_cast<uint32_t>(PixelRegion::PlayPause), 1u);
    EXPECT_EQ(static_cast<uint32_t>(PixelRegion::VolumeDown), 2u);
    EXPECT_EQ(static_cast<uint32_t>(PixelRegion::VolumeUp), 3u);
}

}  // namespace
}  // namespace TolkaTouch

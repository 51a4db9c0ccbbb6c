#include "pipeline/RecordingFrameJson.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include <simdjson.h>

namespace TolkaTouch::RecordingFrameJson {
namespace {

using Bytes = std::vector<uint8_t>;

TEST(RecordingFrameJsonTest, TheWritersHexTextDecodesWithOrWithoutItsLastSpace) {
    EXPECT_EQ(reportBytesFromHexText("01 0a ff "), (Bytes{0x01, 0x0a, 0xff}));
    EXPECT_EQ(reportBytesFromHexText("01 0a ff"), (Bytes{0x01, 0x0a, 0xff}));
    EXPECT_EQ(reportBytesFromHexText("0A Ff "), (Bytes{0x0a, 0xff}));
    EXPECT_EQ(reportBytesFromHexText(""), Bytes{});
}

TEST(RecordingFrameJsonTest, OtherHexTextGoesThroughTheGeneralReader) {
    EXPECT_EQ(reportBytesFromHexText("1 a  ff"), (Bytes{0x01, 0x0a, 0xff}));
    EXPECT_EQ(reportBytesFromHexText("01,0a"), (Bytes{0x01}));
    EXPECT_EQ(reportBytesFromHexText("01 0g "), (Bytes{0x01, 0x00}));
    EXPECT_THROW(reportBytesFromHexText("01 100 "), std::invalid_argument);
}

TEST(RecordingFrameJsonTest, AReportFrameReadIntoAStateFrameLeavesNothingOfTheStateBehind) {
    simdjson::padded_string text(std::string(R"({"Type": "InputReport", "Timestamp": 7, "Report": "02 00 "})"));
    simdjson::ondemand::parser parser;
    simdjson::ondemand::document document = parser.iterate(text);
    PipelineRecording::Frame frame = PipelineRecording::Frame::state(3, "Algs.Key", PropertyValue(1));
    ASSERT_EQ(readFrame(document.get_object().value(), frame), Read::Frame);
    EXPECT_EQ(frame.type, PipelineRecording::FrameType::InputReport);
    EXPECT_EQ(frame.timestamp, 7u);
    EXPECT_EQ(frame.key, "");
    EXPECT_FALSE(frame.value.has_value());
    EXPECT_EQ(frame.report, (Bytes{0x02, 0x00}));
}

}  // namespace
}  // namespace TolkaTouch::RecordingFrameJson

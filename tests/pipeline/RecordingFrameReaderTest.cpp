#include "pipeline/RecordingFrameReader.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/pipeline/DocumentTesting.h"

namespace TolkaTouch {
namespace {

using Frame = PipelineRecording::Frame;
using Reading = RecordingFrameReader::Reading;
using Testing::bytesOf;

const std::string kGoodThenBad = R"({"Version": 1, "Frames": [
  {"Type": "InputReport", "Timestamp": 1, "Report": "01 "},
  {"Type": "state", "Timestamp": 2, "Key": "Algs.X"}]})";

TEST(RecordingFrameReaderTest, ASmallDocumentReadWholeIsRefusedBeforeItsFirstFrame) {
    try {
        RecordingFrameReader::fromBytes(bytesOf(kGoodThenBad));
        FAIL() << "the document was taken";
    } catch (const RecordingReadError& error) {
        EXPECT_EQ(std::string(error.what()), "invalid frame type");
    }
}

TEST(RecordingFrameReaderTest, ADocumentReadAsItComesGivesItsFramesUpToTheOneThatDoesNotRead) {
    auto reader = RecordingFrameReader::fromBytes(bytesOf(kGoodThenBad), {}, Reading::AsItComes);
    Frame frame;
    ASSERT_TRUE(reader->next(frame));
    EXPECT_EQ(frame.timestamp, 1u);
    EXPECT_EQ(frame.report, (std::vector<uint8_t>{0x01}));
    try {
        reader->next(frame);
        FAIL() << "the second frame was taken";
    } catch (const RecordingReadError& error) {
        EXPECT_EQ(std::string(error.what()), "invalid frame type");
        EXPECT_EQ(error.detail(), "in frame 2, at byte 89");
    }
}

// Frames longer than the 64 KB pieces it reads in, each on a line of its own.
TEST(RecordingFrameReaderTest, ADocumentReadAsItComesReadsFramesLongerThanItsPieces) {
    const std::string report = [] {
        std::string text;
        for (int byte = 0; byte < 30000; ++byte) text += "0a ";
        return text;
    }();
    std::string text = "{\"Version\": 1, \"Frames\": [\n";
    for (int index = 0; index < 3; ++index) {
        text += std::string(index == 0 ? "" : ",\n") + "{\"Type\": \"InputReport\", \"Timestamp\": " +
                std::to_string(index) + ", \"Report\": \"" + report + "\"}";
    }
    text += "\n]}\n";
    auto reader = RecordingFrameReader::fromBytes(bytesOf(text), {}, Reading::AsItComes);
    Frame frame;
    for (uint64_t index = 0; index < 3; ++index) {
        ASSERT_TRUE(reader->next(frame));
        EXPECT_EQ(frame.timestamp, index);
        EXPECT_EQ(frame.report, std::vector<uint8_t>(30000, 0x0a));
    }
    EXPECT_FALSE(reader->next(frame));
}

TEST(RecordingFrameReaderTest, ADocumentInAnotherLayoutReadAsItComesIsStillReadWhole) {
    const std::string text = R"({"Frames": [{"Type": "InputReport", "Timestamp": 1, "Report": "07 "}], "Version": 1})";
    auto reader = RecordingFrameReader::fromBytes(bytesOf(text), {}, Reading::AsItComes);
    Frame frame;
    ASSERT_TRUE(reader->next(frame));
    EXPECT_EQ(frame.report, (std::vector<uint8_t>{0x07}));
    EXPECT_FALSE(reader->next(frame));
}

}  // namespace
}  // namespace TolkaTouch

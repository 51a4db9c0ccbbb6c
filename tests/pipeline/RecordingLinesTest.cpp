#include "pipeline/RecordingLines.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <typeinfo>
#include <vector>

#include "pipeline/RecordingFrameReader.h"
#include "tests/pipeline/DocumentTesting.h"

namespace TolkaTouch {
namespace {

using Frame = PipelineRecording::Frame;
using Testing::bytesOf;

RecordingLinesWriter::Sink into(std::string& text) {
    return [&text](std::string_view bytes) { text.append(bytes); };
}

std::unique_ptr<RecordingFrameReader> readerOf(const std::string& text, std::vector<std::string>* warnings = nullptr) {
    return RecordingFrameReader::fromBytes(bytesOf(text), [warnings](const std::string& message) {
        if (warnings != nullptr) warnings->push_back(message);
    });
}

std::vector<Frame> framesOf(RecordingFrameReader& reader) {
    std::vector<Frame> frames;
    Frame frame;
    while (reader.next(frame)) frames.push_back(frame);
    return frames;
}

const std::string kHeader = "{\"Version\":1,\"Format\":\"lines\"}\n";

TEST(RecordingLinesTest, WriterPutsTheHeaderAndOneCompactFrameOnEachLine) {
    std::string text;
    {
        RecordingLinesHeader header;
        header.settings.emplace("Algs.HoldTimeoutMilliseconds", PropertyValue(700u));
        header.recorder.emplace("Program", "tolkatouch 1.0");
        RecordingLinesWriter writer(into(text), header);
        writer.writeState(1000, "Algs.HoldTimeoutMilliseconds", PropertyValue(400u));
        writer.writeInputReport(2000, std::vector<uint8_t>{0x01, 0x0a, 0xff}.data(), 3, 1795000000000000000ull);
        writer.writeState(3000, "Algs.NoValue", std::nullopt);
        writer.writeEvent(4000, "{\"Kind\":\"Tap\"}\n");
    }
    EXPECT_EQ(text,
              "{\"Version\":1,\"Format\":\"lines\",\"Settings\":{\"Algs.HoldTimeoutMilliseconds\":700},"
              "\"Recorder\":{\"Program\":\"tolkatouch 1.0\"}}\n"
              "{\"Type\":\"State\",\"Timestamp\":1000,\"Key\":\"Algs.HoldTimeoutMilliseconds\",\"Value\":400}\n"
              "{\"Type\":\"InputReport\",\"Timestamp\":2000,\"Report\":\"01 0a ff \",\"WallTime\":1795000000000000000}\n"
              "{\"Type\":\"State\",\"Timestamp\":3000,\"Key\":\"Algs.NoValue\"}\n"
              "{\"Type\":\"Event\",\"Timestamp\":4000,\"Event\":{\"Kind\":\"Tap\"}}\n");
}

TEST(RecordingLinesTest, WriterHandsLinesToTheSinkOnlyWhenFlushed) {
    std::string text;
    RecordingLinesWriter writer(into(text), RecordingLinesHeader{});
    writer.writeInputReport(2000, std::vector<uint8_t>{0x01}.data(), 1);
    EXPECT_EQ(text, "");
    writer.flush();
    EXPECT_EQ(text, kHeader + "{\"Type\":\"InputReport\",\"Timestamp\":2000,\"Report\":\"01 \"}\n");
}

TEST(RecordingLinesTest, ReaderGivesTheFramesHeaderAndEventsTheWriterWrote) {
    std::string text;
    {
        RecordingLinesHeader header;
        header.device = RecordingLinesHeader::Device{0x1234, 0x5678, {0x05, 0x0d}, {{2, {0x02, 0x10}}}};
        header.settings.emplace("Algs.HoldTimeoutMilliseconds", PropertyValue(700u));
        RecordingLinesWriter writer(into(text), header);
        writer.writeState(1000, "Algs.Value", PropertyValue(PropertyValue::Array{PropertyValue(-1), PropertyValue(2.5)}));
        writer.writeEvent(1500, "{\"Kind\":\"Tap\"}");
        writer.writeInputReport(2000, std::vector<uint8_t>{0x01, 0x0a}.data(), 2, 99);
    }
    auto reader = readerOf(text);
    EXPECT_EQ(reader->form(), RecordingFrameReader::Form::Lines);
    const std::vector<Frame> frames = framesOf(*reader);
    ASSERT_EQ(frames.size(), 2u);
    EXPECT_EQ(frames[0].type, PipelineRecording::FrameType::State);
    EXPECT_EQ(frames[0].key, "Algs.Value");
    EXPECT_EQ(*frames[0].value, PropertyValue(PropertyValue::Array{PropertyValue(-1), PropertyValue(2.5)}));
    EXPECT_EQ(frames[1].type, PipelineRecording::FrameType::InputReport);
    EXPECT_EQ(frames[1].timestamp, 2000u);
    EXPECT_EQ(frames[1].report, (std::vector<uint8_t>{0x01, 0x0a}));
    ASSERT_EQ(reader->events().size(), 1u);
    EXPECT_EQ(reader->events()[0].timestamp, 1500u);
    EXPECT_EQ(reader->events()[0].json, "{\"Kind\":\"Tap\"}");
    ASSERT_TRUE(reader->header().device.has_value());
    EXPECT_EQ(reader->header().device->vendorId, 0x1234u);
    EXPECT_EQ(reader->header().device->productId, 0x5678u);
    EXPECT_EQ(reader->header().device->reportDescriptor, (std::vector<uint8_t>{0x05, 0x0d}));
    EXPECT_EQ(reader->header().device->featureReports.at(2), (std::vector<uint8_t>{0x02, 0x10}));
    EXPECT_EQ(reader->header().settings.at("Algs.HoldTimeoutMilliseconds"), PropertyValue(700u));
}

TEST(RecordingLinesTest, UnknownHeaderMembersAndBlankLinesAreIgnored) {
    auto reader = readerOf("{\"Version\":1,\"Format\":\"lines\",\"Later\":[1,2]}\n\n"
                           "{\"Type\":\"InputReport\",\"Timestamp\":5,\"Report\":\"01 \"}\n  \n");
    EXPECT_EQ(framesOf(*reader).size(), 1u);
}

TEST(RecordingLinesTest, CutOffLastLineIsDroppedWithAWarningAndEveryCompleteLineReads) {
    std::vector<std::string> warnings;
    auto reader = readerOf(kHeader + "{\"Type\":\"InputReport\",\"Timestamp\":5,\"Report\":\"01 \"}\n"
                                     "{\"Type\":\"InputReport\",\"Timestamp\":6,\"Rep",
                           &warnings);
    const std::vector<Frame> frames = framesOf(*reader);
    ASSERT_EQ(frames.size(), 1u);
    EXPECT_EQ(frames[0].timestamp, 5u);
    ASSERT_EQ(warnings.size(), 1u);
    EXPECT_EQ(warnings[0].rfind("the last line (line 3) is cut off and is left out: ", 0), 0u) << warnings[0];
}

TEST(RecordingLinesTest, LastLineWithoutNewlineThatParsesIsRead) {
    auto reader = readerOf(kHeader + "{\"Type\":\"InputReport\",\"Timestamp\":5,\"Report\":\"01 \"}");
    EXPECT_EQ(framesOf(*reader).size(), 1u);
}

TEST(RecordingLinesTest, NoBytesAtAllFailsAsAnInvalidContainerAtTheFirstByte) {
    try {
        auto reader = readerOf("");
        Frame frame;
        reader->next(frame);
        FAIL() << "no error";
    } catch (const RecordingReadError& error) {
        EXPECT_STREQ(error.what(), "migrateSerializedContainer failed: invalid container");
        EXPECT_EQ(error.detail().rfind("byte 0 (line 1, column 1): ", 0), 0u) << error.detail();
    }
}

TEST(RecordingLinesTest, CompleteLineThatDoesNotParseFailsWithTheLineNumber) {
    auto reader = readerOf(kHeader + "{\"Type\":\"InputReport\",\"Timestamp\":5,\"Report\":\"01 \"}\n{\"Type\": tru}\n");
    Frame frame;
    EXPECT_TRUE(reader->next(frame));
    try {
        reader->next(frame);
        FAIL() << "no error";
    } catch (const RecordingReadError& error) {
        EXPECT_STREQ(error.what(), "migrateSerializedContainer failed: invalid container");
        EXPECT_EQ(error.kind(), RecordingReadError::Kind::Runtime);
        EXPECT_EQ(error.detail().rfind("line 3, column ", 0), 0u) << error.detail();
    }
}

TEST(RecordingLinesTest, FrameLineWithTheDocumentsErrorsGivesTheSameMessageAndKind) {
    auto reader = readerOf(kHeader + "{\"Type\":\"InputReport\",\"Timestamp\":5,\"Report\":\"1ff\"}\n");
    Frame frame;
    try {
        reader->next(frame);
        FAIL() << "no error";
    } catch (const RecordingReadError& error) {
        EXPECT_STREQ(error.what(), "invalid hex string");
        EXPECT_EQ(error.kind(), RecordingReadError::Kind::InvalidArgument);
        EXPECT_EQ(error.detail(), "line 2");
    }
}

TEST(RecordingLinesTest, EventLineWithoutAnEventObjectFailsWithInvalidEvent) {
    auto reader = readerOf(kHeader + "{\"Type\":\"Event\",\"Timestamp\":5,\"Event\":3}\n");
    Frame frame;
    EXPECT_THROW(
        {
            try {
                reader->next(frame);
            } catch (const RecordingReadError& error) {
                EXPECT_STREQ(error.what(), "invalid event");
                throw;
            }
        },
        RecordingReadError);
}

TEST(RecordingLinesTest, HeaderOfAnotherVersionFailsWithTheDocumentsVersionMessage) {
    try {
        readerOf("{\"Version\":2,\"Format\":\"lines\"}\n");
        FAIL() << "no error";
    } catch (const RecordingReadError& error) {
        EXPECT_STREQ(error.what(), "migrateSerializedContainer failed: invalid container version: 2");
    }
}

TEST(RecordingLinesTest, RecordingReadsTheLineFormFromBytesLikeADocument) {
    const std::vector<uint8_t> data =
        bytesOf(kHeader + "{\"Type\":\"State\",\"Timestamp\":1,\"Key\":\"Algs.X\",\"Value\":null}\n"
                          "{\"Type\":\"InputReport\",\"Timestamp\":2,\"Report\":\"01 02 \"}\n");
    const PipelineRecording recording(&data);
    ASSERT_EQ(recording.frames().size(), 2u);
    EXPECT_EQ(recording.frames().back().report, (std::vector<uint8_t>{0x01, 0x02}));
}

TEST(RecordingLinesTest, RecordingFromBadLineFormBytesRaisesTheDocumentsKind) {
    const auto failure = Testing::readFailure(kHeader + "{\"Type\":\"state\",\"Timestamp\":1,\"Key\":\"A\"}\n");
    ASSERT_TRUE(failure.has_value());
    EXPECT_EQ(*failure->kind, typeid(std::invalid_argument));
    EXPECT_EQ(failure->message, "invalid frame type");
}

TEST(RecordingLinesTest, DocumentFormReadsThroughTheSameReader) {
    auto reader = readerOf("{\"Version\":1,\"Frames\":[{\"Type\":\"InputReport\",\"Timestamp\":7,\"Report\":\"01 \"}]}");
    EXPECT_EQ(reader->form(), RecordingFrameReader::Form::Document);
    const std::vector<Frame> frames = framesOf(*reader);
    ASSERT_EQ(frames.size(), 1u);
    EXPECT_EQ(frames[0].timestamp, 7u);
}

}  // namespace
}  // namespace TolkaTouch

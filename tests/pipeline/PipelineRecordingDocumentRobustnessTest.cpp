// Bad documents: whatever the bytes, reading either succeeds or raises one of the reader's own
// messages with its own kind; it never crashes, hangs or runs out of stack.

#include "pipeline/PipelineRecording.h"

#include <gtest/gtest.h>

#include <chrono>
#include <random>
#include <string>
#include <vector>

#include "tests/pipeline/DocumentTesting.h"

namespace TolkaTouch {
namespace {

using Frame = PipelineRecording::Frame;
using Testing::bytesOf;
using Testing::isListedFailure;
using Testing::readFailure;

std::vector<uint8_t> sampleDocument() {
    PipelineRecording recording;
    recording.appendFrame(Frame::state(10, "Algs.HoldTimeoutMilliseconds", PropertyValue(400u)));
    recording.appendFrame(Frame::state(20, "Nested", PropertyValue(PropertyValue::Array{PropertyValue(1.5), PropertyValue()})));
    recording.appendFrame(Frame::inputReport(30, {0x01, 0x02, 0x03, 0x04}));
    recording.appendFrame(Frame::inputReport(40, {0x02, 0x00}));
    return recording.json();
}

void expectSuccessOrListedFailure(const std::vector<uint8_t>& data) {
    const auto failure = readFailure(&data);
    if (failure) {
        EXPECT_TRUE(isListedFailure(*failure))
            << failure->kind->name() << ": " << failure->message << " for " << std::string(data.begin(), data.end());
    }
}

TEST(PipelineRecordingDocumentRobustnessTest, EveryTruncationOfADocumentFailsAsNotJson) {
    const std::vector<uint8_t> document = sampleDocument();
    for (size_t length = 0; length < document.size(); ++length) {
        const std::vector<uint8_t> truncated(document.begin(), document.begin() + length);
        const auto failure = readFailure(&truncated);
        ASSERT_TRUE(failure.has_value()) << length;
        EXPECT_EQ(*failure->kind, typeid(std::runtime_error)) << length;
        EXPECT_EQ(failure->message, "migrateSerializedContainer failed: invalid container") << length;
    }
}

TEST(PipelineRecordingDocumentRobustnessTest, HundredThousandNestedArraysFailAsNotJson) {
    const std::string document = std::string(100000, '[') + std::string(100000, ']');
    const auto failure = readFailure(document);
    ASSERT_TRUE(failure.has_value());
    EXPECT_EQ(*failure->kind, typeid(std::runtime_error));
    EXPECT_EQ(failure->message, "migrateSerializedContainer failed: invalid container");
}

TEST(PipelineRecordingDocumentRobustnessTest, HundredThousandNestedObjectsInAStateValueFailAsNotJson) {
    std::string value;
    for (int i = 0; i < 100000; ++i) value += "{\"a\":";
    value += "1" + std::string(100000, '}');
    const std::string document =
        R"({"Version":1,"Frames":[{"Type":"State","Timestamp":1,"Key":"k","Value":)" + value + "}]}";
    const auto failure = readFailure(document);
    ASSERT_TRUE(failure.has_value());
    EXPECT_EQ(failure->message, "migrateSerializedContainer failed: invalid container");
}

TEST(PipelineRecordingDocumentRobustnessTest, UnclosedHundredThousandLevelsFailAsNotJson) {
    const auto failure = readFailure(std::string(100000, '{'));
    ASSERT_TRUE(failure.has_value());
    EXPECT_EQ(failure->message, "migrateSerializedContainer failed: invalid container");
}

TEST(PipelineRecordingDocumentRobustnessTest, HundredMegabyteDocumentIsReadWhole) {
    constexpr size_t kSize = 100u * 1024 * 1024;
    const std::string head = R"({"Version":1,"Frames":[{"Type":"State","Timestamp":1,"Key":"k","Value":")";
    const std::string tail = R"("}]})";
    std::vector<uint8_t> document;
    document.reserve(kSize);
    document.insert(document.end(), head.begin(), head.end());
    document.resize(kSize - tail.size(), 'x');
    document.insert(document.end(), tail.begin(), tail.end());
    ASSERT_EQ(document.size(), kSize);

    PipelineRecording recording(&document);
    ASSERT_EQ(recording.frames().size(), 1u);
    const PropertyValue& value = *recording.frames().front().value;
    ASSERT_TRUE(value.isString());
    EXPECT_EQ(value.string()->size(), kSize - head.size() - tail.size());
}

// The parser's error text quotes the unfinished token, so this one is kept at ten megabytes.
TEST(PipelineRecordingDocumentRobustnessTest, TenMegabyteDocumentCutShortInsideAStringFailsAsNotJson) {
    constexpr size_t kSize = 10u * 1024 * 1024;
    const std::string head = R"({"Version":1,"Frames":[{"Type":"State","Timestamp":1,"Key":"k","Value":")";
    std::vector<uint8_t> document(head.begin(), head.end());
    document.resize(kSize, 'x');
    const auto failure = readFailure(&document);
    ASSERT_TRUE(failure.has_value());
    EXPECT_EQ(failure->message, "migrateSerializedContainer failed: invalid container");
}

TEST(PipelineRecordingDocumentRobustnessTest, RandomBytesSucceedOrFailWithAListedMessage) {
    std::mt19937 random(20261121);
    std::uniform_int_distribution<int> byte(0, 255);
    std::uniform_int_distribution<size_t> length(0, 300);
    for (int round = 0; round < 3000; ++round) {
        std::vector<uint8_t> data(length(random));
        for (uint8_t& b : data) b = static_cast<uint8_t>(byte(random));
        expectSuccessOrListedFailure(data);
    }
}

TEST(PipelineRecordingDocumentRobustnessTest, RandomlyMutatedDocumentsSucceedOrFailWithAListedMessage) {
    const std::vector<uint8_t> document = sampleDocument();
    const std::string alphabet = "{}[]:,\"0123456789-.eE tfnVersionFramesTypeStateInputReportKeyValue\\";
    std::mt19937 random(7);
    for (int round = 0; round < 5000; ++round) {
        std::vector<uint8_t> data = document;
        const int edits = 1 + static_cast<int>(random() % 4);
        for (int e = 0; e < edits && !data.empty(); ++e) {
            const size_t at = random() % data.size();
            const uint8_t with = static_cast<uint8_t>(alphabet[random() % alphabet.size()]);
            switch (random() % 3) {
            case 0: data[at] = with; break;
            case 1: data.insert(data.begin() + static_cast<std::ptrdiff_t>(at), with); break;
            default: data.erase(data.begin() + static_cast<std::ptrdiff_t>(at)); break;
            }
        }
        expectSuccessOrListedFailure(data);
    }
}

TEST(PipelineRecordingDocumentRobustnessTest, RandomTokenSoupsSucceedOrFailWithAListedMessage) {
    const std::vector<std::string> tokens = {
        "{", "}", "[", "]", ":", ",", "\"Version\"", "\"Frames\"", "\"Reports\"", "\"Type\"", "\"State\"",
        "\"InputReport\"", "\"Timestamp\"", "\"Key\"", "\"Value\"", "\"Report\"", "\"ReportData\"", "0", "1", "2",
        "-1", "1.5", "true", "null", "\"01 02\"", "\"1ff\"", "\"zz\""};
    std::mt19937 random(99);
    for (int round = 0; round < 5000; ++round) {
        std::string text = R"({"Version":)" + tokens[17 + random() % 6] + ",";
        const int count = static_cast<int>(random() % 30);
        for (int i = 0; i < count; ++i) text += tokens[random() % tokens.size()];
        expectSuccessOrListedFailure(bytesOf(text));
    }
}

TEST(PipelineRecordingDocumentRobustnessTest, WellFormedFramesOfEveryShapeSucceedOrFailWithAListedMessage) {
    const std::vector<std::string> values = {"1", "\"State\"", "\"InputReport\"", "\"01\"", "null", "{}", "[]", "-3"};
    const std::vector<std::string> keys = {"Type", "Timestamp", "Key", "Value", "Report"};
    for (int mask = 0; mask < (1 << 5); ++mask) {
        for (size_t v = 0; v < values.size(); ++v) {
            std::string frame = "{";
            for (int k = 0; k < 5; ++k) {
                if (!(mask & (1 << k))) continue;
                if (frame.size() > 1) frame += ",";
                frame += "\"" + keys[k] + "\":" + values[(v + static_cast<size_t>(k)) % values.size()];
            }
            frame += "}";
            expectSuccessOrListedFailure(bytesOf(R"({"Version":1,"Frames":[)" + frame + "]}"));
            expectSuccessOrListedFailure(bytesOf(R"({"Version":0,"Reports":[)" + frame + "]}"));
        }
    }
}

}  // namespace
}  // namespace TolkaTouch

#include "pipeline/PipelineRecording.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <stdexcept>
#include <string>
#include <typeinfo>
#include <vector>

#include "common/Util.h"
#include "tests/pipeline/DocumentTesting.h"

namespace TolkaTouch {
namespace {

using Frame = PipelineRecording::Frame;
using FrameType = PipelineRecording::FrameType;
using Testing::bytesOf;
using Testing::readDocument;
using Testing::readFailure;
using Testing::textOf;

void expectFailure(std::string_view document, const std::type_info& kind, const std::string& message) {
    const auto failure = readFailure(document);
    ASSERT_TRUE(failure.has_value()) << document;
    EXPECT_EQ(*failure->kind, kind) << failure->kind->name() << " for " << document;
    EXPECT_EQ(failure->message, message) << document;
}

void expectInvalidArgument(std::string_view document, const std::string& message) {
    expectFailure(document, typeid(std::invalid_argument), message);
}

void expectWrapped(std::string_view document, const std::string& inner) {
    expectFailure(document, typeid(std::runtime_error), "migrateSerializedContainer failed: " + inner);
}

void expectSameFrames(const std::list<Frame>& actual, const std::list<Frame>& expected) {
    ASSERT_EQ(actual.size(), expected.size());
    auto a = actual.begin();
    for (const Frame& e : expected) {
        EXPECT_EQ(a->type, e.type);
        EXPECT_EQ(a->timestamp, e.timestamp);
        EXPECT_EQ(a->key, e.key);
        ASSERT_EQ(a->value.has_value(), e.value.has_value()) << e.key;
        if (e.value) {
            EXPECT_EQ(*a->value, *e.value) << e.key;
        }
        EXPECT_EQ(a->report, e.report);
        ++a;
    }
}

PipelineRecording sampleRecording() {
    PipelineRecording recording;
    recording.appendFrame(Frame::state(1000, "Algs.HoldTimeoutMilliseconds", PropertyValue(400u)));
    recording.appendFrame(Frame::inputReport(2000, {0x01, 0x05, 0x00, 0xff}));
    recording.appendFrame(Frame::state(3000, "Algs.ActivationThreshold", PropertyValue(1.0)));
    recording.appendFrame(Frame::state(3500, "Algs.ResetEventStats", std::nullopt));
    recording.appendFrame(Frame::state(3600, "Algs.Nothing", PropertyValue()));
    recording.appendFrame(Frame::state(3700, "Signed", PropertyValue(-5)));
    recording.appendFrame(Frame::state(
        3800, "Nested",
        PropertyValue(PropertyValue::Dictionary{
            {"List", PropertyValue(PropertyValue::Array{PropertyValue(true), PropertyValue("text \"quoted\"\n"),
                                                        PropertyValue(2.5)})},
            {"Empty", PropertyValue(PropertyValue::Dictionary{})},
        })));
    recording.appendFrame(Frame::inputReport(std::numeric_limits<uint64_t>::max(), {}));
    return recording;
}

// Writing

TEST(PipelineRecordingDocumentTest, EmptyRecordingWritesVersionOneAndNoFrames) {
    PipelineRecording recording;
    EXPECT_EQ(textOf(recording.json()), "{\n    \"Version\": 1,\n    \"Frames\": []\n}");
}

TEST(PipelineRecordingDocumentTest, EmptyDocumentReadsBackAsAnEmptyRecording) {
    PipelineRecording empty;
    const std::vector<uint8_t> document = empty.json();
    PipelineRecording recording(&document);
    EXPECT_TRUE(recording.frames().empty());
    EXPECT_EQ(recording.pipeline, nullptr);
    EXPECT_EQ(recording.maxFrameCount(), 0u);
    EXPECT_FALSE(recording.playCanContinue());
}

TEST(PipelineRecordingDocumentTest, FramesAreWrittenPrettyPrintedWithTheirMembers) {
    PipelineRecording recording;
    recording.appendFrame(Frame::state(7, "Algs.HoldTimeoutMilliseconds", PropertyValue(400)));
    recording.appendFrame(Frame::state(8, "Algs.ResetEventStats", std::nullopt));
    recording.appendFrame(Frame::inputReport(9, {0x01, 0x0a, 0xff}));
    EXPECT_EQ(textOf(recording.json()),
              "{\n"
              "    \"Version\": 1,\n"
              "    \"Frames\": [\n"
              "        {\n"
              "            \"Type\": \"State\",\n"
              "            \"Timestamp\": 7,\n"
              "            \"Key\": \"Algs.HoldTimeoutMilliseconds\",\n"
              "            \"Value\": 400\n"
              "        },\n"
              "        {\n"
              "            \"Type\": \"State\",\n"
              "            \"Timestamp\": 8,\n"
              "            \"Key\": \"Algs.ResetEventStats\"\n"
              "        },\n"
              "        {\n"
              "            \"Type\": \"InputReport\",\n"
              "            \"Timestamp\": 9,\n"
              "            \"Report\": \"01 0a ff \"\n"
              "        }\n"
              "    ]\n"
              "}");
}

TEST(PipelineRecordingDocumentTest, NullValueIsWrittenAsJsonNull) {
    PipelineRecording recording;
    recording.appendFrame(Frame::state(1, "k", PropertyValue()));
    EXPECT_NE(textOf(recording.json()).find("\"Value\": null"), std::string::npos);
}

TEST(PipelineRecordingDocumentTest, ByteDataValueIsWrittenAsItsHexText) {
    PipelineRecording recording;
    recording.appendFrame(Frame::state(1, "k", PropertyValue(PropertyValue::Data{0x0a, 0xff})));
    const std::vector<uint8_t> document = recording.json();
    EXPECT_NE(textOf(document).find("\"Value\": \"0a ff \""), std::string::npos);
    PipelineRecording read(&document);
    EXPECT_EQ(*read.frames().front().value, PropertyValue("0a ff "));
}

PropertyValue nestedArrays(size_t depth) {
    PropertyValue value(7u);
    for (size_t i = 0; i < depth; ++i) value = PropertyValue(PropertyValue::Array{value});
    return value;
}

size_t arrayDepth(const PropertyValue& value) {
    size_t depth = 0;
    for (const PropertyValue* level = &value; level->isArray(); level = &level->array()->front()) ++depth;
    return depth;
}

TEST(PipelineRecordingDocumentTest, StateValueNestedAsDeepAsTheReaderAllowsRoundTrips) {
    PipelineRecording recording;
    recording.appendFrame(Frame::state(1, "k", nestedArrays(509)));
    const std::vector<uint8_t> document = recording.json();
    PipelineRecording read(&document);
    EXPECT_EQ(*read.frames().front().value, nestedArrays(509));
}

TEST(PipelineRecordingDocumentTest, StateValueNestedDeeperThanTheReaderAllowsIsWrittenCutAndReadsBack) {
    PipelineRecording recording;
    recording.appendFrame(Frame::state(1, "k", nestedArrays(600)));
    const std::vector<uint8_t> document = recording.json();
    PipelineRecording read(&document);
    const PropertyValue& value = *read.frames().front().value;
    EXPECT_EQ(arrayDepth(value), 509u);
    const PropertyValue* innermost = &value;
    while (innermost->isArray()) innermost = &innermost->array()->front();
    EXPECT_TRUE(innermost->isNull());
}

TEST(PipelineRecordingDocumentTest, KeyThatIsNotUtf8IsWrittenWithReplacementCharacters) {
    PipelineRecording recording;
    recording.appendFrame(Frame::state(1, "Algs.\xff", PropertyValue("\xfe")));
    const std::vector<uint8_t> document = recording.json();
    PipelineRecording read(&document);
    EXPECT_EQ(read.frames().front().key, "Algs.\xef\xbf\xbd");
    EXPECT_EQ(*read.frames().front().value, PropertyValue("\xef\xbf\xbd"));
}

TEST(PipelineRecordingDocumentTest, FrameOfAnyOtherTypeIsNotWritten) {
    PipelineRecording recording;
    Frame other = Frame::inputReport(1, {0x01});
    other.type = static_cast<FrameType>(5);
    recording.appendFrame(other);
    EXPECT_EQ(textOf(recording.json()), "{\n    \"Version\": 1,\n    \"Frames\": []\n}");
}

TEST(PipelineRecordingDocumentTest, WritingARecordingOverItsBoundTrimsItFirst) {
    PipelineRecording recording;
    recording.setMaxFrameCount(3);
    recording.appendFrame(Frame::state(1, "a", PropertyValue(1u)));
    for (uint8_t tag = 1; tag <= 4; ++tag) recording.appendFrame(Frame::inputReport(1 + tag, {tag}));
    ASSERT_EQ(recording.frames().size(), 5u);  // below twice the bound: not trimmed yet
    const std::vector<uint8_t> document = recording.json();
    ASSERT_EQ(recording.frames().size(), 4u);
    PipelineRecording read(&document);
    expectSameFrames(read.frames(), recording.frames());
    EXPECT_EQ(read.frames().front().key, "a");
    EXPECT_EQ(read.frames().front().timestamp, 1u);
    EXPECT_EQ(std::next(read.frames().begin())->report, std::vector<uint8_t>{0x02});
    EXPECT_EQ(read.frames().back().report, std::vector<uint8_t>{0x04});
}

TEST(PipelineRecordingDocumentTest, UnboundedRecordingIsWrittenWhole) {
    PipelineRecording recording;
    for (uint64_t i = 0; i < 10; ++i) recording.appendFrame(Frame::inputReport(i, {0x01}));
    const std::vector<uint8_t> document = recording.json();
    EXPECT_EQ(PipelineRecording(&document).frames().size(), 10u);
}

// Round trips

TEST(PipelineRecordingDocumentTest, WriteThenReadGivesTheSameFramesTypesTimestampsKeysValuesAndBytes) {
    PipelineRecording recording = sampleRecording();
    const std::vector<uint8_t> document = recording.json();
    PipelineRecording read(&document);
    expectSameFrames(read.frames(), recording.frames());
}

TEST(PipelineRecordingDocumentTest, StateFrameWithoutValueComesBackWithoutOne) {
    PipelineRecording recording;
    recording.appendFrame(Frame::state(1, "k", std::nullopt));
    const std::vector<uint8_t> document = recording.json();
    PipelineRecording read(&document);
    EXPECT_FALSE(read.frames().front().value.has_value());
}

TEST(PipelineRecordingDocumentTest, StateFrameWithNullValueComesBackWithTheNullKind) {
    PipelineRecording read = readDocument(R"({"Version":1,"Frames":[{"Type":"State","Timestamp":1,"Key":"k","Value":null}]})");
    ASSERT_TRUE(read.frames().front().value.has_value());
    EXPECT_TRUE(read.frames().front().value->isNull());
}

TEST(PipelineRecordingDocumentTest, WriteReadWriteGivesByteIdenticalText) {
    PipelineRecording recording = sampleRecording();
    const std::vector<uint8_t> first = recording.json();
    PipelineRecording read(&first);
    EXPECT_EQ(textOf(read.json()), textOf(first));
}

TEST(PipelineRecordingDocumentTest, LargestUnsignedTimestampRoundTripsExactly) {
    PipelineRecording read = readDocument(
        R"({"Version":1,"Frames":[{"Type":"InputReport","Timestamp":18446744073709551615,"Report":""}]})");
    EXPECT_EQ(read.frames().front().timestamp, 18446744073709551615ull);
    EXPECT_NE(textOf(read.json()).find("\"Timestamp\": 18446744073709551615"), std::string::npos);
}

TEST(PipelineRecordingDocumentTest, TimestampTwoToTheFiftyThreePlusOneRoundTripsExactly) {
    const uint64_t timestamp = (uint64_t{1} << 53) + 1;
    PipelineRecording recording;
    recording.appendFrame(Frame::inputReport(timestamp, {0x01}));
    recording.appendFrame(Frame::state(timestamp, "k", PropertyValue(timestamp)));
    const std::vector<uint8_t> document = recording.json();
    EXPECT_NE(textOf(document).find("9007199254740993"), std::string::npos);
    PipelineRecording read(&document);
    EXPECT_EQ(read.frames().front().timestamp, timestamp);
    EXPECT_EQ(read.frames().back().value->unsignedInteger(), timestamp);
}

TEST(PipelineRecordingDocumentTest, FloatingOneStaysFloatingAndFiveStaysInteger) {
    PipelineRecording read = readDocument(R"({"Version":1,"Frames":[
        {"Type":"State","Timestamp":1,"Key":"f","Value":1.0},
        {"Type":"State","Timestamp":2,"Key":"i","Value":5},
        {"Type":"State","Timestamp":3,"Key":"n","Value":-5}]})");
    auto it = read.frames().begin();
    EXPECT_EQ(it->value->kind(), PropertyValue::Kind::Floating);
    EXPECT_EQ(it->value->floating(), 1.0);
    ++it;
    EXPECT_TRUE(it->value->isInteger());
    EXPECT_EQ(it->value->toInt64(), 5);
    ++it;
    EXPECT_EQ(it->value->signedInteger(), -5);
    const std::string text = textOf(read.json());
    EXPECT_NE(text.find("\"Value\": 1.0\n"), std::string::npos);
    EXPECT_NE(text.find("\"Value\": 5\n"), std::string::npos);
    EXPECT_NE(text.find("\"Value\": -5\n"), std::string::npos);
}

TEST(PipelineRecordingDocumentTest, ReaderAcceptsAnyFormattingAndKeyOrder) {
    PipelineRecording read = readDocument(
        "  {\"Frames\" :[ {\"Report\":\"01 02\",\"Timestamp\":5,\"Type\":\"InputReport\"} ] ,\n\t\"Version\":1}  \n");
    ASSERT_EQ(read.frames().size(), 1u);
    EXPECT_EQ(read.frames().front().report, (std::vector<uint8_t>{0x01, 0x02}));
}

TEST(PipelineRecordingDocumentTest, ReadingKeepsTheDocumentsTimestampsAndDoesNotTrim) {
    std::string document = R"({"Version":1,"Frames":[)";
    for (int i = 0; i < 5; ++i) {
        if (i) document += ",";
        document += R"({"Type":"InputReport","Timestamp":)" + std::to_string(100 - i) + R"(,"Report":"01"})";
    }
    document += "]}";
    PipelineRecording read = readDocument(document);
    ASSERT_EQ(read.frames().size(), 5u);
    EXPECT_EQ(read.frames().front().timestamp, 100u);
    EXPECT_EQ(read.frames().back().timestamp, 96u);
}

TEST(PipelineRecordingDocumentTest, TimestampIsTheNumbersValueAsUnsigned) {
    PipelineRecording read = readDocument(R"({"Version":1,"Frames":[
        {"Type":"InputReport","Timestamp":12.9,"Report":""},
        {"Type":"InputReport","Timestamp":true,"Report":""},
        {"Type":"InputReport","Timestamp":-1,"Report":""}]})");
    auto it = read.frames().begin();
    EXPECT_EQ((it++)->timestamp, 12u);
    EXPECT_EQ((it++)->timestamp, 1u);
    EXPECT_EQ(it->timestamp, 18446744073709551615ull);
}

// Versions and migration

TEST(PipelineRecordingDocumentTest, VersionOnePointSevenIsAcceptedAsVersionOne) {
    PipelineRecording read = readDocument(R"({"Version":1.7,"Frames":[{"Type":"InputReport","Timestamp":1,"Report":"aa"}]})");
    EXPECT_EQ(read.frames().size(), 1u);
}

TEST(PipelineRecordingDocumentTest, VersionTrueCountsAsVersionOne) {
    EXPECT_TRUE(readDocument(R"({"Version":true,"Frames":[]})").frames().empty());
}

TEST(PipelineRecordingDocumentTest, VersionTwoFailsWithTheWrapperAndTheVersion) {
    expectWrapped(R"({"Version":2,"Frames":[]})", "invalid container version: 2");
}

TEST(PipelineRecordingDocumentTest, NegativeVersionWrapsToAHugeVersion) {
    expectWrapped(R"({"Version":-1,"Frames":[]})", "invalid container version: 18446744073709551615");
}

TEST(PipelineRecordingDocumentTest, VersionHoldingTheStringOneFailsWithInvalidVersion) {
    expectWrapped(R"({"Version":"1","Frames":[]})", "invalid version");
}

TEST(PipelineRecordingDocumentTest, VersionZeroReportReadsAsOneInputReportFrame) {
    PipelineRecording read = readDocument(R"({"Version":0,"Reports":[{"Timestamp":5,"ReportData":"01 02 "}]})");
    ASSERT_EQ(read.frames().size(), 1u);
    const Frame& frame = read.frames().front();
    EXPECT_EQ(frame.type, FrameType::InputReport);
    EXPECT_EQ(frame.timestamp, 5u);
    EXPECT_EQ(frame.report, (std::vector<uint8_t>{0x01, 0x02}));
    EXPECT_FALSE(frame.value.has_value());
    EXPECT_TRUE(frame.key.empty());
}

TEST(PipelineRecordingDocumentTest, VersionZeroWithoutReportsReadsAsAnEmptyRecording) {
    EXPECT_TRUE(readDocument(R"({"Version":0})").frames().empty());
}

TEST(PipelineRecordingDocumentTest, VersionZeroWithReportsThatAreNotAnArrayHoldsNoReports) {
    EXPECT_TRUE(readDocument(R"({"Version":0,"Reports":"none"})").frames().empty());
}

TEST(PipelineRecordingDocumentTest, VersionZeroReportLackingReportDataFailsWithTheWrapper) {
    expectWrapped(R"({"Version":0,"Reports":[{"Timestamp":5}]})", "frame lacks ReportData");
}

TEST(PipelineRecordingDocumentTest, VersionZeroReportLackingTimestampFailsWithTheWrapper) {
    expectWrapped(R"({"Version":0,"Reports":[{"ReportData":"01"}]})", "frame lacks Timestamp");
}

TEST(PipelineRecordingDocumentTest, VersionZeroReportWithAStringTimestampFailsUnwrappedAfterMigration) {
    expectInvalidArgument(R"({"Version":0,"Reports":[{"Timestamp":"5","ReportData":"01"}]})",
                          "invalid frame timestamp");
}

TEST(PipelineRecordingDocumentTest, VersionZeroReportThatIsNotAnObjectLacksItsTimestamp) {
    expectWrapped(R"({"Version":0,"Reports":[7]})", "frame lacks Timestamp");
}

TEST(PipelineRecordingDocumentTest, MigrationOfVersionZeroBuildsAVersionOneContainer) {
    const PropertyValue container(PropertyValue::Dictionary{
        {"Version", PropertyValue(0)},
        {"Reports", PropertyValue(PropertyValue::Array{PropertyValue(PropertyValue::Dictionary{
                        {"Timestamp", PropertyValue(5)}, {"ReportData", PropertyValue("01 02 ")}})})},
    });
    const PropertyValue migrated = PipelineRecording::migrateSerializedContainer(container);
    const PropertyValue expected(PropertyValue::Dictionary{
        {"Version", PropertyValue(1u)},
        {"Frames", PropertyValue(PropertyValue::Array{PropertyValue(PropertyValue::Dictionary{
                       {"Type", PropertyValue("InputReport")},
                       {"Timestamp", PropertyValue(5)},
                       {"Report", PropertyValue("01 02 ")}})})},
    });
    EXPECT_EQ(migrated, expected);
}

TEST(PipelineRecordingDocumentTest, MigrationReturnsAVersionOneContainerUnchanged) {
    const PropertyValue container(PropertyValue::Dictionary{{"Version", PropertyValue(1)}, {"Other", PropertyValue(3)}});
    EXPECT_EQ(PipelineRecording::migrateSerializedContainer(container), container);
}

TEST(PipelineRecordingDocumentTest, MigrationOfNoContainerFailsWithInvalidContainer) {
    try {
        PipelineRecording::migrateSerializedContainer(std::nullopt);
        FAIL() << "no error";
    } catch (const std::exception& error) {
        EXPECT_EQ(typeid(error), typeid(std::invalid_argument));
        EXPECT_STREQ(error.what(), "invalid container");
    }
}

TEST(PipelineRecordingDocumentTest, MigrationOfAnArrayFailsWithInvalidContainer) {
    EXPECT_THROW(PipelineRecording::migrateSerializedContainer(PropertyValue(PropertyValue::Array{})),
                 std::invalid_argument);
}

// Each message the reader can raise, with its kind

TEST(PipelineRecordingDocumentTest, NoDataFailsWithJsonNotSupplied) {
    const auto failure = readFailure(static_cast<const std::vector<uint8_t>*>(nullptr));
    ASSERT_TRUE(failure.has_value());
    EXPECT_EQ(*failure->kind, typeid(std::invalid_argument));
    EXPECT_EQ(failure->message, "json not supplied");
}

TEST(PipelineRecordingDocumentTest, TextThatIsNotJsonFailsWithTheWrapperAndInvalidContainer) {
    expectWrapped("this is not json", "invalid container");
    expectWrapped("", "invalid container");
    expectWrapped("{\"Version\":1,\"Frames\":[]} trailing", "invalid container");
}

TEST(PipelineRecordingDocumentTest, EmptyJsonArrayFailsWithTheWrapperAndInvalidContainer) {
    expectWrapped("[]", "invalid container");
}

TEST(PipelineRecordingDocumentTest, BareScalarFailsWithTheWrapperAndInvalidContainer) {
    expectWrapped("1", "invalid container");
    expectWrapped("\"text\"", "invalid container");
    expectWrapped("null", "invalid container");
}

TEST(PipelineRecordingDocumentTest, MissingVersionFailsWithTheWrapperAndInvalidVersion) {
    expectWrapped(R"({"Frames":[]})", "invalid version");
}

TEST(PipelineRecordingDocumentTest, MissingFramesFailsWithInvalidFrames) {
    expectInvalidArgument(R"({"Version":1})", "invalid frames");
}

TEST(PipelineRecordingDocumentTest, FramesThatAreNotAnArrayFailWithInvalidFrames) {
    expectInvalidArgument(R"({"Version":1,"Frames":{}})", "invalid frames");
    expectInvalidArgument(R"({"Version":1,"Frames":null})", "invalid frames");
}

TEST(PipelineRecordingDocumentTest, MissingFrameTypeFailsWithInvalidFrameType) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Timestamp":1,"Report":""}]})", "invalid frame type");
}

TEST(PipelineRecordingDocumentTest, FrameTypeThatIsNotAStringFailsWithInvalidFrameType) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":1,"Timestamp":1,"Report":""}]})", "invalid frame type");
}

TEST(PipelineRecordingDocumentTest, FrameTypeStateInLowerCaseFailsWithInvalidFrameType) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"state","Timestamp":1,"Key":"k","Value":1}]})",
                          "invalid frame type");
}

TEST(PipelineRecordingDocumentTest, FrameThatIsNotAnObjectFailsWithInvalidFrameType) {
    expectInvalidArgument(R"({"Version":1,"Frames":[3]})", "invalid frame type");
    expectInvalidArgument(R"({"Version":1,"Frames":[["Type","State"]]})", "invalid frame type");
    expectInvalidArgument(R"({"Version":1,"Frames":[null]})", "invalid frame type");
}

TEST(PipelineRecordingDocumentTest, MissingTimestampFailsWithInvalidFrameTimestamp) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"InputReport","Report":""}]})", "invalid frame timestamp");
}

TEST(PipelineRecordingDocumentTest, TimestampThatIsNotANumberFailsWithInvalidFrameTimestamp) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"State","Timestamp":"1","Key":"k"}]})",
                          "invalid frame timestamp");
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"State","Timestamp":null,"Key":"k"}]})",
                          "invalid frame timestamp");
}

TEST(PipelineRecordingDocumentTest, TimestampIsCheckedBeforeAnUnknownType) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"Other"}]})", "invalid frame timestamp");
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"Other","Timestamp":1}]})", "invalid frame type");
}

TEST(PipelineRecordingDocumentTest, MissingStateKeyFailsWithInvalidStateKey) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"State","Timestamp":1,"Value":1}]})", "invalid state key");
}

TEST(PipelineRecordingDocumentTest, StateKeyThatIsNotAStringFailsWithInvalidStateKey) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"State","Timestamp":1,"Key":5}]})", "invalid state key");
}

TEST(PipelineRecordingDocumentTest, StateValueThatNoDocumentCanHoldFailsWithInvalidStateValueClass) {
    const PropertyValue container(PropertyValue::Dictionary{
        {"Version", PropertyValue(1)},
        {"Frames", PropertyValue(PropertyValue::Array{PropertyValue(PropertyValue::Dictionary{
                       {"Type", PropertyValue("State")},
                       {"Timestamp", PropertyValue(1)},
                       {"Key", PropertyValue("k")},
                       {"Value", PropertyValue(PropertyValue::Data{0x01})}})})},
    });
    try {
        PipelineRecording::framesFromContainer(container);
        FAIL() << "no error";
    } catch (const std::exception& error) {
        EXPECT_EQ(typeid(error), typeid(std::invalid_argument));
        EXPECT_STREQ(error.what(), "invalid state value class");
    }
}

TEST(PipelineRecordingDocumentTest, EveryParsedJsonValueIsAValidStateValue) {
    PipelineRecording read = readDocument(R"({"Version":1,"Frames":[
        {"Type":"State","Timestamp":1,"Key":"a","Value":{}},
        {"Type":"State","Timestamp":1,"Key":"b","Value":[]},
        {"Type":"State","Timestamp":1,"Key":"c","Value":""},
        {"Type":"State","Timestamp":1,"Key":"d","Value":false}]})");
    EXPECT_EQ(read.frames().size(), 4u);
}

TEST(PipelineRecordingDocumentTest, MissingReportFailsWithInvalidReport) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"InputReport","Timestamp":1}]})", "invalid report");
}

TEST(PipelineRecordingDocumentTest, ReportThatIsNotAStringFailsWithInvalidReport) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"InputReport","Timestamp":1,"Report":[1,2]}]})",
                          "invalid report");
}

TEST(PipelineRecordingDocumentTest, ReportHoldingOneFFFailsWithInvalidHexString) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"InputReport","Timestamp":1,"Report":"1ff"}]})",
                          "invalid hex string");
}

TEST(PipelineRecordingDocumentTest, ReportHoldingZeroOneThenGarbageYieldsOneByte) {
    PipelineRecording read = readDocument(R"({"Version":1,"Frames":[{"Type":"InputReport","Timestamp":1,"Report":"01 zz"}]})");
    EXPECT_EQ(read.frames().front().report, std::vector<uint8_t>{0x01});
}

TEST(PipelineRecordingDocumentTest, ReportTextInAnyHexFormReadsAsTheHexReaderReadsIt) {
    const std::vector<std::string> texts = {
        "",        "01 0a ff ", "01 0a ff", "01 0A FF ", "1 a ff", "0x1f 02", "01  02", " 01 02",
        "01\\t02", "01\\n02 ",  "01 0g",    "01 zz",     "010 2",  "0",      "01 02 0", "ab cd ef 12 ",
    };
    for (const std::string& text : texts) {
        const PipelineRecording read = readDocument(R"({"Version":1,"Frames":[{"Type":"InputReport","Timestamp":1,"Report":")" +
                                                    text + R"("}]})");
        std::string unescaped = text;
        for (auto [escape, character] : {std::pair{"\\t", '\t'}, std::pair{"\\n", '\n'}}) {
            for (size_t at; (at = unescaped.find(escape)) != std::string::npos;) unescaped.replace(at, 2, 1, character);
        }
        EXPECT_EQ(read.frames().front().report, Util::bytesFromHexString(unescaped)) << text;
    }
}

TEST(PipelineRecordingDocumentTest, EveryByteValueRoundTripsThroughReportText) {
    std::vector<uint8_t> all(256);
    for (int i = 0; i < 256; ++i) all[static_cast<size_t>(i)] = static_cast<uint8_t>(i);
    PipelineRecording recording;
    recording.appendFrame(Frame::inputReport(1, all));
    const std::vector<uint8_t> document = recording.json();
    EXPECT_EQ(PipelineRecording(&document).frames().front().report, all);
}

TEST(PipelineRecordingDocumentTest, FirstBadFrameStopsTheReadingWhateverFollows) {
    expectInvalidArgument(R"({"Version":1,"Frames":[{"Type":"InputReport","Timestamp":1,"Report":"01"},
                              {"Type":"State","Timestamp":2},{"Type":"Bad"}]})",
                          "invalid state key");
}

}  // namespace
}  // namespace TolkaTouch

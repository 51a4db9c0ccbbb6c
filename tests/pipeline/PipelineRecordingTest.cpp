#include "pipeline/PipelineRecording.h"

#include <gtest/gtest.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "common/Util.h"
#include "tests/pipeline/FakePipelineInput.h"

namespace TolkaTouch {
namespace {

using Frame = PipelineRecording::Frame;
using FrameType = PipelineRecording::FrameType;
using Testing::FakeClock;
using Testing::FakePipelineInput;

// A host clock of 125/3 nanoseconds per tick, so ticks and nanoseconds cannot be mistaken for
// each other. The timebase is read once per process, before any test runs.
const bool timebaseInstalled = (Host::setTimebase(Timebase{125, 3}), true);

// A short way of writing frame lists: "S a=1" is a State frame, "R 1" an input report with one
// byte; the timestamp is the position in the list.
Frame S(const std::string& key, int value, uint64_t timestamp = 0) {
    return Frame::state(timestamp, key, PropertyValue(value));
}
Frame R(uint8_t tag, uint64_t timestamp = 0) { return Frame::inputReport(timestamp, {tag}); }

std::vector<std::string> describe(const std::list<Frame>& frames) {
    std::vector<std::string> lines;
    for (const Frame& frame : frames) {
        if (frame.type == FrameType::State) {
            lines.push_back("S(" + frame.key + "=" + (frame.value ? frame.value->description() : "absent") + ")");
        } else {
            lines.push_back("R" + std::to_string(frame.report.empty() ? -1 : frame.report[0]));
        }
    }
    return lines;
}

struct PipelineRecordingWithPipelineTest : ::testing::Test {
    PipelineRecordingWithPipelineTest() {
        EXPECT_TRUE(timebaseInstalled);
        recording.pipeline = fake;
        recording.clock = clock.hostClock();
    }
    FakeClock clock;
    std::shared_ptr<FakePipelineInput> fake = std::make_shared<FakePipelineInput>();
    PipelineRecording recording;
};

TEST(PipelineRecordingTest, FreshRecordingHasNoPipelineNoFramesNoBoundAndNoPlayback) {
    PipelineRecording recording;
    EXPECT_EQ(recording.pipeline, nullptr);
    EXPECT_TRUE(recording.frames().empty());
    EXPECT_EQ(recording.maxFrameCount(), 0u);
    EXPECT_FALSE(recording.playCanContinue());
}

TEST_F(PipelineRecordingWithPipelineTest, SetStateRecordsNanosecondsAndForwardsRawTicksThenTheState) {
    clock.ticks = 3000;
    recording.setState("Algs.HoldTimeoutMilliseconds", PropertyValue(400));
    ASSERT_EQ(recording.frames().size(), 1u);
    const Frame& frame = recording.frames().front();
    EXPECT_EQ(frame.type, FrameType::State);
    EXPECT_EQ(frame.timestamp, 125000u);
    EXPECT_EQ(frame.key, "Algs.HoldTimeoutMilliseconds");
    ASSERT_TRUE(frame.value.has_value());
    EXPECT_EQ(*frame.value, PropertyValue(400));
    EXPECT_TRUE(frame.report.empty());
    EXPECT_EQ(fake->calls, (std::vector<std::string>{"setTime 3000", "setState Algs.HoldTimeoutMilliseconds 400"}));
}

TEST_F(PipelineRecordingWithPipelineTest, NullValueIsRecordedAsAValueOfTheNullKind) {
    recording.setState("Algs.ResetEventStats", PropertyValue());
    ASSERT_TRUE(recording.frames().front().value.has_value());
    EXPECT_TRUE(recording.frames().front().value->isNull());
}

TEST_F(PipelineRecordingWithPipelineTest, InputReportIsRecordedWithItsBytesAndForwardedAfterTheClock) {
    clock.ticks = 6;
    const std::vector<uint8_t> report{0x01, 0x0a, 0xff};
    recording.handleInputReport(report.data(), report.size());
    ASSERT_EQ(recording.frames().size(), 1u);
    const Frame& frame = recording.frames().front();
    EXPECT_EQ(frame.type, FrameType::InputReport);
    EXPECT_EQ(frame.timestamp, 250u);
    EXPECT_TRUE(frame.key.empty());
    EXPECT_FALSE(frame.value.has_value());
    EXPECT_EQ(frame.report, report);
    EXPECT_EQ(fake->calls, (std::vector<std::string>{"setTime 6", "handleInputReport 01 0a ff "}));
}

TEST_F(PipelineRecordingWithPipelineTest, EmptyInputReportIsRecordedWithNoBytes) {
    recording.handleInputReport(nullptr, 0);
    ASSERT_EQ(recording.frames().size(), 1u);
    EXPECT_TRUE(recording.frames().front().report.empty());
    EXPECT_EQ(fake->calls.back(), "handleInputReport ");
}

TEST_F(PipelineRecordingWithPipelineTest, SetTimeIsNeitherRecordedNorForwarded) {
    recording.setTime(42);
    EXPECT_TRUE(recording.frames().empty());
    EXPECT_TRUE(fake->calls.empty());
}

TEST_F(PipelineRecordingWithPipelineTest, ReportThatMakesThePipelineFailIsStillRecorded) {
    fake->onInputReport = [] { throw std::runtime_error("pipeline failed"); };
    const uint8_t report[] = {0x02};
    EXPECT_THROW(recording.handleInputReport(report, 1), std::runtime_error);
    EXPECT_EQ(recording.frames().size(), 1u);
}

TEST(PipelineRecordingTest, RecordingWithoutAPipelineRecordsFramesAndForwardsNothing) {
    FakeClock clock;
    PipelineRecording recording;
    recording.clock = clock.hostClock();
    recording.setState("Algs.ActivationThreshold", PropertyValue(150.0));
    const uint8_t report[] = {0x01, 0x02};
    recording.handleInputReport(report, sizeof report);
    EXPECT_EQ(describe(recording.frames()), (std::vector<std::string>{"S(Algs.ActivationThreshold=150)", "R1"}));
}

TEST_F(PipelineRecordingWithPipelineTest, WithBound1350TheListReaches2700ReportsAndDropsTo1350OnTheAppendThatReachedIt) {
    recording.setMaxFrameCount(1350);
    const uint8_t report[] = {0x01};
    for (int i = 0; i < 2699; ++i) recording.handleInputReport(report, 1);
    EXPECT_EQ(recording.frames().size(), 2699u);
    recording.handleInputReport(report, 1);
    EXPECT_EQ(recording.frames().size(), 1350u);
}

TEST(PipelineRecordingTest, ReportsRecordedAfterTrimsInTheRoomOfDroppedFramesHaveTheirOwnTimesAndBytes) {
    // The frames the bound drops (reports of other lengths, settings) are made over into later
    // reports: nothing of what they held may show.
    FakeClock clock;
    PipelineRecording recording;
    recording.clock = clock.hostClock();
    recording.setMaxFrameCount(3);
    clock.ticks = 3;
    recording.setState("Algs.ActivationThreshold", PropertyValue(150.0));
    for (uint8_t tag = 1; tag <= 20; ++tag) {
        const std::vector<uint8_t> report(tag % 4, tag);
        clock.ticks += 3;
        recording.handleInputReport(report.data(), report.size());
        clock.ticks += 3;
        if (tag == 9) recording.setState("Algs.HoldTimeoutMilliseconds", PropertyValue(700u));
    }
    std::vector<std::string> seen;
    for (const Frame& frame : recording.frames()) {
        seen.push_back(frame.type == PipelineRecording::FrameType::State ? "S " + frame.key
                                                                         : "R " + std::to_string(frame.report.size()));
        if (frame.type == PipelineRecording::FrameType::InputReport) {
            EXPECT_TRUE(frame.key.empty());
            EXPECT_FALSE(frame.value.has_value());
            for (uint8_t byte : frame.report) EXPECT_EQ(byte, frame.report.front());
        }
    }
    // The last report trimmed the list (six frames, twice the bound) to the newest three reports,
    // 18 to 20 (18 % 4 = 2 bytes, then 3, then 0), and the newest setting of each key.
    EXPECT_EQ(seen, (std::vector<std::string>{"S Algs.ActivationThreshold", "S Algs.HoldTimeoutMilliseconds", "R 2",
                                              "R 3", "R 0"}));
    uint64_t previous = 0;
    for (const Frame& frame : recording.frames()) {
        EXPECT_GT(frame.timestamp, previous);
        previous = frame.timestamp;
    }
    EXPECT_EQ(recording.frames().back().timestamp, Util::nanosecondsFromMachTime(clock.ticks - 3));
}

TEST(PipelineRecordingTest, AReportAfterATrimIsKeptInTheStorageOfAFrameTheTrimDropped) {
    PipelineRecording recording;
    recording.setMaxFrameCount(2);
    const uint8_t report[] = {0x01, 0x02, 0x03};
    std::vector<const uint8_t*> storage;
    for (int i = 0; i < 3; ++i) {
        recording.handleInputReport(report, sizeof report);
        storage.push_back(recording.frames().back().report.data());
    }
    recording.handleInputReport(report, sizeof report);  // four frames: trimmed to the newest two
    ASSERT_EQ(recording.frames().size(), 2u);
    recording.handleInputReport(report, sizeof report);
    const uint8_t* reused = recording.frames().back().report.data();
    EXPECT_TRUE(reused == storage[0] || reused == storage[1]);
    EXPECT_EQ(recording.frames().back().report, (std::vector<uint8_t>{0x01, 0x02, 0x03}));
}

TEST_F(PipelineRecordingWithPipelineTest, TrimmingKeepsTheNewestReports) {
    recording.setMaxFrameCount(2);
    for (uint8_t tag = 1; tag <= 4; ++tag) recording.appendFrame(R(tag));
    EXPECT_EQ(describe(recording.frames()), (std::vector<std::string>{"R3", "R4"}));
}

TEST(PipelineRecordingTest, TrimWithBoundTwoWalksTheDocumentedExample) {
    std::list<Frame> frames;
    frames.push_back(S("a", 1));
    frames.push_back(R(1));
    frames.push_back(S("a", 2));
    frames.push_back(S("a", 3));
    frames.push_back(R(2));
    frames.push_back(S("b", 1));
    frames.push_back(R(3));
    frames.push_back(R(4));
    PipelineRecording::trimFrames(frames, 2);
    EXPECT_EQ(describe(frames), (std::vector<std::string>{"S(a=3)", "S(b=1)", "R3", "R4"}));
}

TEST(PipelineRecordingTest, SetMaxFrameCountTrimsTheDocumentedExampleAtOnce) {
    PipelineRecording recording;
    for (Frame frame : {S("a", 1), R(1), S("a", 2), S("a", 3), R(2), S("b", 1), R(3), R(4)}) {
        recording.appendFrame(std::move(frame));
    }
    recording.setMaxFrameCount(2);
    EXPECT_EQ(recording.maxFrameCount(), 2u);
    EXPECT_EQ(describe(recording.frames()), (std::vector<std::string>{"S(a=3)", "S(b=1)", "R3", "R4"}));
}

TEST(PipelineRecordingTest, TwoStateFramesForOneKeyWithAKeptReportBetweenThemBothSurvive) {
    std::list<Frame> frames{S("a", 1), R(1), S("a", 2), R(2)};
    PipelineRecording::trimFrames(frames, 2);
    EXPECT_EQ(describe(frames), (std::vector<std::string>{"S(a=1)", "R1", "S(a=2)", "R2"}));
}

TEST(PipelineRecordingTest, WithinOneStretchOnlyTheNewestStateFrameOfAKeySurvives) {
    std::list<Frame> frames{R(1), S("a", 1), S("b", 1), S("a", 2), R(2), S("a", 3), S("a", 4)};
    PipelineRecording::trimFrames(frames, 5);
    EXPECT_EQ(describe(frames), (std::vector<std::string>{"R1", "S(b=1)", "S(a=2)", "R2", "S(a=4)"}));
}

TEST(PipelineRecordingTest, TrimWithBoundZeroRemovesEveryReportAndKeepsOneStateFramePerKey) {
    std::list<Frame> frames{S("a", 1), R(1), S("b", 1), R(2), S("a", 2), R(3)};
    PipelineRecording::trimFrames(frames, 0);
    EXPECT_EQ(describe(frames), (std::vector<std::string>{"S(b=1)", "S(a=2)"}));
}

TEST(PipelineRecordingTest, TrimOfAnEmptyListLeavesItEmpty) {
    std::list<Frame> frames;
    PipelineRecording::trimFrames(frames, 3);
    EXPECT_TRUE(frames.empty());
}

TEST(PipelineRecordingTest, TrimKeepsFramesOfAnyOtherType) {
    Frame other = R(9);
    other.type = static_cast<FrameType>(7);
    std::list<Frame> frames{R(1), other, R(2)};
    PipelineRecording::trimFrames(frames, 1);
    ASSERT_EQ(frames.size(), 2u);
    EXPECT_EQ(frames.front().type, static_cast<FrameType>(7));
    EXPECT_EQ(frames.back().report, std::vector<uint8_t>{2});
}

TEST_F(PipelineRecordingWithPipelineTest, SetMaxFrameCountZeroLeavesTheListUntouchedAndLetsItGrowWithoutBound) {
    for (Frame frame : {S("a", 1), S("a", 2), R(1), R(2), R(3)}) recording.appendFrame(std::move(frame));
    recording.setMaxFrameCount(0);
    EXPECT_EQ(recording.frames().size(), 5u);
    const uint8_t report[] = {0x01};
    for (int i = 0; i < 5000; ++i) recording.handleInputReport(report, 1);
    EXPECT_EQ(recording.frames().size(), 5005u);
}

TEST_F(PipelineRecordingWithPipelineTest, SettingABoundAfterUnboundedRecordingTrimsAtOnce) {
    const uint8_t report[] = {0x01};
    for (int i = 0; i < 10; ++i) recording.handleInputReport(report, 1);
    recording.setMaxFrameCount(3);
    EXPECT_EQ(recording.frames().size(), 3u);
}

TEST_F(PipelineRecordingWithPipelineTest, TrimmingCountsStateFramesTowardsTheTwiceTheBoundTrigger) {
    recording.setMaxFrameCount(2);
    recording.appendFrame(R(1));
    recording.appendFrame(S("a", 1));
    recording.appendFrame(S("b", 1));
    EXPECT_EQ(recording.frames().size(), 3u);
    recording.appendFrame(S("c", 1));  // four frames: twice the bound
    EXPECT_EQ(describe(recording.frames()), (std::vector<std::string>{"R1", "S(a=1)", "S(b=1)", "S(c=1)"}));
    recording.appendFrame(S("a", 2));  // five frames, trimmed: the older "a" goes
    EXPECT_EQ(describe(recording.frames()), (std::vector<std::string>{"R1", "S(b=1)", "S(c=1)", "S(a=2)"}));
}

TEST_F(PipelineRecordingWithPipelineTest, RecordingWhilePlayingEndsThePlayback) {
    recording.appendFrame(R(1));
    recording.appendFrame(R(2));
    recording.playReset();
    ASSERT_TRUE(recording.playCanContinue());
    const uint8_t report[] = {0x03};
    recording.handleInputReport(report, 1);
    EXPECT_FALSE(recording.playCanContinue());
    recording.playReset();
    EXPECT_TRUE(recording.playCanContinue());
}

TEST_F(PipelineRecordingWithPipelineTest, CopySharesThePipelineAndValuesAndDuplicatesTheFrames) {
    recording.setMaxFrameCount(5);
    recording.setState("a", PropertyValue(PropertyValue::Array{PropertyValue(1)}));
    PipelineRecording copy(recording);
    EXPECT_EQ(copy.pipeline, recording.pipeline);
    EXPECT_EQ(copy.maxFrameCount(), 5u);
    ASSERT_EQ(copy.frames().size(), 1u);
    EXPECT_EQ(copy.frames().front().value->array(), recording.frames().front().value->array());
    const uint8_t report[] = {0x07};
    copy.handleInputReport(report, 1);
    EXPECT_EQ(copy.frames().size(), 2u);
    EXPECT_EQ(recording.frames().size(), 1u);
}

TEST_F(PipelineRecordingWithPipelineTest, CopyAssignmentReplacesFramesBoundAndPipeline) {
    PipelineRecording other;
    other.appendFrame(R(1));
    other.appendFrame(R(2));
    other = recording;
    EXPECT_TRUE(other.frames().empty());
    EXPECT_EQ(other.pipeline, recording.pipeline);
    recording.appendFrame(R(3));
    other = recording;
    EXPECT_EQ(describe(other.frames()), (std::vector<std::string>{"R3"}));
}

TEST_F(PipelineRecordingWithPipelineTest, CopyMadeDuringPlaybackContinuesAtTheSameFrameOfItsOwnList) {
    recording.appendFrame(R(1));
    recording.appendFrame(R(2));
    recording.appendFrame(R(3));
    recording.playReset();
    recording.playNextFrame(1.0f);
    PipelineRecording copy(recording);
    recording.playNextFrame(1.0f);
    recording.playNextFrame(1.0f);
    EXPECT_FALSE(recording.playCanContinue());
    fake->calls.clear();
    ASSERT_TRUE(copy.playCanContinue());
    copy.playNextFrame(1.0f);
    copy.playNextFrame(1.0f);
    EXPECT_FALSE(copy.playCanContinue());
    EXPECT_EQ(fake->calls, (std::vector<std::string>{"setTime 0", "handleInputReport 02 ", "setTime 0",
                                                     "handleInputReport 03 "}));
}

TEST_F(PipelineRecordingWithPipelineTest, CopyOfAFinishedPlaybackIsFinishedToo) {
    recording.appendFrame(R(1));
    recording.playReset();
    recording.playNextFrame(1.0f);
    PipelineRecording copy(recording);
    EXPECT_FALSE(copy.playCanContinue());
    EXPECT_THROW(copy.playNextFrame(1.0f), std::runtime_error);
}

TEST_F(PipelineRecordingWithPipelineTest, MovedRecordingKeepsItsFramesAndPlaybackPosition) {
    recording.appendFrame(R(1));
    recording.appendFrame(R(2));
    recording.playReset();
    recording.playNextFrame(1.0f);
    PipelineRecording moved(std::move(recording));
    EXPECT_EQ(moved.frames().size(), 2u);
    ASSERT_TRUE(moved.playCanContinue());
    moved.playNextFrame(1.0f);
    EXPECT_FALSE(moved.playCanContinue());
    PipelineRecording assigned;
    assigned = std::move(moved);
    EXPECT_EQ(assigned.frames().size(), 2u);
    EXPECT_FALSE(assigned.playCanContinue());
}

TEST_F(PipelineRecordingWithPipelineTest, TrimmingTheFrameUnderThePlaybackCursorMovesItToTheNextSurvivor) {
    for (Frame frame : {S("a", 1), R(1), S("a", 2), R(2), R(3)}) recording.appendFrame(std::move(frame));
    recording.playReset();
    recording.playNextFrame(1.0f);  // S(a=1); the cursor is on R1
    recording.setMaxFrameCount(1);  // R1 and R2 go
    EXPECT_EQ(describe(recording.frames()), (std::vector<std::string>{"S(a=2)", "R3"}));
    ASSERT_TRUE(recording.playCanContinue());
    fake->calls.clear();
    recording.playNextFrame(1.0f);
    EXPECT_EQ(fake->calls.back(), "setState a 2");
}

}  // namespace
}  // namespace TolkaTouch

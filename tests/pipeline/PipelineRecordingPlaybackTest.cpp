#include "pipeline/PipelineRecording.h"

#include <gtest/gtest.h>

#include <cmath>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "common/Util.h"
#include "tests/pipeline/FakePipelineInput.h"

namespace TolkaTouch {
namespace {

using Frame = PipelineRecording::Frame;
using Testing::FakeClock;
using Testing::FakePipelineInput;

// 125/3 ns per tick: 8 000 000 ns are 192 000 ticks. Installed before any conversion runs.
const bool timebaseInstalled = (Host::setTimebase(Timebase{125, 3}), true);

struct PipelineRecordingPlaybackTest : ::testing::Test {
    PipelineRecordingPlaybackTest() {
        EXPECT_TRUE(timebaseInstalled);
        recording.pipeline = fake;
        recording.clock = clock.hostClock();
        clock.ticks = 5000;
    }

    void addReport(uint64_t timestamp, uint8_t tag) { recording.appendFrame(Frame::inputReport(timestamp, {tag})); }
    void addState(uint64_t timestamp, const std::string& key, int value) {
        recording.appendFrame(Frame::state(timestamp, key, PropertyValue(value)));
    }
    void playAll(float speed) {
        recording.playReset();
        while (recording.playCanContinue()) recording.playNextFrame(speed);
    }
    std::vector<uint64_t> sleepsAt(float speed) {
        clock.sleeps.clear();
        playAll(speed);
        return clock.sleeps;
    }

    FakeClock clock;
    std::shared_ptr<FakePipelineInput> fake = std::make_shared<FakePipelineInput>();
    PipelineRecording recording;
};

void expectPlaybackFinished(PipelineRecording& recording, float speed = 1.0f) {
    try {
        recording.playNextFrame(speed);
        FAIL() << "no error";
    } catch (const std::exception& error) {
        EXPECT_EQ(typeid(error), typeid(std::runtime_error));
        EXPECT_STREQ(error.what(), "playback finished");
    }
}

TEST_F(PipelineRecordingPlaybackTest, EmptyRecordingCannotContinueAfterResetAndNextFrameRaisesPlaybackFinished) {
    recording.playReset();
    EXPECT_FALSE(recording.playCanContinue());
    expectPlaybackFinished(recording);
    EXPECT_TRUE(fake->calls.empty());
}

TEST_F(PipelineRecordingPlaybackTest, PlaybackThatWasNeverStartedRaisesPlaybackFinished) {
    addReport(0, 1);
    EXPECT_FALSE(recording.playCanContinue());
    expectPlaybackFinished(recording);
    EXPECT_TRUE(fake->calls.empty());
    recording.playReset();
    EXPECT_TRUE(recording.playCanContinue());  // the failed call did not move the cursor
}

TEST_F(PipelineRecordingPlaybackTest, NextFrameAfterTheEndRaisesPlaybackFinished) {
    addReport(0, 1);
    playAll(1.0f);
    EXPECT_FALSE(recording.playCanContinue());
    expectPlaybackFinished(recording);
}

TEST_F(PipelineRecordingPlaybackTest, ReportsEightMillisecondsApartSleep8000MicrosecondsAtSpeedOne) {
    addReport(0, 1);
    addReport(8000000, 2);
    addReport(16000000, 3);
    EXPECT_EQ(sleepsAt(1.0f), (std::vector<uint64_t>{8000, 8000}));
}

TEST_F(PipelineRecordingPlaybackTest, ReportsEightMillisecondsApartSleep4000MicrosecondsAtSpeedTwo) {
    addReport(0, 1);
    addReport(8000000, 2);
    addReport(16000000, 3);
    EXPECT_EQ(sleepsAt(2.0f), (std::vector<uint64_t>{4000, 4000}));
}

TEST_F(PipelineRecordingPlaybackTest, SpeedZeroPlaysAtSpeedOne) {
    addReport(0, 1);
    addReport(8000000, 2);
    addReport(16000000, 3);
    EXPECT_EQ(sleepsAt(0.0f), (std::vector<uint64_t>{8000, 8000}));
}

TEST_F(PipelineRecordingPlaybackTest, NegativeSpeedPlaysAtSpeedOne) {
    addReport(0, 1);
    addReport(8000000, 2);
    addReport(16000000, 3);
    EXPECT_EQ(sleepsAt(-1.0f), (std::vector<uint64_t>{8000, 8000}));
}

TEST_F(PipelineRecordingPlaybackTest, SpeedThatIsNotANumberPlaysAtSpeedOne) {
    addReport(0, 1);
    addReport(8000000, 2);
    EXPECT_EQ(sleepsAt(std::nanf("")), (std::vector<uint64_t>{8000}));
}

TEST_F(PipelineRecordingPlaybackTest, NoSleepBeforeTheFirstReport) {
    addReport(50000000, 1);
    EXPECT_TRUE(sleepsAt(1.0f).empty());
}

TEST_F(PipelineRecordingPlaybackTest, PacingIsComputedInSinglePrecisionAndTruncated) {
    addReport(0, 1);
    addReport(999999999, 2);                // a float holds 1e9: 1000000 µs, not 999999
    addReport(999999999 + 8000000, 3);      // 8000000 / 3 / 1000 = 2666.666 -> 2666
    addReport(999999999 + 8000000 + 16777217000ull, 4);  // 16777217024 in float; / 1000 rounds to 16777218
    EXPECT_EQ(sleepsAt(1.0f), (std::vector<uint64_t>{1000000, 8000, 16777218}));
    EXPECT_EQ(sleepsAt(3.0f), (std::vector<uint64_t>{333333, 2666, 5592405}));
}

TEST_F(PipelineRecordingPlaybackTest, PausesLongerThanASecondAreSleptWhole) {
    addReport(0, 1);
    addReport(5000000000ull, 2);
    EXPECT_EQ(sleepsAt(1.0f), (std::vector<uint64_t>{5000000}));
}

TEST_F(PipelineRecordingPlaybackTest, StateFrameIsDeliveredRightAfterTheReportBeforeItAndDoesNotMovePacing) {
    addReport(0, 1);
    addState(4000000, "Algs.HoldTimeoutMilliseconds", 400);
    addReport(8000000, 2);
    recording.playReset();
    recording.playNextFrame(1.0f);
    recording.playNextFrame(1.0f);
    EXPECT_TRUE(clock.sleeps.empty());
    EXPECT_EQ(fake->calls.back(), "setState Algs.HoldTimeoutMilliseconds 400");
    recording.playNextFrame(1.0f);
    EXPECT_EQ(clock.sleeps, (std::vector<uint64_t>{8000}));
}

TEST_F(PipelineRecordingPlaybackTest, FramesAreDeliveredInOrderEachAfterItsReplayClock) {
    addReport(1000000, 1);
    addState(5000000, "Algs.HoldTimeoutMilliseconds", 400);
    addReport(9000000, 2);
    playAll(1.0f);
    // 4 000 000 ns are 96 000 ticks, 8 000 000 ns 192 000 ticks.
    EXPECT_EQ(fake->calls, (std::vector<std::string>{"setTime 5000", "handleInputReport 01 ", "setTime 101000",
                                                     "setState Algs.HoldTimeoutMilliseconds 400", "setTime 197000",
                                                     "handleInputReport 02 "}));
}

TEST_F(PipelineRecordingPlaybackTest, ReplayClockStartsAtTheResetOriginAndFollowsTheRecordingAtEverySpeed) {
    addReport(0, 1);
    addReport(8000000, 2);
    addReport(16000000, 3);
    for (float speed : {1.0f, 2.0f, 0.5f, 0.0f, -1.0f, 10.0f}) {
        fake->calls.clear();
        clock.ticks = 7000;
        playAll(speed);
        EXPECT_EQ(fake->calls[0], "setTime 7000") << speed;
        EXPECT_EQ(fake->calls[2], "setTime " + std::to_string(7000 + Util::machTimeFromNanoseconds(8000000))) << speed;
        EXPECT_EQ(fake->calls[2], "setTime 199000") << speed;
        EXPECT_EQ(fake->calls[4], "setTime 391000") << speed;
    }
}

TEST_F(PipelineRecordingPlaybackTest, ReplayClockIsMeasuredFromTheFirstFrameEvenWhenItIsAStateFrame) {
    addState(2000000, "k", 1);
    addReport(10000000, 1);
    playAll(1.0f);
    EXPECT_EQ(fake->calls[0], "setTime 5000");
    EXPECT_EQ(fake->calls[2], "setTime 197000");
    EXPECT_TRUE(clock.sleeps.empty());
}

TEST_F(PipelineRecordingPlaybackTest, FrameOlderThanTheFirstGivesAWrappedReplayClock) {
    addReport(1000, 1);
    addReport(0, 2);
    playAll(1.0f);
    EXPECT_EQ(fake->calls[2], "setTime " + std::to_string(5000 + Util::machTimeFromNanoseconds(uint64_t{0} - 1000)));
}

TEST_F(PipelineRecordingPlaybackTest, FramesPlayedFromElsewhereGiveTheCallsAndSleepsOfTheSameFramesInTheList) {
    const std::vector<Frame> frames{Frame::inputReport(1000000, {1}),
                                    Frame::state(5000000, "Algs.HoldTimeoutMilliseconds", PropertyValue(400)),
                                    Frame::inputReport(9000000, {2}), Frame::inputReport(4000000, {3})};
    for (const Frame& frame : frames) recording.appendFrame(frame);
    playAll(1.0f);
    const std::vector<std::string> listCalls = fake->calls;
    const std::vector<uint64_t> listSleeps = clock.sleeps;

    PipelineRecording streamed;
    streamed.pipeline = fake;
    streamed.clock = clock.hostClock();
    fake->calls.clear();
    clock.sleeps.clear();
    streamed.playReset();
    for (const Frame& frame : frames) streamed.playFrame(frame, 1.0f);
    EXPECT_EQ(fake->calls, listCalls);
    EXPECT_EQ(clock.sleeps, listSleeps);
    EXPECT_EQ(listSleeps, (std::vector<uint64_t>{8000}));
    EXPECT_TRUE(streamed.frames().empty());
}

TEST_F(PipelineRecordingPlaybackTest, TheFirstFramePlayedFromElsewhereAfterAResetIsTheReplayClocksOrigin) {
    recording.playReset();
    recording.playFrame(Frame::inputReport(3000000, {1}), 2.0f);
    recording.playFrame(Frame::inputReport(11000000, {2}), 2.0f);
    clock.ticks = 9000;
    recording.playReset();
    recording.playFrame(Frame::inputReport(50000000, {3}), 2.0f);
    EXPECT_EQ(fake->calls, (std::vector<std::string>{"setTime 5000", "handleInputReport 01 ", "setTime 197000",
                                                     "handleInputReport 02 ", "setTime 9000", "handleInputReport 03 "}));
    EXPECT_EQ(clock.sleeps, (std::vector<uint64_t>{4000}));
}

TEST_F(PipelineRecordingPlaybackTest, ReportsWithEqualOrDecreasingTimestampsAreDeliveredWithoutDelay) {
    addReport(8000000, 1);
    addReport(8000000, 2);
    addReport(4000000, 3);
    addReport(6000000, 4);
    EXPECT_EQ(sleepsAt(1.0f), (std::vector<uint64_t>{2000}));  // only the last one follows a rise
}

TEST_F(PipelineRecordingPlaybackTest, RecordingDuringPlaybackStopsItAndResetStartsOver) {
    addReport(0, 1);
    addReport(1000, 2);
    recording.playReset();
    recording.playNextFrame(1.0f);
    const uint8_t report[] = {0x09};
    recording.handleInputReport(report, 1);
    EXPECT_FALSE(recording.playCanContinue());
    expectPlaybackFinished(recording);
    fake->calls.clear();
    recording.playReset();
    recording.playNextFrame(1.0f);
    EXPECT_EQ(fake->calls.back(), "handleInputReport 01 ");
}

TEST_F(PipelineRecordingPlaybackTest, ResetDuringPlaybackRestartsWithANewOriginAndNoLastReport) {
    addReport(0, 1);
    addReport(8000000, 2);
    recording.playReset();
    recording.playNextFrame(1.0f);
    clock.ticks = 9000;
    recording.playReset();
    fake->calls.clear();
    recording.playNextFrame(1.0f);
    EXPECT_TRUE(clock.sleeps.empty());
    EXPECT_EQ(fake->calls.front(), "setTime 9000");
}

TEST_F(PipelineRecordingPlaybackTest, WithoutAPipelineFramesAreConsumedAndStillPaced) {
    recording.pipeline.reset();
    addReport(0, 1);
    addReport(8000000, 2);
    EXPECT_EQ(sleepsAt(1.0f), (std::vector<uint64_t>{8000}));
    EXPECT_FALSE(recording.playCanContinue());
}

TEST_F(PipelineRecordingPlaybackTest, PipelineErrorPropagatesAndTheCursorHasMovedOn) {
    addState(0, "bad", 1);
    addReport(1000, 1);
    fake->onSetState = [](const std::string& key) {
        if (key == "bad") throw std::logic_error("refused");
    };
    recording.playReset();
    EXPECT_THROW(recording.playNextFrame(1.0f), std::logic_error);
    ASSERT_TRUE(recording.playCanContinue());
    recording.playNextFrame(1.0f);
    EXPECT_EQ(fake->calls.back(), "handleInputReport 01 ");
}

TEST_F(PipelineRecordingPlaybackTest, StateFrameWithoutValueIsReplayedAsNull) {
    recording.appendFrame(Frame::state(0, "Algs.ResetEventStats", std::nullopt));
    playAll(1.0f);
    EXPECT_EQ(fake->calls.back(), "setState Algs.ResetEventStats null");
}

TEST_F(PipelineRecordingPlaybackTest, FrameOfAnyOtherTypeGetsTheClockAndNothingElse) {
    Frame other = Frame::inputReport(0, {0x01});
    other.type = static_cast<PipelineRecording::FrameType>(3);
    recording.appendFrame(other);
    playAll(1.0f);
    EXPECT_EQ(fake->calls, (std::vector<std::string>{"setTime 5000"}));
}

TEST_F(PipelineRecordingPlaybackTest, DocumentReadBackPlaysTheSameCallsAsTheRecording) {
    addReport(0, 1);
    addState(3000000, "Algs.ActivationThreshold", 150);
    addReport(8000000, 2);
    playAll(2.0f);
    const std::vector<std::string> original = fake->calls;
    const std::vector<uint64_t> originalSleeps = clock.sleeps;

    const std::vector<uint8_t> document = recording.json();
    PipelineRecording read(&document);
    read.pipeline = fake;
    read.clock = clock.hostClock();
    fake->calls.clear();
    clock.sleeps.clear();
    read.playReset();
    while (read.playCanContinue()) read.playNextFrame(2.0f);
    EXPECT_EQ(fake->calls, original);
    EXPECT_EQ(clock.sleeps, originalSleeps);
}

}  // namespace
}  // namespace TolkaTouch

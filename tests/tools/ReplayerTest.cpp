#include "tools/Replayer.h"

#include <gtest/gtest.h>

#include <list>
#include <memory>
#include <string>
#include <vector>

#include "tolkatouch/Gesture.h"
#include "tools/EventPrinter.h"
#include "tools/GestureScript.h"
#include "tools/Synthesizer.h"

namespace TolkaTouch::Tools {
namespace {

ReplayOptions pacedAt(float speed, bool fast) {
    ReplayOptions options;
    options.speed = speed;
    options.fast = fast;
    return options;
}

PipelineRecording tapRecording() {
    return recordingFromSynthesis(synthesize(GestureScript::parse("wait 200ms\ntap volume-down 120ms\nwait 300ms\n"), 1));
}

TEST(ReplayerTest, EventsCarryTheRecordedHostClockTimes) {
    PipelineRecording recording = tapRecording();
    const uint64_t first = recording.frames().front().timestamp;
    Replayer replayer(std::move(recording));
    std::vector<std::string> lines;
    replayer.run(pacedAt(1.0f, true), [&](const HIDEvent& event) {
        EXPECT_GE(event.timestamp, kSynthesisStartNs);
        lines.push_back(eventHumanLine(event, replayer.secondsSinceStart(event)));
    });
    EXPECT_EQ(replayer.origin(), first);
    ASSERT_EQ(lines.size(), 2u);
    EXPECT_NE(lines[0].find("may-begin   region 2  volume down"), std::string::npos) << lines[0];
    EXPECT_NE(lines[1].find("tap         region 2  volume down"), std::string::npos) << lines[1];
}

// A source handing out the recording's frames one at a time, counting how many it gave.
Replayer::FrameSource sourceOf(const PipelineRecording& recording, int& handedOut) {
    auto next = std::make_shared<std::list<PipelineRecording::Frame>::const_iterator>(recording.frames().begin());
    return [&recording, &handedOut, next](PipelineRecording::Frame& frame) {
        if (*next == recording.frames().end()) return false;
        frame = **next;
        ++*next;
        ++handedOut;
        return true;
    };
}

TEST(ReplayerTest, AFrameSourcePlaysTheEventsAndTimesOfTheWholeRecording) {
    const PipelineRecording recording = tapRecording();
    std::vector<std::string> whole;
    Replayer held{PipelineRecording(recording)};
    held.run(pacedAt(1.0f, true), [&](const HIDEvent& event) {
        whole.push_back(GestureCodec::jsonLine(event) + " " + std::to_string(held.secondsSinceStart(event)));
    });

    int handedOut = 0;
    Replayer streamed(sourceOf(recording, handedOut));
    EXPECT_EQ(handedOut, 1);  // the first frame, for the replay clock
    EXPECT_EQ(streamed.origin(), held.origin());
    std::vector<std::string> lines;
    streamed.run(pacedAt(1.0f, true), [&](const HIDEvent& event) {
        lines.push_back(GestureCodec::jsonLine(event) + " " + std::to_string(streamed.secondsSinceStart(event)));
    });
    EXPECT_EQ(handedOut, static_cast<int>(recording.frames().size()));
    ASSERT_EQ(whole.size(), 2u);
    EXPECT_EQ(lines, whole);
}

TEST(ReplayerTest, AnEmptyFrameSourcePlaysNothing) {
    Replayer replayer(Replayer::FrameSource([](PipelineRecording::Frame&) { return false; }));
    int events = 0;
    replayer.run(ReplayOptions{}, [&](const HIDEvent&) { ++events; });
    EXPECT_EQ(events, 0);
    EXPECT_EQ(replayer.origin(), 0u);
}

TEST(ReplayerTest, SettingsApplyBeforeTheFirstFrame) {
    Replayer replayer(tapRecording());
    std::vector<std::string> kinds;
    ReplayOptions options;
    options.fast = true;
    options.settings = {{"Algs.ActivationThreshold", PropertyValue(5000.0)}};
    replayer.run(options, [&](const HIDEvent& event) { kinds.emplace_back(GestureCodec::kindName(event)); });
    EXPECT_TRUE(kinds.empty());
    EXPECT_EQ(replayer.pipeline().getState("Algs.ActivationThreshold"), PropertyValue(5000.0f));
}

TEST(ReplayerTest, PacedReplaySleepsTheRecordedGapsDividedByTheSpeed) {
    // Without --fast the host clock's sleep paces the frames; at a high speed that stays short
    // while every frame still arrives.
    Replayer replayer(tapRecording());
    int events = 0;
    replayer.run(pacedAt(100.0f, false), [&](const HIDEvent&) { ++events; });
    EXPECT_EQ(events, 2);
}

// Two empty image reports `gapNs` apart.
PipelineRecording twoReportsApart(const std::string& gapNs) {
    const std::string text = R"({"Version": 1, "Frames": [
        {"Type": "InputReport", "Timestamp": 0, "Report": "02 00 "},
        {"Type": "InputReport", "Timestamp": )" + gapNs + R"(, "Report": "02 00 "}]})";
    const std::vector<uint8_t> document(text.begin(), text.end());
    return PipelineRecording(&document);
}

// The pauses a paced replay of `recording` asks for, and those it had to cut.
struct Pauses {
    std::vector<uint64_t> slept;
    std::vector<uint64_t> cut;
};

Pauses pausesOf(PipelineRecording recording, float speed) {
    Replayer replayer(std::move(recording));
    Pauses pauses;
    ReplayOptions options;
    options.speed = speed;
    options.sleep = [&](uint64_t microseconds) { pauses.slept.push_back(microseconds); };
    options.onPauseCut = [&](uint64_t microseconds) { pauses.cut.push_back(microseconds); };
    replayer.run(options, [](const HIDEvent&) {});
    return pauses;
}

TEST(ReplayerTest, APauseLongerThanTenSecondsIsCutAndReported) {
    // 2^64 - 1 ns apart, as a broken time stamp gives: the replay must still end.
    const Pauses pauses = pausesOf(twoReportsApart("18446744073709551615"), 1.0f);
    EXPECT_EQ(pauses.slept, (std::vector<uint64_t>{kMaxReplayPauseMicroseconds}));
    // The gap in single precision, in microseconds.
    EXPECT_EQ(pauses.cut, (std::vector<uint64_t>{18446744949882880u}));
}

TEST(ReplayerTest, APauseOfTenSecondsOrLessIsKept) {
    const Pauses pauses = pausesOf(twoReportsApart("8000000"), 2.0f);
    EXPECT_EQ(pauses.slept, (std::vector<uint64_t>{4000}));
    EXPECT_TRUE(pauses.cut.empty());
}

TEST(ReplayerTest, EmptyRecordingPlaysNothing) {
    Replayer replayer{PipelineRecording()};
    int events = 0;
    replayer.run(ReplayOptions{}, [&](const HIDEvent&) { ++events; });
    EXPECT_EQ(events, 0);
    EXPECT_EQ(replayer.origin(), 0u);
}

}  // namespace
}  // namespace TolkaTouch::Tools

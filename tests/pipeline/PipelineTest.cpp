#include "pipeline/Pipeline.h"

#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "pipeline/PipelineRecording.h"
#include "common/Util.h"
#include "tests/pipeline/FakePipelineInput.h"
#include "tolkatouch/Gesture.h"

namespace TolkaTouch {
namespace {

std::vector<uint8_t> imageReport(uint32_t frameNumber, uint32_t timeMs = 0, int16_t reading = 0) {
    std::vector<uint8_t> bytes(InputReport::Image::kReportLength, 0);
    bytes[0] = InputReport::kImageReportID;
    std::memcpy(&bytes[1], &frameNumber, 4);
    std::memcpy(&bytes[5], &timeMs, 4);
    for (size_t i = 0; i < kPixelCount; ++i) {
        std::memcpy(&bytes[13 + 2 * i], &reading, 2);
        std::memcpy(&bytes[43 + 2 * i], &reading, 2);
    }
    return bytes;
}

std::vector<uint8_t> firmwareEventReport(uint8_t event) {
    return {InputReport::kFirmwareEventReportID, event, 0, 0, 0, 0, 0, 0, 0, 1};
}

// A pipeline with all nine probes installed, each writing one line per call.
struct PipelineTest : ::testing::Test {
    PipelineTest() {
        pipeline.setTimeProbe = [this](uint64_t time) {
            calls.push_back("setTime " + std::to_string(time) + " was " + std::to_string(pipeline.currentTime));
        };
        pipeline.setStateProbe = [this](const std::string& key, const PropertyValue& value) {
            calls.push_back("setState " + key + " " + value.description());
        };
        pipeline.inputReportProbe = [this](const uint8_t*, size_t length) {
            calls.push_back("inputReport " + std::to_string(length));
        };
        pipeline.invalidInputReportProbe = [this](const uint8_t*, size_t length) {
            calls.push_back("invalidInputReport " + std::to_string(length));
        };
        pipeline.firmwareEventProbe = [this](const InputReport::FirmwareEvent& event) {
            calls.push_back("firmwareEvent " + std::to_string(event.event));
        };
        pipeline.imageProbe = [this](const InputReport::Image& image) {
            calls.push_back("image " + std::to_string(image.frameNumber));
        };
        pipeline.disjointImageProbe = [this](uint32_t previous, const InputReport::Image& image) {
            calls.push_back("disjointImage " + std::to_string(previous) + " " + std::to_string(image.frameNumber));
        };
        pipeline.hidEventsProbe = [this](const EventList& events) {
            calls.push_back("hidEvents " + std::to_string(events.size()));
            lists.push_back(events);
        };
        pipeline.getStateProbe = [this](const std::string& key) { calls.push_back("getState " + key); };
    }

    void send(const std::vector<uint8_t>& report) { pipeline.handleInputReport(report.data(), report.size()); }

    Pipeline pipeline;
    std::vector<std::string> calls;
    std::vector<EventList> lists;
};

TEST(PipelineStartTest, FreshPipelineHasZeroCountersNoFrameAndTimeZero) {
    Pipeline pipeline;
    EXPECT_EQ(pipeline.currentTime, 0u);
    EXPECT_EQ(pipeline.lastFrameNumber, 0u);
    EXPECT_FALSE(pipeline.hasLastFrame);
    EXPECT_EQ(pipeline.resetCount, 0u);
    EXPECT_EQ(pipeline.disjointImageCount, 0u);
}

TEST(PipelineStartTest, EveryProbeMayStayEmpty) {
    Pipeline pipeline;
    pipeline.setTime(1);
    pipeline.setState("Algs.HoldTimeoutMilliseconds", PropertyValue(400u));
    const auto image = imageReport(1);
    pipeline.handleInputReport(image.data(), image.size());
    const auto reset = firmwareEventReport(0);
    pipeline.handleInputReport(reset.data(), reset.size());
    const uint8_t invalid[] = {9};
    pipeline.handleInputReport(invalid, 1);
    EXPECT_EQ(pipeline.getState("Unknown"), PropertyValue());
    EXPECT_EQ(pipeline.resetCount, 1u);
}

TEST_F(PipelineTest, SetTimeTellsItsProbeBeforeStoringTheTime) {
    pipeline.setTime(100);
    pipeline.setTime(250);
    EXPECT_EQ(calls, (std::vector<std::string>{"setTime 100 was 0", "setTime 250 was 100"}));
    EXPECT_EQ(pipeline.currentTime, 250u);
}

TEST_F(PipelineTest, FirmwareEventWithCode3ReachesOnlyTheInputReportAndFirmwareEventProbes) {
    send(firmwareEventReport(3));
    EXPECT_EQ(calls, (std::vector<std::string>{"inputReport 10", "firmwareEvent 3"}));
    EXPECT_EQ(pipeline.resetCount, 0u);
    EXPECT_EQ(pipeline.disjointImageCount, 0u);
    EXPECT_FALSE(pipeline.hasLastFrame);
}

TEST_F(PipelineTest, FirmwareResetWhileIdleYieldsOnlyTheVendorEventStampedWithTheCurrentTime) {
    pipeline.setTime(777);
    calls.clear();
    send(firmwareEventReport(0));
    EXPECT_EQ(calls, (std::vector<std::string>{"inputReport 10", "firmwareEvent 0", "hidEvents 1"}));
    ASSERT_EQ(lists.size(), 1u);
    const HIDEvent& event = *lists[0][0];
    EXPECT_EQ(event.type, HIDEventType::VendorDefined);
    EXPECT_EQ(event.usagePage, 0xFF60u);
    EXPECT_EQ(event.usage, 2u);
    EXPECT_EQ(event.version, 0u);
    EXPECT_TRUE(event.payload.empty());
    EXPECT_EQ(event.options, 0u);
    EXPECT_EQ(event.timestamp, 777u);
    EXPECT_EQ(pipeline.resetCount, 1u);
}

TEST_F(PipelineTest, FramesFiveSixEightCountOneDisjointImageReportedAsSixThenEight) {
    send(imageReport(5));
    send(imageReport(6));
    send(imageReport(8));
    EXPECT_EQ(pipeline.disjointImageCount, 1u);
    EXPECT_EQ(calls, (std::vector<std::string>{"inputReport 73", "image 5", "inputReport 73", "image 6",
                                               "inputReport 73", "image 8", "disjointImage 6 8"}));
    EXPECT_EQ(pipeline.lastFrameNumber, 8u);
    EXPECT_TRUE(pipeline.hasLastFrame);
}

TEST_F(PipelineTest, FirstFrameAfterStartUpIsNeverDisjoint) {
    send(imageReport(123456));
    EXPECT_EQ(pipeline.disjointImageCount, 0u);
    EXPECT_EQ(pipeline.lastFrameNumber, 123456u);
}

TEST_F(PipelineTest, FrameZeroFollowsFrameFFFFFFFF) {
    send(imageReport(0xFFFFFFFFu));
    send(imageReport(0));
    EXPECT_EQ(pipeline.disjointImageCount, 0u);
}

TEST_F(PipelineTest, RepeatedFrameNumberIsDisjoint) {
    send(imageReport(4));
    send(imageReport(4));
    EXPECT_EQ(pipeline.disjointImageCount, 1u);
    EXPECT_EQ(calls.back(), "disjointImage 4 4");
}

TEST_F(PipelineTest, FirmwareResetLeavesFrameContinuityAlone) {
    send(imageReport(5));
    send(firmwareEventReport(0));
    send(imageReport(6));
    EXPECT_EQ(pipeline.disjointImageCount, 0u);
    send(firmwareEventReport(0));
    send(imageReport(0));  // a firmware that restarts its numbering is counted once
    send(imageReport(1));
    EXPECT_EQ(pipeline.disjointImageCount, 1u);
    EXPECT_EQ(pipeline.resetCount, 2u);
}

TEST_F(PipelineTest, ReportOfIdOneAndLength50ReachesTheInvalidReportProbeAndChangesNothingElse) {
    std::vector<uint8_t> report = imageReport(9);
    report.resize(50);
    send(report);
    EXPECT_EQ(calls, (std::vector<std::string>{"inputReport 50", "invalidInputReport 50"}));
    EXPECT_FALSE(pipeline.hasLastFrame);
    EXPECT_EQ(pipeline.disjointImageCount, 0u);
    EXPECT_EQ(pipeline.resetCount, 0u);
}

TEST_F(PipelineTest, ReportOfAnUnknownIdAndAnEmptyReportAreInvalid) {
    const uint8_t unknown[80] = {7};
    pipeline.handleInputReport(unknown, sizeof unknown);
    pipeline.handleInputReport(nullptr, 0);
    EXPECT_EQ(calls, (std::vector<std::string>{"inputReport 80", "invalidInputReport 80", "inputReport 0",
                                               "invalidInputReport 0"}));
}

TEST_F(PipelineTest, ImageProbeReceivesTheParsedImage) {
    InputReport::Image seen{};
    pipeline.imageProbe = [&seen](const InputReport::Image& image) { seen = image; };
    send(imageReport(42, 1234, -7));
    EXPECT_EQ(seen.frameNumber, 42u);
    EXPECT_EQ(seen.timeMs, 1234u);
    EXPECT_EQ(seen.pixels[14], -7);
    EXPECT_EQ(seen.rawPixels[0], 65529u);
}

TEST_F(PipelineTest, DebugInfoHoldsExactlyThePipelinesTwoCountersAsUnsignedNumbers) {
    send(imageReport(1));
    send(imageReport(3));
    send(firmwareEventReport(0));
    const PropertyValue info = pipeline.getState("DebugInfo");
    const PropertyValue expected(PropertyValue::Dictionary{
        {"ResetCount", PropertyValue(1u)},
        {"DisjointImageCount", PropertyValue(1u)},
    });
    EXPECT_EQ(info, expected);
    EXPECT_EQ(info.find("ResetCount")->kind(), PropertyValue::Kind::Unsigned);
}

TEST_F(PipelineTest, AlgsDebugInfoIsTheRecognizersOwn) {
    EXPECT_EQ(pipeline.getState("Algs.DebugInfo"), pipeline.algs.getState("DebugInfo"));
    EXPECT_NE(pipeline.getState("Algs.DebugInfo").find("EventStats"), nullptr);
}

TEST_F(PipelineTest, AlgsKeysAreRoutedToTheRecognizerWithoutTheirDomain) {
    pipeline.setState("Algs.HoldTimeoutMilliseconds", PropertyValue(400u));
    EXPECT_EQ(pipeline.algs.getState("HoldTimeoutMilliseconds").toUInt64(), 400u);
    EXPECT_EQ(pipeline.getState("Algs.HoldTimeoutMilliseconds").toUInt64(), 400u);
    EXPECT_EQ(calls, (std::vector<std::string>{"setState Algs.HoldTimeoutMilliseconds 400",
                                               "getState Algs.HoldTimeoutMilliseconds"}));
}

TEST_F(PipelineTest, DomainWrittenInLowerCaseIsIgnoredOnWriteAndReadsAsNull) {
    pipeline.setState("algs.HoldTimeoutMilliseconds", PropertyValue(100u));
    EXPECT_EQ(pipeline.algs.getState("HoldTimeoutMilliseconds").toUInt64(), 500u);
    EXPECT_TRUE(pipeline.getState("algs.HoldTimeoutMilliseconds").isNull());
}

TEST_F(PipelineTest, UnknownKeysAreIgnoredOnWriteAndReadAsNullButReachTheProbes) {
    pipeline.setState("DebugInfo", PropertyValue(1));
    pipeline.setState("Pipeline.Other", PropertyValue(2));
    EXPECT_TRUE(pipeline.getState("Other").isNull());
    EXPECT_TRUE(pipeline.getState("debuginfo").isNull());
    EXPECT_TRUE(pipeline.getState("Algs").isNull());
    EXPECT_EQ(calls, (std::vector<std::string>{"setState DebugInfo 1", "setState Pipeline.Other 2", "getState Other",
                                               "getState debuginfo", "getState Algs"}));
}

TEST_F(PipelineTest, HandleHIDEventsStampsEveryEventEvenWithoutAListener) {
    pipeline.hidEventsProbe = nullptr;
    pipeline.setTime(55);
    EventList events{makeDigitizerEvent(0, HIDEventPhase::MayBegin, 1.0), GestureCodec::encode(GestureKind::Reset)};
    pipeline.handleHIDEvents(events);
    EXPECT_EQ(events[0]->timestamp, 55u);
    EXPECT_EQ(events[1]->timestamp, 55u);
}

TEST_F(PipelineTest, EmptyEventListIsNotHandedToTheProbe) {
    pipeline.handleHIDEvents(EventList{});
    EXPECT_TRUE(calls.empty());
}

TEST_F(PipelineTest, TouchEventsAreStampedWithTheTimeOfTheirReport) {
    uint32_t frame = 1;
    for (; frame < 40 && lists.empty(); ++frame) {
        pipeline.setTime(1000 + frame);
        send(imageReport(frame, frame * 8, 3000));
    }
    ASSERT_FALSE(lists.empty()) << "a strong touch produced no event";
    const HIDEvent& event = *lists[0][0];
    EXPECT_EQ(event.phase, HIDEventPhase::MayBegin);
    EXPECT_EQ(event.timestamp, 1000u + frame - 1);
    EXPECT_EQ(event.integerValue(kDigitizerFrameNumberField), frame - 1);
}

TEST_F(PipelineTest, FirmwareResetDuringATouchPutsTheVendorEventAfterTheRecognizersOwnAndStampsThemAll) {
    for (uint32_t frame = 1; frame < 40 && lists.empty(); ++frame) send(imageReport(frame, frame * 8, 3000));
    ASSERT_FALSE(lists.empty()) << "a strong touch produced no event";
    const size_t before = lists.size();
    pipeline.setTime(5555);
    send(firmwareEventReport(0));
    ASSERT_EQ(lists.size(), before + 1);
    const EventList& events = lists.back();
    ASSERT_GE(events.size(), 2u) << "the reset ended no touch";
    for (size_t i = 0; i + 1 < events.size(); ++i) EXPECT_EQ(events[i]->type, HIDEventType::Digitizer);
    EXPECT_EQ(events.back()->type, HIDEventType::VendorDefined);
    for (const HIDEventRef& event : events) EXPECT_EQ(event->timestamp, 5555u);
}

TEST_F(PipelineTest, ImageProbesComeInOrderBeforeTheEvents) {
    send(imageReport(1, 0, 0));
    ASSERT_TRUE(lists.empty());
    // Every second frame number: each image is disjoint.
    for (uint32_t frame = 1; frame < 40 && lists.empty(); ++frame) {
        calls.clear();
        send(imageReport(frame * 2 + 1, frame * 8, 3000));
    }
    ASSERT_FALSE(lists.empty());
    ASSERT_EQ(calls.size(), 4u);
    EXPECT_EQ(calls[0], "inputReport 73");
    EXPECT_EQ(calls[1].rfind("image ", 0), 0u);
    EXPECT_EQ(calls[2].rfind("disjointImage ", 0), 0u);
    EXPECT_EQ(calls[3], "hidEvents 1");
}

TEST(PipelineWithRecordingTest, RecordingForwardsItsClockReadingAndSettingsToThePipeline) {
    Testing::FakeClock clock;
    clock.ticks = 9000;
    auto pipeline = std::make_shared<Pipeline>();
    PipelineRecording recording;
    recording.pipeline = pipeline;
    recording.clock = clock.hostClock();
    recording.setState("Algs.HoldTimeoutMilliseconds", PropertyValue(300u));
    EXPECT_EQ(pipeline->currentTime, 9000u);
    EXPECT_EQ(pipeline->getState("Algs.HoldTimeoutMilliseconds").toUInt64(), 300u);
    clock.ticks = 9500;
    const auto report = imageReport(1);
    recording.handleInputReport(report.data(), report.size());
    EXPECT_EQ(pipeline->currentTime, 9500u);
    EXPECT_TRUE(pipeline->hasLastFrame);
    EXPECT_EQ(recording.frames().size(), 2u);
}

TEST(PipelineWithRecordingTest, PlaybackOfADocumentDrivesThePipeline) {
    Testing::FakeClock clock;
    PipelineRecording source;
    source.clock = clock.hostClock();
    source.setState("Algs.HoldTimeoutMilliseconds", PropertyValue(300u));
    for (uint32_t frame = 1; frame <= 3; ++frame) {
        clock.ticks += 8000000;
        const auto report = imageReport(frame == 3 ? 7 : frame);
        source.handleInputReport(report.data(), report.size());
    }
    const std::vector<uint8_t> document = source.json();

    PipelineRecording replay(&document);
    auto pipeline = std::make_shared<Pipeline>();
    replay.pipeline = pipeline;
    replay.clock = clock.hostClock();
    replay.playReset();
    while (replay.playCanContinue()) replay.playNextFrame(4.0f);
    EXPECT_EQ(pipeline->getState("Algs.HoldTimeoutMilliseconds").toUInt64(), 300u);
    EXPECT_EQ(pipeline->lastFrameNumber, 7u);
    EXPECT_EQ(pipeline->disjointImageCount, 1u);
    EXPECT_EQ(clock.sleeps, (std::vector<uint64_t>{2000, 2000}));
}

}  // namespace
}  // namespace TolkaTouch

#include "algs/Algs.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <memory>
#include <random>

#include "platform/Log.h"
#include "tests/algs/TouchScript.h"

namespace TolkaTouch {
namespace {

using Testing::cancel;
using Testing::EventRecord;
using Testing::holdChange;
using Testing::holdEnd;
using Testing::holdStart;
using Testing::mayBegin;
using Testing::tap;
using Testing::TouchScript;
using Events = std::vector<EventRecord>;

// Counters by name from "EventStats"; only the ones that are not 0.
std::map<std::string, uint64_t> nonZeroCounts(const Algs& algs) {
    std::map<std::string, uint64_t> counts;
    const PropertyValue stats = algs.getState("EventStats");
    for (const char* half : {"Dispatched", "Rejected"}) {
        for (const auto& [name, value] : *stats.find(half)->dictionary()) {
            if (*value.unsignedInteger() != 0) counts[name] = *value.unsignedInteger();
        }
    }
    return counts;
}

// Every test starts with the debug level off and lines kept in memory.
class AlgsTest : public ::testing::Test {
protected:
    void SetUp() override {
        SystemLog::setSink(sink);
        SystemLog::setDebugEnabled(false, "Algs");
    }
    void TearDown() override {
        SystemLog::setDebugEnabled(false, "Algs");
        SystemLog::setSink(nullptr);
    }

    std::shared_ptr<SystemLog::MemorySink> sink = std::make_shared<SystemLog::MemorySink>();
};

// --- Construction and events ---

TEST_F(AlgsTest, ConstructionBuildsFifteenPixelsWithTheFixedGains) {
    const Algs algs;
    const float gains[] = {1.9219f, 1.8833f, 1.9281f, 1.8837f, 1.9163f, 1.8105f, 1.0081f, 1.0f,
                           1.4851f, 1.5033f, 2.4154f, 1.5378f, 1.5431f, 1.04f,   1.0493f};
    ASSERT_EQ(algs.pixels.size(), 15u);
    for (size_t i = 0; i < 15; ++i) {
        EXPECT_EQ(algs.pixels.gain[i], gains[i]) << i;
        EXPECT_EQ(algs.pixels.index[i], static_cast<int>(i));
    }
    EXPECT_EQ(algs.lastEventPhase, 0);
    EXPECT_EQ(algs.log.subsystem(), "com.zantor.hid.TolkaTouch");
    EXPECT_EQ(algs.log.category(), "Algs");
}

TEST_F(AlgsTest, ConstructionBuildsOneVirtualPixelPerGroupIndexedByItsFirstLettersCharacterCode) {
    const Algs algs;
    ASSERT_EQ(algs.virtualPixels.size(), 23u);
    for (size_t i = 0; i < 23; ++i) {
        EXPECT_EQ(virtualPixelName(i), algs.virtualImage.groups[i]);
        EXPECT_EQ(algs.virtualPixels.gain[i], algs.virtualImage.normalizationFactors[i]);
        EXPECT_EQ(algs.virtualPixels.index[i], static_cast<int>(algs.virtualImage.groups[i][0]));
    }
    EXPECT_EQ(algs.virtualPixels.index[0], 65);
    EXPECT_EQ(algs.virtualPixels.index[22], 77);
}

TEST_F(AlgsTest, CreatedEventsCarryMaskPhaseAndRegion) {
    const auto check = [](const HIDEventRef& e, uint32_t mask, uint32_t phase, double y) {
        EXPECT_EQ(e->type, HIDEventType::Digitizer);
        EXPECT_EQ(e->eventMask, mask);
        EXPECT_EQ(e->phase, phase);
        EXPECT_EQ(e->y, y);
        EXPECT_EQ(e->x, 0.0);
        EXPECT_EQ(e->z, 0.0);
        EXPECT_EQ(e->transducerType, 2u);
        EXPECT_EQ(e->timestamp, 0u);
        EXPECT_FALSE(e->range);
        EXPECT_FALSE(e->touch);
    };
    check(Algs::createMayBeginEvent(PixelRegion::VolumeUp), 0, 128, 3.0);
    check(Algs::createHoldStartEvent(PixelRegion::PlayPause), 2, 1, 1.0);
    check(Algs::createHoldChangeEvent(PixelRegion::VolumeDown), 2, 2, 2.0);
    check(Algs::createHoldEndEvent(PixelRegion::VolumeUp), 2, 4, 3.0);
    check(Algs::createTapEvent(PixelRegion::VolumeDown), 0x20000, 0, 2.0);
    check(Algs::createCancelEvent(), 0, 8, 0.0);
}

TEST_F(AlgsTest, CreatedEventsLeaveEveryOtherFieldAtZero) {
    for (const HIDEventRef& e :
         {Algs::createMayBeginEvent(PixelRegion::VolumeUp), Algs::createHoldStartEvent(PixelRegion::PlayPause),
          Algs::createHoldChangeEvent(PixelRegion::VolumeDown), Algs::createHoldEndEvent(PixelRegion::VolumeUp),
          Algs::createTapEvent(PixelRegion::VolumeDown), Algs::createCancelEvent()}) {
        EXPECT_EQ(e->transducerIndex, 0u);
        EXPECT_EQ(e->identity, 0u);
        EXPECT_EQ(e->buttonMask, 0u);
        EXPECT_EQ(e->tipPressure, 0.0);
        EXPECT_EQ(e->barrelPressure, 0.0);
        EXPECT_EQ(e->options, 0u);
        EXPECT_EQ(e->integerValue(kDigitizerFrameNumberField), 0);
    }
}

TEST_F(AlgsTest, TapEventPhaseReadsBackAsZero) { EXPECT_EQ(Algs::createTapEvent(PixelRegion::PlayPause)->phase, 0u); }

TEST_F(AlgsTest, CancelEventHasYZeroWhateverTheRegion) { EXPECT_EQ(Algs::createCancelEvent()->y, 0.0); }

// --- Driver edge cases ---

TEST_F(AlgsTest, FirstTouchFrameProducesAMayBeginWithTheRegionPhaseAndFrameNumber) {
    Algs algs;
    TouchScript script(algs);
    script.touch("HI", 600, 1016, 1112);
    script.playUntil(1008);
    const EventList events = algs.handleImage(script.imageAt(1016));
    ASSERT_EQ(events.size(), 1u);
    EXPECT_EQ(events[0]->phase, 128u);
    EXPECT_EQ(events[0]->y, 3.0);
    EXPECT_EQ(events[0]->integerValue(kDigitizerFrameNumberField), script.frameAt(1016));
    EXPECT_EQ(algs.lastEventPhase, 128);
}

TEST_F(AlgsTest, AnnouncedTouchThatComesToNothingIsCancelledOnlyAfterTheMayBegin) {
    // A suppressed hold: announced, then neither a hold nor a tap.
    Algs algs;
    TouchScript script(algs);
    script.touch("C", 210, 1016, 1720);
    EXPECT_EQ(script.playUntil(1800), (Events{mayBegin(1, script.frameAt(1016)), cancel(script.frameAt(1720))}));
    EXPECT_EQ(algs.lastEventPhase, 8);
}

TEST_F(AlgsTest, TouchThatEndedWithATapOrAHoldEndProducesNothingMore) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 1112);  // tap
    script.touch("HI", 600, 2016, 2600);  // hold
    EXPECT_EQ(script.playUntil(1112), (Events{mayBegin(1, script.frameAt(1016)), tap(1, script.frameAt(1112))}));
    EXPECT_EQ(script.playUntil(2008), Events{});
    EXPECT_EQ(algs.lastEventPhase, 0);
    EXPECT_EQ(script.playUntil(2600), (Events{mayBegin(3, script.frameAt(2016)), holdStart(3, script.frameAt(2520)),
                                              holdEnd(3, script.frameAt(2600))}));
    EXPECT_EQ(script.playUntil(3000), Events{});
    EXPECT_EQ(algs.lastEventPhase, 4);
}

TEST_F(AlgsTest, HoldEndedByALongerTimeoutLeavesTheReleaseToTheTapRules) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 1800);
    EXPECT_EQ(script.playUntil(1600), (Events{mayBegin(1, script.frameAt(1016)), holdStart(1, script.frameAt(1520))}));
    // The finger stays, but the touch is no longer past the timeout.
    algs.setState("HoldTimeoutMilliseconds", PropertyValue(100000u));
    EXPECT_EQ(script.playUntil(1608), (Events{holdEnd(1, script.frameAt(1608))}));
    EXPECT_EQ(script.playUntil(1900), (Events{tap(1, script.frameAt(1800))}));
}

TEST_F(AlgsTest, HoldingInOneRegionEmitsNothingAndEachRegionChangeEmitsOneHoldChange) {
    Algs algs;
    TouchScript script(algs);
    script.touch("N", 600, 1016, 1600)
        .ramp("N", 600, 100, 1600, 1800)
        .ramp("H", 100, 600, 1600, 1800)
        .ramp("H", 600, 100, 1800, 2000)
        .ramp("N", 100, 600, 1800, 2000)
        .touch("N", 600, 2000, 2200);
    EXPECT_EQ(script.playUntil(2300), (Events{mayBegin(2, script.frameAt(1016)), holdStart(2, script.frameAt(1520)),
                                              holdChange(3, script.frameAt(1704)), holdChange(2, script.frameAt(2000)),
                                              holdEnd(2, script.frameAt(2200))}));
}

TEST_F(AlgsTest, FirmwareResetFrameDuringAHoldEndsItWithFrameNumberZero) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 3000);
    ASSERT_EQ(script.playUntil(1600).size(), 2u);
    ASSERT_TRUE(algs.handStats.holding());
    const EventList events = algs.handleReset();
    ASSERT_EQ(events.size(), 1u);
    EXPECT_EQ(Testing::recordOf(*events[0]), holdEnd(1, 0));
    EXPECT_FALSE(algs.handStats.holding());
    EXPECT_EQ(algs.handStats.touchEndTime, 0u);
}

TEST_F(AlgsTest, FirmwareResetFrameWhileIdleProducesNothing) {
    Algs algs;
    EXPECT_TRUE(algs.handleReset().empty());
}

TEST_F(AlgsTest, EventStatsAreUpdatedOnFramesThatEmitNothing) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 2000);
    script.playUntil(1520);
    ASSERT_EQ(nonZeroCounts(algs), (std::map<std::string, uint64_t>{{"numBeginHold", 1}, {"numKalioCall", 1}}));
    EXPECT_EQ(script.playUntil(1552), Events{});
    EXPECT_EQ(algs.eventStats.numIncrementHold, 4u);
    EXPECT_EQ(algs.eventStats.numKalioCallIncrement, 4u);
}

TEST_F(AlgsTest, ResetClearsThePerTouchStatisticsButNotTheHysteresisOrCounters) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 2000);
    script.playUntil(1100);
    algs.eventStats.numTaps = 7;
    algs.Reset();
    for (size_t i = 0; i < algs.pixels.size(); ++i) {
        const Pixel p = algs.pixels.pixel(i);
        EXPECT_FALSE(p.wasOn);
        EXPECT_FALSE(p.wasAboveNoise);
        EXPECT_EQ(p.maxNormalizedAboveNoise, 0.0f);
    }
    for (size_t i = 0; i < algs.virtualPixels.size(); ++i) EXPECT_FALSE(algs.virtualPixels.pixel(i).wasOn);
    EXPECT_TRUE(algs.pixels.pixel(2).isOn);
    EXPECT_EQ(algs.handStats.touchScore, 0.0f);
    EXPECT_EQ(algs.handStats.maxOnStrength, 0.0f);
    EXPECT_EQ(algs.eventStats.numTaps, 7u);
    EXPECT_EQ(algs.lastEventPhase, 128);
}

TEST_F(AlgsTest, GroupSumAboveThirtyTwoThousandSevenHundredSixtySevenWrapsToANegativeValue) {
    Algs algs;
    int16_t readings[15] = {};
    readings[2] = 12000;  // C: 23137
    readings[3] = 12000;  // D: 22604
    EventList out;
    algs.processTouchFrame(readings, 1, 8, out);
    ASSERT_EQ(algs.virtualImage.values[6], 23137 + 22604);  // CDE
    EXPECT_EQ(algs.virtualPixels.value[6],
              static_cast<int32_t>(0.6667f * static_cast<float>(static_cast<int16_t>(23137 + 22604))));
    EXPECT_LT(algs.virtualPixels.value[6], 0);
}

// --- Whole touches ---

struct RegionTap {
    const char* letters;
    int region;
    const char* button;
};

TEST_F(AlgsTest, TapInEachRegionGivesMayBeginThenTapWithTheRegionAndItsCounters) {
    for (const RegionTap& t : {RegionTap{"CD", 1, "numPlayPause"}, RegionTap{"MN", 2, "numVolumeDown"},
                               RegionTap{"HI", 3, "numVolumeUp"}}) {
        SCOPED_TRACE(t.letters);
        Algs algs;
        TouchScript script(algs);
        script.touch(t.letters, 600, 1016, 1112);
        EXPECT_EQ(script.playUntil(1200),
                  (Events{mayBegin(t.region, script.frameAt(1016)), tap(t.region, script.frameAt(1112))}));
        EXPECT_EQ(nonZeroCounts(algs), (std::map<std::string, uint64_t>{{"numTaps", 1}, {t.button, 1}}));
        EXPECT_EQ(algs.lastEventPhase, 0);
    }
}

TEST_F(AlgsTest, HoldInRegionOneForFiveFramesPastTheTimeoutGivesMayBeginHoldStartAndHoldEnd) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 1560);  // holding from 1520 (504 ms) for five frames
    EXPECT_EQ(script.playUntil(1600), (Events{mayBegin(1, script.frameAt(1016)), holdStart(1, script.frameAt(1520)),
                                              holdEnd(1, script.frameAt(1560))}));
    EXPECT_EQ(nonZeroCounts(algs), (std::map<std::string, uint64_t>{{"numBeginHold", 1},
                                                                    {"numKalioCall", 1},
                                                                    {"numIncrementHold", 4},
                                                                    {"numKalioCallIncrement", 4},
                                                                    {"numEndHold", 1}}));
}

TEST_F(AlgsTest, HoldSlidingFromRegionTwoToRegionThreeGivesExactlyOneHoldChange) {
    Algs algs;
    TouchScript script(algs);
    script.touch("N", 600, 1016, 1600)
        .ramp("N", 600, 100, 1600, 1800)
        .ramp("H", 100, 600, 1600, 1800)
        .touch("H", 600, 1800, 2000);
    EXPECT_EQ(script.playUntil(2100), (Events{mayBegin(2, script.frameAt(1016)), holdStart(2, script.frameAt(1520)),
                                              holdChange(3, script.frameAt(1704)), holdEnd(3, script.frameAt(2000))}));
    EXPECT_EQ(algs.eventStats.numVolumeDecrement + algs.eventStats.numVolumeIncrement,
              algs.eventStats.numBeginHold + algs.eventStats.numIncrementHold);
}

TEST_F(AlgsTest, LightBrushGivesMayBeginThenCancelAndCountsARejectedTap) {
    Algs algs;
    TouchScript script(algs);
    script.ramp("C", 80, 240, 1016, 1400);  // hovers above noise, is on only at the end
    EXPECT_EQ(script.playUntil(1500), (Events{mayBegin(1, script.frameAt(1312)), cancel(script.frameAt(1400))}));
    EXPECT_EQ(nonZeroCounts(algs), (std::map<std::string, uint64_t>{{"numRejectedTap", 1}, {"numRejectedPlayPause", 1}}));
}

TEST_F(AlgsTest, TouchStraddlingTheLastTapsRegionSoonAfterItStaysInThatRegion) {
    Algs algs;
    TouchScript script(algs);
    script.touch("HI", 600, 1016, 1112);                       // tap in region 3
    script.touch("F", 600, 1312, 1400).touch("J", 500, 1312, 1400);  // F (region 1) strongest, J (region 3) next
    EXPECT_EQ(script.playUntil(1500), (Events{mayBegin(3, script.frameAt(1016)), tap(3, script.frameAt(1112)),
                                              mayBegin(3, script.frameAt(1312)), tap(3, script.frameAt(1400))}));
}

TEST_F(AlgsTest, TouchStraddlingTheLastTapsRegionLongAfterItTakesItsStrongestPixelsRegion) {
    Algs algs;
    TouchScript script(algs);
    script.touch("HI", 600, 1016, 1112);
    script.touch("F", 600, 2512, 2600).touch("J", 500, 2512, 2600);
    EXPECT_EQ(script.playUntil(2700), (Events{mayBegin(3, script.frameAt(1016)), tap(3, script.frameAt(1112)),
                                              mayBegin(1, script.frameAt(2512)), tap(1, script.frameAt(2600))}));
}

TEST_F(AlgsTest, TouchCentredOnKWithAStrongMGoesToRegionTwo) {
    Algs algs;
    TouchScript script(algs);
    script.touch("K", 800, 1016, 1104).touch("M", 700, 1016, 1104);
    EXPECT_EQ(script.playUntil(1200), (Events{mayBegin(2, script.frameAt(1016)), tap(2, script.frameAt(1104))}));
}

TEST_F(AlgsTest, TouchCentredOnKWithAWeakerMStaysInRegionOne) {
    Algs algs;
    TouchScript script(algs);
    script.touch("K", 800, 1016, 1104).touch("M", 500, 1016, 1104);
    EXPECT_EQ(script.playUntil(1200), (Events{mayBegin(1, script.frameAt(1016)), tap(1, script.frameAt(1104))}));
}

TEST_F(AlgsTest, TouchCentredOnKWithAStrongIGoesToRegionThree) {
    Algs algs;
    TouchScript script(algs);
    script.touch("K", 800, 1016, 1104).touch("I", 700, 1016, 1104);
    EXPECT_EQ(script.playUntil(1200), (Events{mayBegin(3, script.frameAt(1016)), tap(3, script.frameAt(1104))}));
}

// --- Settings take effect from the next frame ---

TEST_F(AlgsTest, HoldTimeoutOfOneSecondTurnsASevenHundredMillisecondPressIntoATap) {
    Algs plain;
    TouchScript plainScript(plain);
    plainScript.touch("CD", 600, 1016, 1720);
    EXPECT_EQ(plainScript.playUntil(1800), (Events{mayBegin(1, plainScript.frameAt(1016)),
                                                   holdStart(1, plainScript.frameAt(1520)),
                                                   holdEnd(1, plainScript.frameAt(1720))}));

    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 1720);
    script.playUntil(1400);
    algs.setState("HoldTimeoutMilliseconds", PropertyValue(1000u));
    EXPECT_EQ(script.playUntil(1800), (Events{tap(1, script.frameAt(1720))}));
    EXPECT_EQ(algs.eventStats.numTaps, 1u);
}

TEST_F(AlgsTest, AHoldEndedByRaisingTheTimeoutIsFollowedByATapWhenTheFingerLifts) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 1904);
    EXPECT_EQ(script.playUntil(1600), (Events{mayBegin(1, script.frameAt(1016)), holdStart(1, script.frameAt(1520))}));
    algs.setState("HoldTimeoutMilliseconds", PropertyValue(2000u));
    // The finger stays: the hold ends at once, and the frame reads as a touch going on.
    EXPECT_EQ(script.playUntil(1608), (Events{holdEnd(1, script.frameAt(1608))}));
    EXPECT_EQ(algs.verdict().transition, Transition::HoldEnded);
    EXPECT_EQ(algs.snapshot().touching, true);
    // Lifted before the new timeout, the same touch also stands as a tap.
    EXPECT_EQ(script.playUntil(2000), (Events{tap(1, script.frameAt(1904))}));
}

TEST_F(AlgsTest, WithoutHoldSuppressionALowScoreTouchBecomesAHold) {
    Algs suppressed;
    TouchScript suppressedScript(suppressed);
    suppressedScript.touch("C", 210, 1016, 1720);
    EXPECT_EQ(suppressedScript.playUntil(1800),
              (Events{mayBegin(1, suppressedScript.frameAt(1016)), cancel(suppressedScript.frameAt(1720))}));
    EXPECT_EQ(suppressed.eventStats.numRejectedBeginHold, 1u);

    Algs algs;
    TouchScript script(algs);
    script.touch("C", 210, 1016, 1720);
    script.playUntil(1400);
    algs.setState("EnableHoldSuppression", PropertyValue(false));
    EXPECT_EQ(script.playUntil(1800), (Events{holdStart(1, script.frameAt(1520)), holdEnd(1, script.frameAt(1720))}));
}

TEST_F(AlgsTest, ActivationThresholdDecidesWhichPixelsAreOn) {
    Algs algs;
    TouchScript script(algs);
    script.touch("C", 150, 1016, 1112);  // 0.75 of the default threshold: never on
    script.touch("C", 150, 2016, 2112);
    EXPECT_EQ(script.playUntil(1500), Events{});
    algs.setState("ActivationThreshold", PropertyValue(100.0));
    EXPECT_EQ(script.playUntil(2200), (Events{mayBegin(1, script.frameAt(2016)), tap(1, script.frameAt(2112))}));
    EXPECT_EQ(algs.pixels.normalized[2], 0.0f);
}

TEST_F(AlgsTest, RaisedActivationThresholdEndsAFirmTouchOnTheNextFrame) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 1500);
    EXPECT_EQ(script.playUntil(1200), (Events{mayBegin(1, script.frameAt(1016))}));
    algs.setState("ActivationThreshold", PropertyValue(1000.0));
    EXPECT_EQ(script.playUntil(1208), (Events{tap(1, script.frameAt(1208))}));
    EXPECT_FALSE(algs.handStats.touching());
}

TEST_F(AlgsTest, WithoutTapSuppressionALightBrushIsATap) {
    Algs algs;
    TouchScript script(algs);
    algs.setState("EnableTapSuppression", PropertyValue(false));
    script.ramp("C", 80, 240, 1016, 1400);
    EXPECT_EQ(script.playUntil(1500), (Events{mayBegin(1, script.frameAt(1312)), tap(1, script.frameAt(1400))}));
}

// --- Settings and state keys ---

TEST_F(AlgsTest, WithNoPriorWritesTheSettingsReadTheirDefaults) {
    const Algs algs;
    EXPECT_EQ(algs.getState("HoldTimeoutMilliseconds"), PropertyValue(500u));
    EXPECT_EQ(algs.getState("HoldTimeoutMilliseconds").kind(), PropertyValue::Kind::Unsigned);
    EXPECT_EQ(algs.getState("ActivationThreshold"), PropertyValue(200.0));
    EXPECT_EQ(algs.getState("ActivationThreshold").kind(), PropertyValue::Kind::Floating);
    EXPECT_EQ(algs.getState("EnableHoldSuppression"), PropertyValue(true));
    EXPECT_EQ(algs.getState("EnableTapSuppression"), PropertyValue(true));
    EXPECT_TRUE(algs.getState("EnableTapSuppression").isBoolean());
}

TEST_F(AlgsTest, HoldTimeoutOfTwoToTheThirtyTwoPlusFiveHundredReadsBackAsFiveHundred) {
    Algs algs;
    algs.setState("HoldTimeoutMilliseconds", PropertyValue(4294967796ull));
    EXPECT_EQ(algs.getState("HoldTimeoutMilliseconds"), PropertyValue(500u));
}

TEST_F(AlgsTest, WritingTheStringOneToEnableTapSuppressionMakesItFalse) {
    Algs algs;
    algs.setState("EnableTapSuppression", PropertyValue("1"));
    EXPECT_EQ(algs.getState("EnableTapSuppression"), PropertyValue(false));
}

TEST_F(AlgsTest, WrittenValuesThatAreNotNumbersCountAsZero) {
    Algs algs;
    algs.setState("HoldTimeoutMilliseconds", PropertyValue(PropertyValue::Dictionary{}));
    algs.setState("ActivationThreshold", PropertyValue());
    algs.setState("EnableHoldSuppression", PropertyValue(PropertyValue::Array{PropertyValue(1)}));
    algs.setState("VirtualNormalizationFactors.4", PropertyValue("0.5"));
    EXPECT_EQ(algs.getState("HoldTimeoutMilliseconds"), PropertyValue(0u));
    EXPECT_EQ(algs.getState("ActivationThreshold"), PropertyValue(0.0));
    EXPECT_EQ(algs.getState("EnableHoldSuppression"), PropertyValue(false));
    EXPECT_EQ(algs.getState("VirtualNormalizationFactors.4"), PropertyValue(0.0));
}

TEST_F(AlgsTest, BooleansAndNumbersAreWrittenByTheirNumericValue) {
    Algs algs;
    algs.setState("ActivationThreshold", PropertyValue(true));
    EXPECT_EQ(algs.getState("ActivationThreshold"), PropertyValue(1.0));
    algs.setState("ActivationThreshold", PropertyValue(0.1));
    EXPECT_EQ(algs.getState("ActivationThreshold"), PropertyValue(static_cast<double>(0.1f)));
    algs.setState("EnableHoldSuppression", PropertyValue(0));
    EXPECT_EQ(algs.getState("EnableHoldSuppression"), PropertyValue(false));
    algs.setState("EnableHoldSuppression", PropertyValue(-3));
    EXPECT_EQ(algs.getState("EnableHoldSuppression"), PropertyValue(true));
    algs.setState("HoldTimeoutMilliseconds", PropertyValue(750.9));
    EXPECT_EQ(algs.getState("HoldTimeoutMilliseconds"), PropertyValue(750u));
    algs.setState("ActivationThreshold", PropertyValue(-5));
    EXPECT_EQ(algs.getState("ActivationThreshold"), PropertyValue(-5.0));  // stored as given
}

TEST_F(AlgsTest, FactorIndexTwentyTwoReadsTheLastFactorAndTwentyThreeReadsNull) {
    const Algs algs;
    EXPECT_EQ(algs.getState("VirtualNormalizationFactors.22"), PropertyValue(static_cast<double>(0.6667f)));
    EXPECT_TRUE(algs.getState("VirtualNormalizationFactors.23").isNull());
}

TEST_F(AlgsTest, FactorIndexWithLeadingSpaceReadsThatFactor) {
    const Algs algs;
    EXPECT_EQ(algs.getState("VirtualNormalizationFactors. 3"), PropertyValue(static_cast<double>(0.5714f)));
}

TEST_F(AlgsTest, FactorIndexMinusOneReadsNull) {
    Algs algs;
    EXPECT_TRUE(algs.getState("VirtualNormalizationFactors.-1").isNull());
    algs.setState("VirtualNormalizationFactors.-1", PropertyValue(9.0));
    for (float factor : algs.virtualImage.normalizationFactors) EXPECT_NE(factor, 9.0f);
}

TEST_F(AlgsTest, FactorIndexThatDoesNotReadAddressesGroupZeroAndTrailingTextIsIgnored) {
    Algs algs;
    EXPECT_EQ(algs.getState("VirtualNormalizationFactors.x"), PropertyValue(static_cast<double>(0.6667f)));
    EXPECT_EQ(algs.getState("VirtualNormalizationFactors."), PropertyValue(static_cast<double>(0.6667f)));
    EXPECT_EQ(algs.getState("VirtualNormalizationFactors.7abc"), PropertyValue(static_cast<double>(0.4651f)));
    EXPECT_TRUE(algs.getState("VirtualNormalizationFactors.99999999999999999999").isNull());
    algs.setState("VirtualNormalizationFactors.x", PropertyValue(0.25));
    EXPECT_EQ(algs.virtualImage.normalizationFactors[0], 0.25f);
}

TEST_F(AlgsTest, BareFactorsKeyAndOtherSpellingsReadNull) {
    const Algs algs;
    EXPECT_TRUE(algs.getState("VirtualNormalizationFactors").isNull());
    EXPECT_TRUE(algs.getState("virtualNormalizationFactors.1").isNull());
    EXPECT_TRUE(algs.getState("activationThreshold").isNull());
    EXPECT_TRUE(algs.getState("").isNull());
}

TEST_F(AlgsTest, WritingAFactorChangesTheListButNotTheVirtualPixelsGain) {
    Algs algs;
    algs.setState("VirtualNormalizationFactors.19", PropertyValue(2.5));
    EXPECT_EQ(algs.getState("VirtualNormalizationFactors.19"), PropertyValue(2.5));
    EXPECT_EQ(algs.virtualImage.normalizationFactors[19], 2.5f);
    EXPECT_EQ(algs.virtualPixels.gain[19], 0.4f);
}

TEST_F(AlgsTest, ReadingResetEventStatsYieldsNullAndWritingItClearsTheCounters) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 1112);
    script.playUntil(1200);
    ASSERT_EQ(nonZeroCounts(algs).size(), 2u);
    EXPECT_TRUE(algs.getState("ResetEventStats").isNull());
    algs.setState("ResetEventStats", PropertyValue("anything"));
    EXPECT_TRUE(nonZeroCounts(algs).empty());
    EXPECT_EQ(algs.getState("EventStats"), EventStats().statsDictionary());
}

TEST_F(AlgsTest, DebugInfoHoldsExactlyOneEntryEventStats) {
    const Algs algs;
    const PropertyValue info = algs.getState("DebugInfo");
    ASSERT_TRUE(info.isDictionary());
    ASSERT_EQ(info.dictionary()->size(), 1u);
    EXPECT_EQ(*info.find("EventStats"), algs.eventStats.statsDictionary());
}

TEST_F(AlgsTest, ReadOnlyAndUnknownKeysIgnoreWrites) {
    Algs algs;
    algs.eventStats.numTaps = 3;
    algs.setState("EventStats", PropertyValue(0));
    algs.setState("DebugInfo", PropertyValue(0));
    algs.setState("Unknown", PropertyValue(0));
    EXPECT_EQ(algs.eventStats.numTaps, 3u);
    EXPECT_TRUE(algs.getState("Unknown").isNull());
}

// --- Diagnostic descriptions and log lines ---

const char* const kIdleLine =
    "ts=0.000000, sd=0.000000, tsd=0.000000, NonActivePixels=21, TimeDurationRatio=0.000000, TapSVMScore=1.549000, "
    "[A=   0    0, B=   0    0, C=   0    0, D=   0    0, E=   0    0, F=   0    0, G=   0    0, H=   0    0, "
    "I=   0    0, J=   0    0, K=   0    0, L=   0    0, M=   0    0, N=   0    0, O=   0    0] ";

TEST_F(AlgsTest, IdleSurfaceDescriptionEndsInABracketAndASpace) {
    Algs algs;
    const int16_t zeros[15] = {};
    EventList out;
    algs.processTouchFrame(zeros, 1, 1000, out);
    EXPECT_EQ(algs.touchStateDescription(zeros, 1000), kIdleLine);
    EXPECT_EQ(algs.virtualStateDescription(zeros, 1000),
              "ts=0.000000, sd=0.000000, tsd=0.000000, NonActivePixels=21, TimeDurationRatio=0.000000, "
              "TapSVMScore=1.549000, [ABE=   0, ABF=   0, ADEF=   0, AEGJ=   0, BCEF=   0, BFHJ=   0, CDE=   0, "
              "CDF=   0, CELN=   0, DFLO=   0, EFK=   0, EJK=   0, EKL=   0, FJK=   0, FKL=   0, GHI=   0, GIJ=   0, "
              "HIJ=   0, IJK=   0, KLM=   0, LMN=   0, LMO=   0, MNO=   0] ");
}

TEST_F(AlgsTest, StartOfTouchDescriptionShowsOnPixelsAndStartTouchAtZeroMilliseconds) {
    Algs algs;
    TouchScript script(algs);
    script.touch("C", 600, 1016, 1200);
    script.playUntil(1008);
    int16_t readings[15] = {};
    readings[2] = 312;  // C: 312 x 1.9281 = 601
    EventList out;
    algs.processTouchFrame(readings, 102, 1016, out);
    EXPECT_EQ(algs.touchStateDescription(readings, 1016),
              "ts=5.817569, sd=0.000000, tsd=-0.650000, NonActivePixels=21, TimeDurationRatio=0.000000, "
              "TapSVMScore=1.549000, [A=   0    0, B=   0    0, C= 312  601<==ON, D=   0    0, E=   0    0, "
              "F=   0    0, G=   0    0, H=   0    0, I=   0    0, J=   0    0, K=   0    0, L=   0    0, M=   0    0, "
              "N=   0    0, O=   0    0] STARTTOUCH 0ms ActiveRegion=1");
    EXPECT_EQ(algs.virtualStateDescription(readings, 1016),
              "ts=5.817569, sd=0.000000, tsd=-0.650000, NonActivePixels=21, TimeDurationRatio=0.000000, "
              "TapSVMScore=1.549000, [ABE=   0, ABF=   0, ADEF=   0, AEGJ=   0, BCEF= 400<==ON, BFHJ=   0, "
              "CDE= 400<==ON, CDF= 279<==ON, CELN= 400<==ON, DFLO=   0, EFK=   0, EJK=   0, EKL=   0, FJK=   0, "
              "FKL=   0, GHI=   0, GIJ=   0, HIJ=   0, IJK=   0, KLM=   0, LMN=   0, LMO=   0, MNO=   0] "
              "STARTTOUCH 0ms ActiveRegion=1");
}

TEST_F(AlgsTest, RejectedTapDescriptionShowsSuppressTapTimedToNow) {
    Algs algs;
    TouchScript script(algs);
    script.ramp("C", 80, 240, 1016, 1400);
    script.playUntil(1392);
    const InputReport::Image release = script.imageAt(1400);
    algs.handleImage(release);
    // Touch 1312..1400 ms, noise since 1016 ms, peak 237: span 384, duration 88; four groups with C
    // were above noise but never on. The score was cleared with the touch.
    EXPECT_EQ(algs.touchStateDescription(release.pixels, 1400),
              "ts=0.000000, sd=0.107187, tsd=2.043182, NonActivePixels=17, TimeDurationRatio=-0.020833, "
              "TapSVMScore=0.767635, [A=   0    0, B=   0    0, C=   0    0, D=   0    0, E=   0    0, F=   0    0, "
              "G=   0    0, H=   0    0, I=   0    0, J=   0    0, K=   0    0, L=   0    0, M=   0    0, N=   0    0, "
              "O=   0    0] SUPPRESSTAP 88ms ActiveRegion=1 BELOWNOISE");
}

TEST_F(AlgsTest, RejectedTapWithAPixelStillAboveNoiseEndsInAboveNoise) {
    Algs algs;
    TouchScript script(algs);
    script.ramp("C", 80, 240, 1016, 1400).touch("C", 100, 1400, 1500);  // falls back to hovering
    script.playUntil(1392);
    const InputReport::Image release = script.imageAt(1400);
    ASSERT_EQ(algs.handleImage(release).size(), 1u);
    const std::string line = algs.touchStateDescription(release.pixels, 1400);
    const std::string ending = "] SUPPRESSTAP 88ms ActiveRegion=1 ABOVENOISE";
    ASSERT_GE(line.size(), ending.size());
    EXPECT_EQ(line.substr(line.size() - ending.size()), ending);
}

TEST_F(AlgsTest, PixelCOnWithReadingThreeHundredTwelveAndValueFiveHundredNinetyNineRendersRightAligned) {
    Algs algs;
    int16_t readings[15] = {};
    readings[2] = 312;
    EventList out;
    algs.processTouchFrame(readings, 1, 1000, out);
    algs.pixels.value[2] = 599;
    const std::string line = algs.touchStateDescription(readings, 1000);
    EXPECT_NE(line.find(", C= 312  599<==ON, D=   0    0, "), std::string::npos) << line;
}

TEST_F(AlgsTest, DebugLevelOffWritesNoLines) {
    Algs algs;
    TouchScript script(algs);
    script.touch("CD", 600, 1016, 1112);
    script.playUntil(1200);
    EXPECT_TRUE(sink->messages().empty());
}

TEST_F(AlgsTest, DebugLevelOnWritesTheThreeLinesOfEveryFrame) {
    SystemLog::setDebugEnabled(true, "Algs");
    Algs algs;
    const int16_t zeros[15] = {};
    EventList out;
    algs.processTouchFrame(zeros, 7, 1000, out);
    const std::vector<LogRecord> records = sink->records();
    ASSERT_EQ(records.size(), 3u);
    for (const LogRecord& r : records) {
        EXPECT_EQ(r.subsystem, "com.zantor.hid.TolkaTouch");
        EXPECT_EQ(r.category, "Algs");
        EXPECT_EQ(r.level, LogLevel::Debug);
    }
    EXPECT_EQ(records[0].message,
              "Frame 7 @1000ms, *** Event Stats ***\n" + algs.eventStats.statsDictionary().description());
    EXPECT_EQ(records[1].message, std::string("Frame 7 @1000ms, *** Touch State Description ***\n") + kIdleLine);
    EXPECT_EQ(records[2].message, "Frame 7 @1000ms, *** Virtual State Description ***\n" +
                                      algs.virtualStateDescription(zeros, 1000));
}

// --- Bad input ---

TEST_F(AlgsTest, HundredThousandRandomFramesWithOddSettingsRunCleanly) {
    std::mt19937 random(20261121);
    const auto pick = [&](auto&& values) { return values[random() % std::size(values)]; };
    const float nan = std::numeric_limits<float>::quiet_NaN();
    const float inf = std::numeric_limits<float>::infinity();
    const double thresholds[] = {0.0, -1.0, -200.0, nan, inf, -inf, 1e30, 1e-30, 200.0, 3.4e38, 1e300, 0.5};
    const uint64_t timeouts[] = {0, 0xFFFFFFFFull, 500, 1, 4294967796ull, 0xFFFFFFFFFFFFFFFFull};
    const PropertyValue odd[] = {PropertyValue(), PropertyValue("x"), PropertyValue(nan), PropertyValue(-inf),
                                 PropertyValue(true), PropertyValue(-1), PropertyValue(1e300),
                                 PropertyValue(PropertyValue::Dictionary{})};
    const char* const keys[] = {"ActivationThreshold", "HoldTimeoutMilliseconds", "EnableHoldSuppression",
                                "EnableTapSuppression", "ResetEventStats", "VirtualNormalizationFactors.5",
                                "VirtualNormalizationFactors.-1", "VirtualNormalizationFactors.99",
                                "VirtualNormalizationFactors.x", "Unknown"};

    Algs algs;
    uint32_t frameNumber = 0xFFFFFFF0u;
    uint32_t timeMs = 0xFFFFF000u;
    size_t eventCount = 0;
    for (int frame = 0; frame < 100000; ++frame) {
        int16_t readings[15];
        switch (random() % 6) {
        case 0:
            for (int16_t& r : readings) r = static_cast<int16_t>(random());
            break;
        case 1:
            for (int16_t& r : readings) r = (random() & 1) ? INT16_MAX : INT16_MIN;
            break;
        case 2:
            for (int16_t& r : readings) r = INT16_MAX;
            break;
        case 3:
            for (int16_t& r : readings) r = 0;
            break;
        default:
            for (int16_t& r : readings) r = static_cast<int16_t>(static_cast<int>(random() % 700) - 100);
            break;
        }
        switch (random() % 8) {
        case 0: timeMs = static_cast<uint32_t>(random()); break;
        case 1: timeMs -= random() % 2000; break;  // backwards
        default: timeMs += 8; break;               // wraps past 2^32
        }
        frameNumber = random() % 16 == 0 ? static_cast<uint32_t>(random()) : frameNumber + 1;

        if (frame % 97 == 0) {
            switch (random() % 4) {
            case 0: algs.setState("ActivationThreshold", PropertyValue(pick(thresholds))); break;
            case 1: algs.setState("HoldTimeoutMilliseconds", PropertyValue(pick(timeouts))); break;
            case 2: algs.setState(pick(keys), pick(odd)); break;
            default: algs.setState(pick(keys), PropertyValue(static_cast<double>(random()) - 2e9)); break;
            }
        }
        // Now and then a frame with the diagnostic lines built, to run them over odd state too.
        if (frame % 500 == 0) SystemLog::setDebugEnabled(true, "Algs");
        if (frame % 500 == 1) SystemLog::setDebugEnabled(false, "Algs");

        InputReport::Image image{};
        image.frameNumber = frameNumber;
        image.timeMs = timeMs;
        std::copy(std::begin(readings), std::end(readings), image.pixels);
        const EventList events = random() % 1000 == 0 ? algs.handleReset() : algs.handleImage(image);
        ASSERT_LE(events.size(), 1u);
        for (const HIDEventRef& e : events) {
            EXPECT_TRUE(e->y == 0.0 || e->y == 1.0 || e->y == 2.0 || e->y == 3.0) << e->y;
            ++eventCount;
        }
        if (frame % 1000 == 0) {
            (void)algs.getState("DebugInfo");
            (void)algs.getState(pick(keys));
        }
        if (frame % 500 == 0) sink->clear();
    }
    EXPECT_GT(eventCount, 0u);
}

}  // namespace
}  // namespace TolkaTouch

#include "algs/EventStats.h"

#include <gtest/gtest.h>

#include <map>
#include <string>

#include "tolkatouch/FrameSnapshot.h"

namespace TolkaTouch {
namespace {

using Counts = std::map<std::string, uint64_t>;

// Every counter by name, from both halves of the dictionary; the ones not listed are 0.
Counts nonZeroCounts(const EventStats& stats) {
    Counts counts;
    const PropertyValue dictionary = stats.statsDictionary();
    for (const char* half : {"Dispatched", "Rejected"}) {
        for (const auto& [name, value] : *dictionary.find(half)->dictionary()) {
            if (*value.unsignedInteger() != 0) counts[name] = *value.unsignedInteger();
        }
    }
    return counts;
}

// One frame's verdict as the hand state machine would leave it.
FrameVerdict frame(Transition transition, PixelRegion region, HoldClock clock = HoldClock::Before,
                   bool holdSuppressed = false) {
    FrameVerdict verdict;
    verdict.transition = transition;
    verdict.region = region;
    verdict.holdClock = clock;
    verdict.holdSuppressed = holdSuppressed;
    return verdict;
}

constexpr bool kSuppressed = true;

TEST(EventStatsTest, AllTwentyFourCountersStartAtZero) {
    const EventStats stats;
    EXPECT_EQ(nonZeroCounts(stats), Counts{});
}

TEST(EventStatsTest, StatsDictionaryHoldsTwelveUnsignedCountersUnderEachHalf) {
    const PropertyValue dictionary = EventStats().statsDictionary();
    ASSERT_TRUE(dictionary.isDictionary());
    ASSERT_EQ(dictionary.dictionary()->size(), 2u);
    const auto names = [&](const char* half) {
        std::vector<std::string> out;
        for (const auto& [name, value] : *dictionary.find(half)->dictionary()) {
            EXPECT_EQ(value.kind(), PropertyValue::Kind::Unsigned) << name;
            out.push_back(name);
        }
        return out;
    };
    EXPECT_EQ(names("Dispatched"),
              (std::vector<std::string>{"numBeginHold", "numEndHold", "numHolding2Suppressed", "numIncrementHold",
                                        "numKalioCall", "numKalioCallIncrement", "numPlayPause", "numTaps",
                                        "numVolumeDecrement", "numVolumeDown", "numVolumeIncrement",
                                        "numVolumeUp"}));
    EXPECT_EQ(names("Rejected"),
              (std::vector<std::string>{"numRejectedBeginHold", "numRejectedEndHold", "numRejectedIncrementHold",
                                        "numRejectedKalioCall", "numRejectedKalioCallIncrement",
                                        "numRejectedPlayPause", "numRejectedTap", "numRejectedVolumeDecrement",
                                        "numRejectedVolumeDown", "numRejectedVolumeIncrement",
                                        "numRejectedVolumeUp", "numSuppressed2Holding"}));
}

TEST(EventStatsTest, AcceptedTapInRegionThreeAddsOneToNumTapsAndNumVolumeUpOnly) {
    EventStats stats;
    stats.update(frame(Transition::TapAccepted, PixelRegion::VolumeUp));
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numTaps", 1}, {"numVolumeUp", 1}}));
}

TEST(EventStatsTest, AcceptedTapsInRegionsOneAndTwoCountPlayPauseAndVolumeDown) {
    EventStats stats;
    stats.update(frame(Transition::TapAccepted, PixelRegion::PlayPause));
    stats.update(frame(Transition::TapAccepted, PixelRegion::VolumeDown));
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numTaps", 2}, {"numPlayPause", 1}, {"numVolumeDown", 1}}));
}

TEST(EventStatsTest, HoldInRegionOneHeldForFiveFramesCountsOneBeginFourIncrementsAndOneEnd) {
    EventStats stats;
    stats.update(frame(Transition::TouchBegan, PixelRegion::PlayPause));  // the touch starts: nothing counted
    stats.update(frame(Transition::Touching, PixelRegion::PlayPause));    // not yet holding: nothing counted
    stats.update(frame(Transition::HoldBegan, PixelRegion::PlayPause, HoldClock::Reached));
    for (int i = 0; i < 4; ++i) stats.update(frame(Transition::Holding, PixelRegion::PlayPause, HoldClock::Past));
    EXPECT_EQ(nonZeroCounts(stats),
              (Counts{{"numBeginHold", 1}, {"numKalioCall", 1}, {"numIncrementHold", 4}, {"numKalioCallIncrement", 4}}));

    stats.update(frame(Transition::HoldEnded, PixelRegion::PlayPause, HoldClock::Dropped));
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numBeginHold", 1},
                                            {"numKalioCall", 1},
                                            {"numIncrementHold", 4},
                                            {"numKalioCallIncrement", 4},
                                            {"numEndHold", 1}}));
}

TEST(EventStatsTest, HoldsInRegionsTwoAndThreeCountVolumeDecrementAndIncrementEveryFrame) {
    EventStats stats;
    stats.update(frame(Transition::HoldBegan, PixelRegion::VolumeDown));
    stats.update(frame(Transition::Holding, PixelRegion::VolumeDown));
    stats.update(frame(Transition::HoldMoved, PixelRegion::VolumeUp));
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numBeginHold", 1},
                                            {"numIncrementHold", 2},
                                            {"numVolumeDecrement", 2},
                                            {"numVolumeIncrement", 1}}));
}

TEST(EventStatsTest, HoldAfterASuppressedOneCountsSuppressedToHolding) {
    EventStats stats;
    stats.update(frame(Transition::HoldRecovered, PixelRegion::PlayPause));
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numSuppressed2Holding", 1}, {"numBeginHold", 1}, {"numKalioCall", 1}}));
}

TEST(EventStatsTest, HoldSuppressedInTheFrameTheTimeoutPassesCountsARejectedBegin) {
    EventStats stats;
    stats.update(frame(Transition::Touching, PixelRegion::PlayPause, HoldClock::Reached, kSuppressed));
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numRejectedBeginHold", 1}, {"numRejectedKalioCall", 1}}));

    stats.update(frame(Transition::Touching, PixelRegion::PlayPause, HoldClock::Past, kSuppressed));
    stats.update(frame(Transition::Touching, PixelRegion::VolumeDown, HoldClock::Past, kSuppressed));
    stats.update(frame(Transition::Touching, PixelRegion::VolumeUp, HoldClock::Past, kSuppressed));
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numRejectedBeginHold", 1},
                                            {"numRejectedKalioCall", 1},
                                            {"numRejectedIncrementHold", 3},
                                            {"numRejectedKalioCallIncrement", 1},
                                            {"numRejectedVolumeDecrement", 1},
                                            {"numRejectedVolumeIncrement", 1}}));
}

TEST(EventStatsTest, SuppressedWithoutTheTimeoutCountsOnlyTheVolumeButtons) {
    EventStats stats;
    // A hold that ends under a finger that stays, suppressed, short of the timeout.
    stats.update(frame(Transition::HoldEnded, PixelRegion::VolumeDown, HoldClock::Before, kSuppressed));
    stats.update(frame(Transition::HoldEnded, PixelRegion::PlayPause, HoldClock::Before, kSuppressed));
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numHolding2Suppressed", 2}, {"numRejectedVolumeDecrement", 1}}));
}

TEST(EventStatsTest, SuppressedHoldThatEndsCountsARejectedEnd) {
    EventStats stats;
    // The dropped hold clock decides before the tap's outcome is looked at.
    stats.update(frame(Transition::TapRejected, PixelRegion::PlayPause, HoldClock::Dropped));
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numRejectedEndHold", 1}}));
}

TEST(EventStatsTest, RejectedTapCountsTheRejectedButton) {
    EventStats stats;
    stats.update(frame(Transition::TapRejected, PixelRegion::VolumeDown));
    stats.update(frame(Transition::TapRejected, PixelRegion::None));  // region 0: the general counter only
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numRejectedTap", 2}, {"numRejectedVolumeDown", 1}}));
}

TEST(EventStatsTest, NothingIsCountedInTheFrameATouchStarts) {
    EventStats stats;
    stats.update(frame(Transition::TouchBegan, PixelRegion::PlayPause, HoldClock::Reached, kSuppressed));
    EXPECT_EQ(nonZeroCounts(stats), Counts{});
}

TEST(EventStatsTest, EndedTouchAndIdleFramesCountNothing) {
    EventStats stats;
    stats.update(frame(Transition::TouchEnded, PixelRegion::VolumeUp));
    stats.update(frame(Transition::Idle, PixelRegion::VolumeUp));
    stats.update(frame(Transition::Touching, PixelRegion::VolumeUp));
    EXPECT_EQ(nonZeroCounts(stats), Counts{});
}

TEST(EventStatsTest, ResetZeroesAllTwentyFourCounters) {
    EventStats stats;
    uint64_t EventStats::*const counters[] = {
        &EventStats::numTaps, &EventStats::numBeginHold, &EventStats::numIncrementHold, &EventStats::numEndHold,
        &EventStats::numVolumeUp, &EventStats::numVolumeDown, &EventStats::numPlayPause, &EventStats::numKalioCall,
        &EventStats::numKalioCallIncrement, &EventStats::numVolumeIncrement, &EventStats::numVolumeDecrement,
        &EventStats::numRejectedTap, &EventStats::numRejectedBeginHold, &EventStats::numRejectedIncrementHold,
        &EventStats::numRejectedEndHold, &EventStats::numRejectedVolumeUp, &EventStats::numRejectedVolumeDown,
        &EventStats::numRejectedPlayPause, &EventStats::numRejectedKalioCall,
        &EventStats::numRejectedKalioCallIncrement, &EventStats::numRejectedVolumeIncrement,
        &EventStats::numRejectedVolumeDecrement, &EventStats::numSuppressed2Holding,
        &EventStats::numHolding2Suppressed,
    };
    for (size_t i = 0; i < 24; ++i) stats.*counters[i] = i + 1;
    ASSERT_EQ(stats.numHolding2Suppressed, 24u);
    ASSERT_EQ(nonZeroCounts(stats).size(), 24u);
    stats.Reset();
    EXPECT_EQ(nonZeroCounts(stats), Counts{});
}

}  // namespace
}  // namespace TolkaTouch

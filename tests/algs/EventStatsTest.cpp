#include "algs/EventStats.h"

#include <gtest/gtest.h>

#include <map>
#include <string>

#include "algs/HandStats.h"

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

HandStats handIn(PixelRegion region) {
    HandStats hand;
    hand.activeRegion = region;
    return hand;
}

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
    HandStats hand = handIn(PixelRegion::VolumeUp);
    hand.wasTouching = true;
    hand.tapCandidate = true;
    hand.tapDetected = true;
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numTaps", 1}, {"numVolumeUp", 1}}));
}

TEST(EventStatsTest, AcceptedTapsInRegionsOneAndTwoCountPlayPauseAndVolumeDown) {
    EventStats stats;
    HandStats hand = handIn(PixelRegion::PlayPause);
    hand.wasTouching = true;
    hand.tapCandidate = true;
    hand.tapDetected = true;
    stats.update(hand.verdict());
    hand.activeRegion = PixelRegion::VolumeDown;
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numTaps", 2}, {"numPlayPause", 1}, {"numVolumeDown", 1}}));
}

TEST(EventStatsTest, HoldInRegionOneHeldForFiveFramesCountsOneBeginFourIncrementsAndOneEnd) {
    EventStats stats;
    HandStats hand = handIn(PixelRegion::PlayPause);
    hand.touching = true;  // the touch starts: nothing counted
    stats.update(hand.verdict());
    hand.wasTouching = true;
    hand.touching = true;
    stats.update(hand.verdict());  // touching, not yet holding: nothing counted
    hand.holding = true;
    hand.holdTimeExceeded = true;
    stats.update(hand.verdict());
    hand.wasHolding = true;
    hand.wasHoldTimeExceeded = true;
    for (int i = 0; i < 4; ++i) stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats),
              (Counts{{"numBeginHold", 1}, {"numKalioCall", 1}, {"numIncrementHold", 4}, {"numKalioCallIncrement", 4}}));

    hand.touching = false;
    hand.holding = false;
    hand.holdTimeExceeded = false;
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numBeginHold", 1},
                                            {"numKalioCall", 1},
                                            {"numIncrementHold", 4},
                                            {"numKalioCallIncrement", 4},
                                            {"numEndHold", 1}}));
}

TEST(EventStatsTest, HoldsInRegionsTwoAndThreeCountVolumeDecrementAndIncrementEveryFrame) {
    EventStats stats;
    HandStats hand = handIn(PixelRegion::VolumeDown);
    hand.wasTouching = hand.touching = true;
    hand.holding = true;
    stats.update(hand.verdict());
    hand.wasHolding = true;
    stats.update(hand.verdict());
    hand.activeRegion = PixelRegion::VolumeUp;
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numBeginHold", 1},
                                            {"numIncrementHold", 2},
                                            {"numVolumeDecrement", 2},
                                            {"numVolumeIncrement", 1}}));
}

TEST(EventStatsTest, HoldAfterASuppressedOneCountsSuppressedToHolding) {
    EventStats stats;
    HandStats hand = handIn(PixelRegion::PlayPause);
    hand.wasTouching = hand.touching = true;
    hand.holding = true;
    hand.wasHoldSuppressed = true;
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numSuppressed2Holding", 1}, {"numBeginHold", 1}, {"numKalioCall", 1}}));
}

TEST(EventStatsTest, HoldSuppressedInTheFrameTheTimeoutPassesCountsARejectedBegin) {
    EventStats stats;
    HandStats hand = handIn(PixelRegion::PlayPause);
    hand.wasTouching = hand.touching = true;
    hand.isHoldSuppressed = true;
    hand.holdTimeExceeded = true;
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numRejectedBeginHold", 1}, {"numRejectedKalioCall", 1}}));

    hand.wasHoldTimeExceeded = true;
    stats.update(hand.verdict());
    hand.activeRegion = PixelRegion::VolumeDown;
    stats.update(hand.verdict());
    hand.activeRegion = PixelRegion::VolumeUp;
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numRejectedBeginHold", 1},
                                            {"numRejectedKalioCall", 1},
                                            {"numRejectedIncrementHold", 3},
                                            {"numRejectedKalioCallIncrement", 1},
                                            {"numRejectedVolumeDecrement", 1},
                                            {"numRejectedVolumeIncrement", 1}}));
}

TEST(EventStatsTest, SuppressedWithoutTheTimeoutCountsOnlyTheVolumeButtons) {
    EventStats stats;
    HandStats hand = handIn(PixelRegion::VolumeDown);
    hand.wasTouching = hand.touching = true;
    hand.isHoldSuppressed = true;
    hand.wasHolding = true;
    stats.update(hand.verdict());
    hand.activeRegion = PixelRegion::PlayPause;
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numHolding2Suppressed", 2}, {"numRejectedVolumeDecrement", 1}}));
}

TEST(EventStatsTest, SuppressedHoldThatEndsCountsARejectedEnd) {
    EventStats stats;
    HandStats hand = handIn(PixelRegion::PlayPause);
    hand.wasTouching = true;
    hand.wasHoldTimeExceeded = true;
    hand.tapCandidate = true;  // not reached
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numRejectedEndHold", 1}}));
}

TEST(EventStatsTest, RejectedTapCountsTheRejectedButton) {
    EventStats stats;
    HandStats hand = handIn(PixelRegion::VolumeDown);
    hand.wasTouching = true;
    hand.tapCandidate = true;
    stats.update(hand.verdict());
    hand.activeRegion = PixelRegion::None;  // region 0: the general counter only
    stats.update(hand.verdict());
    EXPECT_EQ(nonZeroCounts(stats), (Counts{{"numRejectedTap", 2}, {"numRejectedVolumeDown", 1}}));
}

TEST(EventStatsTest, NothingIsCountedInTheFrameATouchStarts) {
    EventStats stats;
    HandStats hand = handIn(PixelRegion::PlayPause);
    hand.touching = true;
    hand.holding = true;
    hand.tapDetected = true;
    stats.update(hand.verdict());
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

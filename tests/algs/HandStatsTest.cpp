#include "algs/HandStats.h"

#include <gtest/gtest.h>

#include <array>

#include <limits>
#include <random>
#include <span>
#include <vector>
#include <stdexcept>

#include <cmath>

namespace TolkaTouch {
namespace {

// One frame's pixels as the hand state machine sees them, set field by field.
struct HandFrame {
    std::vector<Pixel> pixels;
    std::vector<VirtualPixel> virtualPixels;

    HandFrame() {
        for (int i = 0; i < 15; ++i) pixels.emplace_back(i, 1.0f);
        for (int i = 0; i < 23; ++i) virtualPixels.emplace_back(0, 1.0f, "X");
    }

    // Pixel i on at this normalised strength, with value = strength x 200.
    HandFrame& on(size_t i, float strength) {
        Pixel& p = pixels.at(i);
        p.isOn = true;
        p.wasOn = true;
        p.normalized = strength;
        p.value = static_cast<int32_t>(strength * 200.0f);
        p.aboveNoise = p.value > 75;
        p.wasAboveNoise = p.wasAboveNoise || p.aboveNoise;
        return *this;
    }

    // Pixel i on, but with nothing the tap classifier could score (value 0).
    HandFrame& onWithoutValue(size_t i) {
        pixels.at(i).isOn = true;
        pixels.at(i).normalized = 1.5f;
        return *this;
    }
};

const HandFrame kIdle;

TEST(HandStatsTest, ConstructorSetsTheDefaults) {
    const HandStats hand;
    EXPECT_EQ(hand.touchScore, 0.0f);
    EXPECT_EQ(hand.decayBase, 7.389056f);
    EXPECT_EQ(hand.ActivationThreshold, 200.0f);
    EXPECT_EQ(hand.HoldTimeoutMilliseconds, 500u);
    EXPECT_EQ(hand.holdScoreThreshold, 0.0f);
    EXPECT_EQ(hand.scoreLimit, 100.0f);
    EXPECT_TRUE(hand.EnableHoldSuppression);
    EXPECT_TRUE(hand.EnableTapSuppression);
    EXPECT_EQ(hand.regionMax, (std::array<float, 4>{}));
    EXPECT_EQ(hand.regionSwitchFactor, 1.3f);
    EXPECT_EQ(hand.activeRegion, PixelRegion::None);
}

TEST(HandStatsTest, ResetClearsOnlyTheScoreAndTheStrongestOnRecord) {
    HandStats hand;
    hand.updateHandState(HandFrame().on(2, 3.0f).pixels, kIdle.virtualPixels, 1000);
    ASSERT_NE(hand.touchScore, 0.0f);
    ASSERT_EQ(hand.maxOnIndex, 2);
    hand.Reset();
    EXPECT_EQ(hand.touchScore, 0.0f);
    EXPECT_EQ(hand.peakStrength, 0.0f);
    EXPECT_EQ(hand.maxOnStrength, 0.0f);
    EXPECT_EQ(hand.maxOnIndex, 0);
    EXPECT_TRUE(hand.touching());
    EXPECT_EQ(hand.touchStartTime, 1000u);
    EXPECT_EQ(hand.activeRegion, PixelRegion::PlayPause);
}

TEST(HandStatsTest, SetDecayParametersRestoresEulersNumberSquared) {
    HandStats hand;
    hand.decayBase = 2.0f;
    hand.SetDecayParameters();
    EXPECT_EQ(hand.decayBase, 7.389056f);
}

TEST(HandStatsTest, StrongestOnElementIncludesVirtualPixelsByTheirStrongestMember) {
    HandStats hand;
    HandFrame frame;
    frame.on(2, 3.0f);
    frame.virtualPixels[6].isOn = true;
    frame.virtualPixels[6].normalized = 4.0f;
    frame.virtualPixels[6].index = 3;
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    EXPECT_EQ(hand.maxOnIndex, 3);
    EXPECT_EQ(hand.maxOnStrength, 4.0f);
}

TEST(HandStatsTest, TouchLastingExactlyFiveHundredMillisecondsIsNotAHold) {
    HandStats hand;
    const HandFrame frame = HandFrame().on(2, 3.0f);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1500);
    EXPECT_FALSE(hand.holding());
    EXPECT_FALSE(hand.holdTimeExceeded());
}

TEST(HandStatsTest, TouchLastingFiveHundredAndOneMillisecondsIsAHold) {
    HandStats hand;
    const HandFrame frame = HandFrame().on(2, 3.0f);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1501);
    EXPECT_TRUE(hand.holding());
    EXPECT_TRUE(hand.holdTimeExceeded());
    EXPECT_FALSE(hand.isHoldSuppressed());
}

TEST(HandStatsTest, ScoreExactlyZeroAtTheTimeoutWithThresholdZeroBecomesAHold) {
    HandStats hand;
    const HandFrame frame = HandFrame().onWithoutValue(2);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1501);
    ASSERT_EQ(hand.touchScore, 0.0f);
    EXPECT_TRUE(hand.holding());
    EXPECT_FALSE(hand.isHoldSuppressed());
}

TEST(HandStatsTest, ScoreBelowTheThresholdAtTheTimeoutSuppressesTheHold) {
    HandStats hand;
    const HandFrame frame = HandFrame().onWithoutValue(2);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.touchScore = -0.5f;
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1501);
    EXPECT_FALSE(hand.holding());
    EXPECT_TRUE(hand.isHoldSuppressed());
    EXPECT_TRUE(hand.holdTimeExceeded());

    hand.updateHandState(frame.pixels, frame.virtualPixels, 1509);
    EXPECT_FALSE(hand.holding());
    EXPECT_TRUE(hand.isHoldSuppressed());
    EXPECT_TRUE(hand.wasHoldSuppressed());
}

TEST(HandStatsTest, SuppressedTouchWhoseScoreRecoversBecomesAHold) {
    HandStats hand;
    const HandFrame frame = HandFrame().onWithoutValue(2);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.touchScore = -0.5f;
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1501);
    ASSERT_TRUE(hand.isHoldSuppressed());
    hand.touchScore = 0.5f;
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1509);
    EXPECT_TRUE(hand.holding());
    EXPECT_FALSE(hand.isHoldSuppressed());
    EXPECT_TRUE(hand.wasHoldSuppressed());
}

TEST(HandStatsTest, HeldTouchWhoseScoreFallsBelowTheThresholdStaysHeld) {
    HandStats hand;
    const HandFrame frame = HandFrame().onWithoutValue(2);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1501);
    ASSERT_TRUE(hand.holding());
    hand.touchScore = -50.0f;
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1509);
    EXPECT_TRUE(hand.holding());
    EXPECT_TRUE(hand.wasHolding());
    EXPECT_FALSE(hand.isHoldSuppressed());
}

TEST(HandStatsTest, TouchReleasedInTheFirstFrameAfterPassingTheTimeoutIsNotATap) {
    HandStats hand;
    const HandFrame frame = HandFrame().on(2, 3.0f);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1501);
    hand.updateHandState(kIdle.pixels, kIdle.virtualPixels, 1509);
    EXPECT_FALSE(hand.tapCandidate());
    EXPECT_FALSE(hand.tapDetected());
    EXPECT_TRUE(hand.wasHolding());
    EXPECT_FALSE(hand.holding());
}

TEST(HandStatsTest, TouchReleasedPastTheTimeoutIsATapWhenItsLastFrameHadNotPassedIt) {
    HandStats hand;
    const HandFrame frame = HandFrame().on(2, 3.0f);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1500);
    hand.updateHandState(kIdle.pixels, kIdle.virtualPixels, 1508);
    EXPECT_TRUE(hand.tapCandidate());
    EXPECT_EQ(hand.touchEndTime, 1508u);
}

TEST(HandStatsTest, TouchScoreOfOneHundredFiftyAfterAddingIsStoredAsOneHundred) {
    HandStats hand;
    hand.touchScore = 150.0f;
    hand.updateTouchScore(kIdle.pixels, kIdle.virtualPixels, 1000);
    EXPECT_EQ(hand.touchScore, 100.0f);
}

TEST(HandStatsTest, TouchScoreOfMinusOneHundredFiftyAfterAddingIsStoredAsMinusOneHundred) {
    HandStats hand;
    hand.touchScore = -150.0f;
    hand.updateTouchScore(kIdle.pixels, kIdle.virtualPixels, 1000);
    EXPECT_EQ(hand.touchScore, -100.0f);
}

TEST(HandStatsTest, FuzzifyAndClipAtTheLowerEdgeGivesTheLowerValue) {
    HandStats hand;
    EXPECT_EQ(hand.fuzzifyAndClip(0.3f, 0.3f, 1.0f, 0.65f, 1.0f), 0.65f);
    EXPECT_EQ(hand.fuzzifyAndClip(1.0f, 0.3f, 1.0f, 0.65f, 1.0f), 1.0f);
    EXPECT_EQ(hand.fuzzifyAndClip(2.0f, 0.3f, 1.0f, 0.65f, 1.0f), 1.0f);
}

TEST(HandStatsTest, FuzzifyAndClipHalfwayGivesPointEightTwoFive) {
    HandStats hand;
    const float halfway = hand.fuzzifyAndClip(0.65f, 0.3f, 1.0f, 0.65f, 1.0f);
    EXPECT_FLOAT_EQ(halfway, 0.825f);
    // Exactly: the float inputs make t a hair below one half.
    const float t = (0.65f - 0.3f) / (1.0f - 0.3f);
    EXPECT_EQ(halfway, std::fma(1.0f - t, 0.65f, t * 1.0f));
}

TEST(HandStatsTest, FuzzifyIsOneFusedMultiplyAddAndDoesNotClip) {
    HandStats hand;
    const float t = (0.4f - 0.3f) / (1.0f - 0.3f);
    EXPECT_EQ(hand.fuzzify(0.4f, 0.3f, 1.0f, 0.65f, 1.0f), std::fma(1.0f - t, 0.65f, t * 1.0f));
    EXPECT_EQ(hand.fuzzify(2.0f, 0.0f, 1.0f, 0.0f, 1.0f), 2.0f);
}

TEST(HandStatsTest, TimeBiasFactorRisesFromPointSixFiveToOneBetweenThreeTenthsAndOneSecond) {
    HandStats hand;
    hand.lastEventTime = 10000;
    EXPECT_EQ(hand.updateTimeBiasFactor(10300), 0.65f);
    EXPECT_EQ(hand.updateTimeBiasFactor(11000), 1.0f);
    EXPECT_EQ(hand.updateTimeBiasFactor(10650), hand.fuzzify(0.65f, 0.3f, 1.0f, 0.65f, 1.0f));
    EXPECT_EQ(hand.updateTimeBiasFactor(9999), 1.0f);  // wraps to a huge gap
}

TEST(HandStatsTest, DecayKeepsEightyFourPercentWhenNoiseReturnsOneMillisecondAfterEnding) {
    HandStats hand;
    hand.noiseEndTime = 5000;
    hand.touchScore = -10.0f;
    hand.decayTouchScore(5001);
    const double kept = (1.0 - 1.0 / (7.389056f - 1)) * 10.0;
    EXPECT_EQ(hand.touchScore, -static_cast<float>(kept));
    EXPECT_NEAR(hand.touchScore, -8.435f, 0.001f);
}

TEST(HandStatsTest, DecayKeepsFiftySevenPercentAfterTwoMilliseconds) {
    HandStats hand;
    hand.noiseEndTime = 5000;
    hand.touchScore = 10.0f;
    hand.decayTouchScore(5002);
    EXPECT_EQ(hand.touchScore, static_cast<float>((1.0 - std::exp(1.0) / (7.389056f - 1)) * 10.0));
}

TEST(HandStatsTest, DecayClearsTheScoreAfterThreeMillisecondsOrAtTheSameTime) {
    HandStats hand;
    hand.noiseEndTime = 5000;
    hand.touchScore = 10.0f;
    hand.decayTouchScore(5003);
    EXPECT_EQ(hand.touchScore, 0.0f);
    hand.touchScore = 10.0f;
    hand.decayTouchScore(5000);
    EXPECT_EQ(hand.touchScore, 0.0f);
}

TEST(HandStatsTest, WithoutHoldSuppressionEveryTouchEndCountsAsATapAlsoAfterAHold) {
    HandStats hand;
    hand.EnableHoldSuppression = false;
    const HandFrame frame = HandFrame().on(2, 3.0f);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1501);
    ASSERT_TRUE(hand.holding());
    hand.updateHandState(kIdle.pixels, kIdle.virtualPixels, 1509);
    EXPECT_FALSE(hand.holding());
    EXPECT_TRUE(hand.tapCandidate());
}

TEST(HandStatsTest, WithoutTapSuppressionARejectedTouchEndStillCountsAsATap) {
    HandStats hand;
    hand.EnableTapSuppression = false;
    const HandFrame frame = HandFrame().on(2, 3.0f);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.updateHandState(kIdle.pixels, kIdle.virtualPixels, 1000);  // duration 0: rejected
    EXPECT_TRUE(hand.isTapRejected());
    EXPECT_TRUE(hand.tapCandidate());
    EXPECT_TRUE(hand.tapDetected());
    EXPECT_EQ(hand.lastEventTime, 1000u);
    EXPECT_EQ(hand.eventRegion, PixelRegion::PlayPause);
}

TEST(HandStatsTest, AcceptedTapRecordsTheEventTimeAndRegion) {
    HandStats hand;
    const HandFrame frame = HandFrame().on(8, 3.0f);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1000);
    hand.updateHandState(frame.pixels, frame.virtualPixels, 1080);
    hand.updateHandState(kIdle.pixels, kIdle.virtualPixels, 1088);
    EXPECT_TRUE(hand.tapDetected());
    EXPECT_EQ(hand.lastEventTime, 1088u);
    EXPECT_EQ(hand.eventRegion, PixelRegion::VolumeUp);
}

// Active region and tap rejection.

TEST(HandStatsTest, PixelsAtOrBelowNoiseLeaveRegionMaxAtZero) {
    HandStats hand;
    HandFrame frame;
    frame.pixels[0].value = 75;
    frame.pixels[7].value = 40;
    frame.pixels[12].value = -300;
    hand.regionMax = {9.0f, 9.0f, 9.0f, 9.0f};
    hand.updateRegionMax(frame.pixels);
    EXPECT_EQ(hand.regionMax, (std::array<float, 4>{}));
}

TEST(HandStatsTest, RegionMaxKeepsEachRegionsLargestExcessOverNoiseAndNeverWritesRegionZero) {
    HandStats hand;
    HandFrame frame;
    frame.pixels[0].value = 100;
    frame.pixels[10].value = 300;  // K, region 1
    frame.pixels[7].value = 176;
    frame.pixels[13].value = 80;
    frame.pixels[14].index = 15;  // no region
    frame.pixels[14].value = 900;
    hand.updateRegionMax(frame.pixels);
    EXPECT_EQ(hand.regionMax, (std::array<float, 4>{0.0f, 225.0f, 5.0f, 101.0f}));
}

TEST(HandStatsTest, TouchWithDurationZeroLeavesStrengthPerDurationZeroAndIsRejected) {
    HandStats hand;
    hand.maxOnStrength = 3.0f;
    hand.touchStartTime = 2000;
    hand.touchEndTime = 2000;
    hand.noiseStartTime = 1990;
    hand.lastEventTime = 0;
    hand.updateTapRejection(kIdle.pixels, kIdle.virtualPixels);
    EXPECT_EQ(hand.strengthPerDuration, 0.0f);
    EXPECT_EQ(hand.peakStrength, 600.0f);
    EXPECT_EQ(hand.strengthRate, 600.0f / 10.0f - 0.51f);
    EXPECT_EQ(hand.durationRatio, -0.25f);
    EXPECT_TRUE(hand.isTapRejected());
}

TEST(HandStatsTest, TapFeaturesAndScoreOfAnOrdinaryTap) {
    HandStats hand;
    hand.maxOnStrength = 3.0f;
    hand.noiseStartTime = 1000;
    hand.touchStartTime = 1000;
    hand.touchEndTime = 1100;
    hand.lastEventTime = 0;
    hand.updateTapRejection(kIdle.pixels, kIdle.virtualPixels);
    EXPECT_EQ(hand.strengthRate, 6.0f - 0.51f);
    EXPECT_EQ(hand.strengthPerDuration, 6.0f - 0.65f);
    EXPECT_EQ(hand.durationRatio, 0.75f);
    EXPECT_EQ(hand.activePixelCount, 21);
    EXPECT_EQ(hand.tapScore, 0.1886f * 21.0f + 0.2772f * (6.0f - 0.51f) + 2.7205f * 0.75f - 2.4116f);
    EXPECT_FALSE(hand.isTapRejected());
}

TEST(HandStatsTest, SpanIsTheShorterOfTheTimesSinceNoiseStartAndSinceTheLastEvent) {
    HandStats hand;
    hand.maxOnStrength = 3.0f;
    hand.noiseStartTime = 1000;
    hand.touchStartTime = 1000;
    hand.touchEndTime = 1100;
    hand.lastEventTime = 1050;
    hand.updateTapRejection(kIdle.pixels, kIdle.virtualPixels);
    EXPECT_EQ(hand.strengthRate, 600.0f / 50.0f - 0.51f);
    EXPECT_EQ(hand.durationRatio, 100.0f / 50.0f - 0.25f);
}

TEST(HandStatsTest, StrengthRateAndDurationRatioOfExactlyZeroLeaveTheTapStanding) {
    HandStats hand;
    hand.ActivationThreshold = 1.0f;
    hand.maxOnStrength = 51.0f;  // peak 51 over a 100 ms span: 0.51 per ms
    hand.noiseStartTime = 1000;
    hand.touchStartTime = 1075;
    hand.touchEndTime = 1100;    // 25 ms of 100: a quarter
    hand.updateTapRejection(kIdle.pixels, kIdle.virtualPixels);
    EXPECT_EQ(hand.strengthRate, 0.0f);
    EXPECT_EQ(hand.durationRatio, 0.0f);
    EXPECT_GT(hand.strengthPerDuration, 0.0f);
    EXPECT_GT(hand.tapScore, 0.0f);
    EXPECT_FALSE(hand.isTapRejected());
}

TEST(HandStatsTest, StrengthPerDurationOfExactlyZeroRejectsTheTap) {
    HandStats hand;
    hand.ActivationThreshold = 1.0f;
    hand.maxOnStrength = 13.0f;  // peak 13 over 20 ms: 0.65 per ms
    hand.noiseStartTime = 1000;
    hand.touchStartTime = 1005;
    hand.touchEndTime = 1025;
    hand.updateTapRejection(kIdle.pixels, kIdle.virtualPixels);
    EXPECT_EQ(hand.strengthPerDuration, 0.0f);
    EXPECT_GT(hand.strengthRate, 0.0f);
    EXPECT_GT(hand.durationRatio, 0.0f);
    EXPECT_GT(hand.tapScore, 0.0f);
    EXPECT_TRUE(hand.isTapRejected());
}

// A 100 ms tap of strength `strength` with `count` elements above noise that were never on.
HandStats tapWithNonActivePixels(int count, float strength) {
    HandStats hand;
    hand.maxOnStrength = strength;
    hand.noiseStartTime = 1000;
    hand.touchStartTime = 1000;
    hand.touchEndTime = 1100;
    HandFrame frame;
    for (int i = 0; i < count; ++i) {
        Pixel& p = i < 15 ? static_cast<Pixel&>(frame.pixels[static_cast<size_t>(i)])
                          : frame.virtualPixels[static_cast<size_t>(i - 15)];
        p.wasAboveNoise = true;
        p.wasOn = false;
    }
    // Above noise and on at some time: active, not counted.
    frame.virtualPixels[22].wasAboveNoise = true;
    frame.virtualPixels[22].wasOn = true;
    hand.updateTapRejection(frame.pixels, frame.virtualPixels);
    return hand;
}

TEST(HandStatsTest, TwentyTwoNonActivePixelsRejectTheTapWhateverTheScore) {
    const HandStats hand = tapWithNonActivePixels(22, 1000.0f);
    EXPECT_EQ(hand.activePixelCount, -1);
    EXPECT_GT(hand.tapScore, 0.0f);
    EXPECT_GT(hand.strengthRate, 0.0f);
    EXPECT_GT(hand.strengthPerDuration, 0.0f);
    EXPECT_GT(hand.durationRatio, 0.0f);
    EXPECT_TRUE(hand.isTapRejected());
}

TEST(HandStatsTest, TwentyOneNonActivePixelsGiveActivePixelCountZero) {
    const HandStats hand = tapWithNonActivePixels(21, 3.0f);
    EXPECT_EQ(hand.activePixelCount, 0);
    EXPECT_EQ(hand.tapScore, 0.1886f * 0.0f + 0.2772f * (6.0f - 0.51f) + 2.7205f * 0.75f - 2.4116f);
    EXPECT_FALSE(hand.isTapRejected());
}

std::pair<int, int> twoFirstIndices(std::span<const Pixel> pixels) {
    const auto [first, second] = twoFirstByMaxNormalizedAboveNoise(pixels);
    return {first->index, second->index};
}

TEST(HandStatsTest, PixelsWhoseKeysAreAllZeroComeInIndexOrder) {
    EXPECT_EQ(twoFirstIndices(kIdle.pixels), std::make_pair(0, 1));  // "A", "B"
}

TEST(HandStatsTest, TheLargestKeyComesFirstAndEqualKeysKeepIndexOrder) {
    HandFrame frame;
    frame.pixels[9].maxNormalizedAboveNoise = 2.0f;
    frame.pixels[4].maxNormalizedAboveNoise = 3.0f;
    frame.pixels[2].maxNormalizedAboveNoise = 2.0f;
    EXPECT_EQ(twoFirstIndices(frame.pixels), std::make_pair(4, 2));
}

TEST(HandStatsTest, EqualKeysComeByAscendingIndexWhateverTheirPlaceInTheList) {
    std::vector<Pixel> pixels;
    for (int i = 14; i >= 0; --i) pixels.emplace_back(i, 1.0f);  // O first, A last
    pixels[3].maxNormalizedAboveNoise = 2.0f;                     // "L"
    pixels[12].maxNormalizedAboveNoise = 2.0f;                    // "C"
    EXPECT_EQ(twoFirstIndices(pixels), std::make_pair(2, 11));
    pixels[3].maxNormalizedAboveNoise = 0.0f;
    pixels[12].maxNormalizedAboveNoise = 0.0f;
    EXPECT_EQ(twoFirstIndices(pixels), std::make_pair(0, 1));  // all at 0: "A" and "B", from the end
}

TEST(HandStatsTest, AKeyThatIsNotANumberComesLast) {
    HandFrame frame;
    frame.pixels[0].maxNormalizedAboveNoise = std::numeric_limits<float>::quiet_NaN();
    frame.pixels[1].maxNormalizedAboveNoise = std::numeric_limits<float>::quiet_NaN();
    EXPECT_EQ(twoFirstIndices(frame.pixels), std::make_pair(2, 3));
}

TEST(HandStatsTest, TheRowFindsTheSameTwoFirstPixelsAsTheListOnTiesNotANumberSignedZeroAndRepeatedIndices) {
    const float keys[] = {0.0f, -0.0f, 2.0f, 2.0f, std::numeric_limits<float>::quiet_NaN(), -1.0f, 3.5f,
                          -std::numeric_limits<float>::infinity(), 0.5f};
    std::mt19937 random(7);
    for (int round = 0; round < 2000; ++round) {
        std::vector<Pixel> pixels;
        for (int i = 0; i < 15; ++i) {
            // Mostly each pixel its own index; now and then a list in another order or with repeats.
            const int index = round % 3 == 0 ? static_cast<int>(random() % 15) : round % 3 == 1 ? 14 - i : i;
            pixels.emplace_back(index, 1.0f);
            pixels.back().maxNormalizedAboveNoise = keys[random() % std::size(keys)];
        }
        const auto [first, second] = twoFirstByMaxNormalizedAboveNoise(pixels);
        const auto [firstAt, secondAt] = twoFirstByMaxNormalizedAboveNoise(RealPixels::of(std::span<const Pixel>(pixels)));
        ASSERT_EQ(firstAt, static_cast<size_t>(first - pixels.data())) << "round " << round;
        ASSERT_EQ(secondAt, static_cast<size_t>(second - pixels.data())) << "round " << round;
    }
}

TEST(HandStatsTest, FewerThanTwoPixelsFailWithTheMessageVector) {
    const std::vector<Pixel> one{Pixel(0, 1.0f)};
    EXPECT_THROW(twoFirstByMaxNormalizedAboveNoise(one), std::out_of_range);
}

// A touch starting 100 ms after the last event: time bias 0.65.
HandStats handSoonAfterAnEventIn(PixelRegion eventRegion, int32_t maxOnIndex) {
    HandStats hand;
    hand.lastEventTime = 1000;
    hand.eventRegion = eventRegion;
    hand.maxOnIndex = maxOnIndex;
    return hand;
}

TEST(HandStatsTest, LastEventsRegionIsKeptOnlyWhenTheSecondPixelIsAboveTheBiasedFirst) {
    HandFrame frame;
    frame.pixels[2].maxNormalizedAboveNoise = 2.0f;  // "C", region 1, strongest
    frame.pixels[7].maxNormalizedAboveNoise = 1.3f;  // "H", region 3: exactly 2.0 x 0.65
    HandStats equal = handSoonAfterAnEventIn(PixelRegion::VolumeUp, 2);
    EXPECT_EQ(equal.updateActiveRegion(frame.pixels, frame.virtualPixels, 1100), PixelRegion::PlayPause);

    frame.pixels[7].maxNormalizedAboveNoise = std::nextafter(1.3f, 2.0f);
    HandStats above = handSoonAfterAnEventIn(PixelRegion::VolumeUp, 2);
    EXPECT_EQ(above.updateActiveRegion(frame.pixels, frame.virtualPixels, 1100), PixelRegion::VolumeUp);
}

TEST(HandStatsTest, TouchCentredOnKGoesTowardsMOnlyWhenKLMIsAboveSevenTenthsOfK) {
    HandFrame frame;
    frame.pixels[10].maxNormalizedAboveNoise = 2.0f;          // "K"
    frame.pixels[12].maxNormalizedAboveNoise = 1.0f;          // "M"
    frame.virtualPixels[19].maxNormalizedAboveNoise = 1.4f;  // "KLM": exactly 0.7 x 2.0
    HandStats equal = handSoonAfterAnEventIn(PixelRegion::None, 10);
    EXPECT_EQ(equal.updateActiveRegion(frame.pixels, frame.virtualPixels, 1100), PixelRegion::PlayPause);

    frame.virtualPixels[19].maxNormalizedAboveNoise = std::nextafter(1.4f, 2.0f);
    HandStats above = handSoonAfterAnEventIn(PixelRegion::None, 10);
    EXPECT_EQ(above.updateActiveRegion(frame.pixels, frame.virtualPixels, 1100), PixelRegion::VolumeDown);
}

TEST(HandStatsTest, TouchCentredOnKSoonAfterAnEventInRegionTwoNeedsKLMAboveTheTimeBiasOfK) {
    HandFrame frame;
    frame.pixels[10].maxNormalizedAboveNoise = 2.0f;
    frame.pixels[12].maxNormalizedAboveNoise = 1.0f;
    frame.virtualPixels[19].maxNormalizedAboveNoise = 1.3f;  // exactly 0.65 x 2.0
    HandStats equal = handSoonAfterAnEventIn(PixelRegion::VolumeDown, 10);
    EXPECT_EQ(equal.updateActiveRegion(frame.pixels, frame.virtualPixels, 1100), PixelRegion::PlayPause);

    frame.virtualPixels[19].maxNormalizedAboveNoise = std::nextafter(1.3f, 2.0f);
    HandStats above = handSoonAfterAnEventIn(PixelRegion::VolumeDown, 10);
    EXPECT_EQ(above.updateActiveRegion(frame.pixels, frame.virtualPixels, 1100), PixelRegion::VolumeDown);
}

TEST(HandStatsTest, TouchCentredOnKIgnoresASecondPixelAtTheNoiseLevel) {
    HandFrame frame;
    frame.pixels[10].maxNormalizedAboveNoise = 2.0f;
    frame.pixels[8].maxNormalizedAboveNoise = 0.375f;        // "I": exactly 75 / 200
    frame.virtualPixels[18].maxNormalizedAboveNoise = 2.0f;  // "IJK"
    HandStats atNoise = handSoonAfterAnEventIn(PixelRegion::None, 10);
    EXPECT_EQ(atNoise.updateActiveRegion(frame.pixels, frame.virtualPixels, 1100), PixelRegion::PlayPause);

    frame.pixels[8].maxNormalizedAboveNoise = std::nextafter(0.375f, 1.0f);
    HandStats aboveNoise = handSoonAfterAnEventIn(PixelRegion::None, 10);
    EXPECT_EQ(aboveNoise.updateActiveRegion(frame.pixels, frame.virtualPixels, 1100), PixelRegion::VolumeUp);
}

TEST(HandStatsTest, DuringAHoldWithThePreviousMaximumZeroTheTouchMovesOnceTheCurrentMaximumIsAboveZero) {
    HandStats hand;
    hand.activeRegion = PixelRegion::VolumeDown;
    hand.regionMax = {0.0f, 0.0f, 0.0f, 0.0f};
    HandFrame frame;
    frame.pixels[11].value = 100;  // L, region 2: 25 above noise
    frame.pixels[7].value = 110;   // H, region 3: 35 above noise
    EXPECT_EQ(hand.changeActiveRegion(frame.pixels, 7), PixelRegion::VolumeUp);
    EXPECT_EQ(hand.previousActiveRegion, PixelRegion::VolumeDown);
    EXPECT_EQ(hand.regionSwitchFactor, 1.3f);
    EXPECT_EQ(hand.regionMax, (std::array<float, 4>{0.0f, 0.0f, 25.0f, 35.0f}));
}

TEST(HandStatsTest, DuringAHoldTheSameRegionIsKeptWithoutUpdatingRegionMax) {
    HandStats hand;
    hand.activeRegion = PixelRegion::VolumeDown;
    hand.regionMax = {0.0f, 0.0f, 7.0f, 0.0f};
    HandFrame frame;
    frame.pixels[12].value = 500;
    EXPECT_EQ(hand.changeActiveRegion(frame.pixels, 12), PixelRegion::VolumeDown);
    EXPECT_EQ(hand.regionMax, (std::array<float, 4>{0.0f, 0.0f, 7.0f, 0.0f}));
}

TEST(HandStatsTest, DuringAHoldTheNewRegionMustHaveGrownByTheSwitchFactor) {
    HandStats hand;
    hand.activeRegion = PixelRegion::VolumeDown;
    hand.regionMax = {0.0f, 0.0f, 400.0f, 100.0f};  // last frame: q = 0.25
    HandFrame frame;
    frame.pixels[12].value = 475;  // M: m' = 400, no drop, k = 1.3
    frame.pixels[7].value = 204;   // H: 129 / 400 is below 1.3 x 0.25
    EXPECT_EQ(hand.changeActiveRegion(frame.pixels, 7), PixelRegion::VolumeDown);
    EXPECT_EQ(hand.regionSwitchFactor, 1.3f);

    hand.regionMax = {0.0f, 0.0f, 400.0f, 100.0f};
    frame.pixels[7].value = 205;  // 130 / 400 equals 1.3 x 0.25 in float: enough
    EXPECT_EQ(hand.changeActiveRegion(frame.pixels, 7), PixelRegion::VolumeUp);
}

TEST(HandStatsTest, DuringAHoldAFallingCurrentRegionRaisesTheSwitchFactorToFive) {
    HandStats hand;
    hand.activeRegion = PixelRegion::VolumeDown;
    hand.regionMax = {0.0f, 0.0f, 400.0f, 100.0f};
    HandFrame frame;
    frame.pixels[12].value = 275;  // m' = 200: a 50 % fall
    frame.pixels[7].value = 400;
    EXPECT_EQ(hand.changeActiveRegion(frame.pixels, 7), PixelRegion::VolumeUp);  // 325/200 >= 5 x 0.25
    EXPECT_EQ(hand.regionSwitchFactor, 5.0f);
}

TEST(HandStatsTest, DuringAHoldTheCurrentRegionGoneQuietGivesWayAtOnce) {
    HandStats hand;
    hand.activeRegion = PixelRegion::PlayPause;
    hand.regionMax = {0.0f, 500.0f, 0.0f, 0.0f};
    HandFrame frame;
    frame.pixels[13].value = 90;
    EXPECT_EQ(hand.changeActiveRegion(frame.pixels, 13), PixelRegion::VolumeDown);
}

TEST(HandStatsTest, FromNoRegionTheHoldTakesTheStrongestPixelsRegion) {
    HandStats hand;
    hand.activeRegion = PixelRegion::None;
    EXPECT_EQ(hand.changeActiveRegion(kIdle.pixels, 8), PixelRegion::VolumeUp);
    hand.activeRegion = PixelRegion::VolumeUp;
    EXPECT_EQ(hand.changeActiveRegion(kIdle.pixels, 40), PixelRegion::None);
}

}  // namespace
}  // namespace TolkaTouch

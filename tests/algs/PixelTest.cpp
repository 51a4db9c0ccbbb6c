#include "algs/Pixel.h"

#include <gtest/gtest.h>

#include <cmath>

namespace TolkaTouch {
namespace {

TEST(PixelTest, ConstructorSetsGainAndIndexAndClearsTheRest) {
    const Pixel pixel(3, 1.8837f);
    EXPECT_EQ(pixel.gain, 1.8837f);
    EXPECT_EQ(pixel.index, 3);
    EXPECT_EQ(pixel.normalized, 0.0f);
    EXPECT_EQ(pixel.peak, 0.0f);
    EXPECT_EQ(pixel.valley, 0.0f);
    EXPECT_FALSE(pixel.isOn);
    EXPECT_FALSE(pixel.aboveNoise);
    EXPECT_FALSE(pixel.wasAboveNoise);
    EXPECT_FALSE(pixel.wasOn);
    EXPECT_EQ(pixel.maxNormalizedAboveNoise, 0.0f);
}

TEST(PixelTest, FreshPixelAtNormalisedOneStaysOff) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(200, 200.0f);
    EXPECT_EQ(pixel.normalized, 1.0f);
    EXPECT_FALSE(pixel.isOn);
}

TEST(PixelTest, FreshPixelAtNormalisedOnePointZeroZeroZeroOneTurnsOn) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(10001, 10000.0f);
    EXPECT_EQ(pixel.normalized, 1.0001f);
    EXPECT_TRUE(pixel.isOn);
    EXPECT_TRUE(pixel.wasOn);
    EXPECT_EQ(pixel.peak, 1.0001f);
    EXPECT_EQ(pixel.valley, 1.0001f);
}

TEST(PixelTest, OnPixelAtPeakTenTurnsOffAtSixAndTakesSixAsPeakAndValley) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(2000, 200.0f);
    ASSERT_TRUE(pixel.isOn);
    ASSERT_EQ(pixel.peak, 10.0f);
    ASSERT_EQ(pixel.valley, 10.0f);

    pixel.updatePixelState(1200, 200.0f);
    EXPECT_EQ(pixel.normalized, 6.0f);
    EXPECT_FALSE(pixel.isOn);
    EXPECT_EQ(pixel.peak, 6.0f);
    EXPECT_EQ(pixel.valley, 6.0f);
    EXPECT_TRUE(pixel.wasOn);
}

TEST(PixelTest, OnPixelStaysOnAboveSixtyPercentOfItsPeakAndFollowsThePeakUp) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(2000, 200.0f);
    pixel.updatePixelState(1201, 200.0f);
    EXPECT_TRUE(pixel.isOn);
    EXPECT_EQ(pixel.peak, 10.0f);
    EXPECT_EQ(pixel.valley, 6.005f);
    pixel.updatePixelState(3000, 200.0f);
    EXPECT_EQ(pixel.peak, 15.0f);
}

TEST(PixelTest, OffPixelTurnsOnOnlyAboveItsValleyDividedBySixTenths) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(2000, 200.0f);  // on, peak 10
    pixel.updatePixelState(800, 200.0f);   // off at 4.0, valley 4.0
    ASSERT_FALSE(pixel.isOn);
    ASSERT_EQ(pixel.valley, 4.0f);
    pixel.updatePixelState(1300, 200.0f);  // 6.5 is below 4.0 / 0.6
    EXPECT_FALSE(pixel.isOn);
    EXPECT_EQ(pixel.valley, 4.0f);
    EXPECT_EQ(pixel.peak, 6.5f);
    pixel.updatePixelState(1400, 200.0f);  // 7.0 is above it
    EXPECT_TRUE(pixel.isOn);
}

TEST(PixelTest, NegativeFiftyAtGainOnePointNineTwoOneNineTruncatesTowardZeroToMinusNinetySix) {
    Pixel pixel(0, 1.9219f);
    pixel.updatePixelState(-50, 200.0f);
    EXPECT_EQ(pixel.value, -96);
    EXPECT_EQ(pixel.normalized, -0.48f);
}

TEST(PixelTest, ValueSeventyFiveIsNoiseAndLeavesWasAboveNoiseUntouched) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(75, 200.0f);
    EXPECT_FALSE(pixel.aboveNoise);
    EXPECT_FALSE(pixel.wasAboveNoise);
    EXPECT_EQ(pixel.maxNormalizedAboveNoise, 0.0f);

    pixel.wasAboveNoise = true;  // from an earlier frame of the touch
    pixel.updatePixelState(75, 200.0f);
    EXPECT_TRUE(pixel.wasAboveNoise);
}

TEST(PixelTest, ValueSeventySixSetsAboveNoiseAndWasAboveNoise) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(76, 200.0f);
    EXPECT_TRUE(pixel.aboveNoise);
    EXPECT_TRUE(pixel.wasAboveNoise);
    EXPECT_EQ(pixel.maxNormalizedAboveNoise, 0.38f);
}

TEST(PixelTest, MaxNormalizedAboveNoiseKeepsTheLargestAboveNoiseValue) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(400, 200.0f);
    pixel.updatePixelState(100, 200.0f);
    EXPECT_EQ(pixel.maxNormalizedAboveNoise, 2.0f);
    pixel.updatePixelState(600, 200.0f);
    EXPECT_EQ(pixel.maxNormalizedAboveNoise, 3.0f);
}

TEST(PixelTest, ResetGlobalStatsClearsOnlyThePerTouchStatistics) {
    Pixel pixel(4, 1.0f);
    pixel.updatePixelState(600, 200.0f);
    pixel.resetGlobalStats();
    EXPECT_FALSE(pixel.wasAboveNoise);
    EXPECT_FALSE(pixel.wasOn);
    EXPECT_EQ(pixel.maxNormalizedAboveNoise, 0.0f);
    EXPECT_TRUE(pixel.isOn);
    EXPECT_TRUE(pixel.aboveNoise);
    EXPECT_EQ(pixel.value, 600);
    EXPECT_EQ(pixel.peak, 3.0f);
    EXPECT_EQ(pixel.valley, 3.0f);
}

TEST(PixelTest, IndexTenKMapsToRegionOneAndIndexFifteenToNone) {
    EXPECT_EQ(Pixel(10, 1.0f).getPixelRegion(), PixelRegion::PlayPause);
    EXPECT_EQ(Pixel(15, 1.0f).getPixelRegion(), PixelRegion::None);
}

TEST(PixelTest, EveryIndexMapsToItsRegion) {
    const PixelRegion expected[] = {
        PixelRegion::PlayPause, PixelRegion::PlayPause,  PixelRegion::PlayPause,  PixelRegion::PlayPause,
        PixelRegion::PlayPause, PixelRegion::PlayPause,  PixelRegion::VolumeUp,   PixelRegion::VolumeUp,
        PixelRegion::VolumeUp,  PixelRegion::VolumeUp,   PixelRegion::PlayPause,  PixelRegion::VolumeDown,
        PixelRegion::VolumeDown, PixelRegion::VolumeDown, PixelRegion::VolumeDown,
    };
    for (int i = 0; i < 15; ++i) EXPECT_EQ(pixelRegionOfIndex(i), expected[i]) << "index " << i;
    EXPECT_EQ(pixelRegionOfIndex(-1), PixelRegion::None);
    EXPECT_EQ(pixelRegionOfIndex(65), PixelRegion::None);
}

TEST(PixelTest, ZeroDivisorIsNotGuardedAndFollowsFloatRules) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(100, 0.0f);
    EXPECT_TRUE(std::isinf(pixel.normalized));
    EXPECT_TRUE(pixel.isOn);
    pixel.updatePixelState(0, 0.0f);
    EXPECT_TRUE(std::isnan(pixel.normalized));
    EXPECT_FALSE(pixel.isOn);
}

}  // namespace
}  // namespace TolkaTouch

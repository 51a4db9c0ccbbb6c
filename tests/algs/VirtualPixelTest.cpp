#include "algs/VirtualPixel.h"

#include <gtest/gtest.h>

namespace TolkaTouch {
namespace {

TEST(VirtualPixelTest, ConstructorKeepsNameGainAndIndex) {
    const VirtualPixel pixel(65, 0.6667f, "ADEF");
    EXPECT_EQ(pixel.name, "ADEF");
    EXPECT_EQ(pixel.gain, 0.6667f);
    EXPECT_EQ(pixel.index, 65);
    EXPECT_FALSE(pixel.isOn);
}

TEST(VirtualPixelTest, UpdateRunsThePixelUpdateThenTakesTheGivenIndex) {
    VirtualPixel pixel(65, 0.6667f, "ADEF");
    pixel.updatePixelState(1200, 200.0f, 3);
    EXPECT_EQ(pixel.value, 800);  // 1200 x 0.6667, truncated
    EXPECT_EQ(pixel.normalized, 4.0f);
    EXPECT_TRUE(pixel.isOn);
    EXPECT_EQ(pixel.index, 3);
    EXPECT_EQ(pixel.getPixelRegion(), PixelRegion::PlayPause);
}

TEST(VirtualPixelTest, RegionIsThatOfTheStrongestMember) {
    VirtualPixel pixel(75, 0.4f, "KLM");
    pixel.updatePixelState(1000, 200.0f, 12);
    EXPECT_EQ(pixel.getPixelRegion(), PixelRegion::VolumeDown);
}

}  // namespace
}  // namespace TolkaTouch

#include "tools/FingerModel.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>

namespace TolkaTouch::Tools {
namespace {

int padCount(int pixel) {
    const auto& pads = FingerModel::pads();
    return static_cast<int>(std::count_if(pads.begin(), pads.end(), [pixel](const Pad& pad) { return pad.pixel == pixel; }));
}

const Pad& firstPad(int pixel) {
    const auto& pads = FingerModel::pads();
    return *std::find_if(pads.begin(), pads.end(), [pixel](const Pad& pad) { return pad.pixel == pixel; });
}

TEST(FingerModelTest, PadsLieWhereTheImageDrawingPutsTheLetters) {
    EXPECT_EQ(FingerModel::pads().size(), 23u);
    for (int pixel : {0, 1, 2, 3, 4, 5, 9, 11}) EXPECT_EQ(padCount(pixel), 2) << pixel;
    for (int pixel : {6, 7, 8, 10, 12, 13, 14}) EXPECT_EQ(padCount(pixel), 1) << pixel;
    EXPECT_DOUBLE_EQ(firstPad(10).centre.x, 0.0);  // K in the middle
    EXPECT_DOUBLE_EQ(firstPad(10).centre.y, 0.0);
    EXPECT_DOUBLE_EQ(firstPad(8).centre.y, -5.0);  // I above it
    EXPECT_DOUBLE_EQ(firstPad(12).centre.y, 5.0);  // M below it
    EXPECT_DOUBLE_EQ(firstPad(7).centre.x, -2.5);  // H left of G on the top row
    EXPECT_DOUBLE_EQ(firstPad(6).centre.x, 2.5);
    EXPECT_DOUBLE_EQ(firstPad(6).centre.y, -6.0);
}

TEST(FingerModelTest, ZoneCentresSitOnTheirZonesPixels) {
    EXPECT_DOUBLE_EQ(FingerModel::zoneCentre(Zone::PlayPause).y, firstPad(10).centre.y);
    EXPECT_DOUBLE_EQ(FingerModel::zoneCentre(Zone::VolumeUp).y, firstPad(8).centre.y);
    EXPECT_DOUBLE_EQ(FingerModel::zoneCentre(Zone::VolumeDown).y, firstPad(12).centre.y);
}

TEST(FingerModelTest, NothingOnTheSurfaceReadsAsNoiseAroundTheBaseline) {
    FingerModel model(3);
    for (int frame = 0; frame < 200; ++frame) {
        const SensorReadings readings = model.read(std::nullopt);
        for (size_t pixel = 0; pixel < kPixelCount; ++pixel) {
            EXPECT_LT(std::abs(readings.pixels[pixel]), 20);
            EXPECT_GT(readings.rawPixels[pixel], 1300);
            EXPECT_LT(readings.rawPixels[pixel], 2300);
        }
    }
}

TEST(FingerModelTest, ScaledReadingUnderTheFingerIsItsStrength) {
    FingerModel model(3);
    const SensorReadings readings = model.read(FingerContact{FingerModel::zoneCentre(Zone::PlayPause), 700.0, 2.0});
    // K alone lies under the finger; times its gain the reading is the strength, give or take noise.
    EXPECT_NEAR(readings.pixels[10] * FingerModel::pixelGain(10), 700.0, 25.0);
    // The far zones hardly feel it.
    EXPECT_LT(readings.pixels[13] * FingerModel::pixelGain(13), 40.0);
    EXPECT_LT(readings.pixels[7] * FingerModel::pixelGain(7), 40.0);
}

TEST(FingerModelTest, SameSeedGivesTheSameReadings) {
    FingerModel first(9);
    FingerModel second(9);
    const FingerContact contact{FingerModel::zoneCentre(Zone::VolumeUp), 650.0, 2.0};
    for (int frame = 0; frame < 10; ++frame) {
        const SensorReadings a = first.read(contact);
        const SensorReadings b = second.read(contact);
        EXPECT_EQ(a.pixels, b.pixels);
        EXPECT_EQ(a.rawPixels, b.rawPixels);
    }
}

TEST(FingerModelTest, ReadingsSaturateInsteadOfWrapping) {
    FingerModel model(1);
    const SensorReadings readings = model.read(FingerContact{FingerModel::zoneCentre(Zone::VolumeUp), 1e9, 2.0});
    EXPECT_EQ(readings.pixels[8], 32767);
}

}  // namespace
}  // namespace TolkaTouch::Tools

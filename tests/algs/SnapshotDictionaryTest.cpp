#include "algs/SnapshotDictionary.h"

#include <gtest/gtest.h>

#include "algs/Algs.h"

namespace TolkaTouch {
namespace {

TEST(SnapshotDictionaryTest, EveryNumberIsThereUnderTheNamesOfThePythonFrames) {
    FrameSnapshot frame;
    frame.frameNumber = 42;
    frame.timeMs = 1000;
    frame.readings[2] = 312;
    frame.pixelValues[2] = 601;
    frame.pixelNormalized[2] = 0.1f;
    frame.pixelOn[2] = true;
    frame.virtualValues[22] = -7;
    frame.virtualNormalized[22] = 0.3f;
    frame.virtualOn[22] = true;
    frame.touchScore = 12.5f;
    frame.svmScore = -0.25f;
    frame.strengthRate = 1.5f;
    frame.strengthPerDuration = 0.7f;
    frame.durationRatio = 0.2f;
    frame.activePixelCount = 4;
    frame.tapScore = 2.0f;
    frame.touching = true;
    frame.aboveNoise = true;
    frame.sinceTouchStartMs = -3;
    frame.touchLengthMs = 96;
    frame.verdict = {Transition::HoldMoved, true, HoldClock::Past, PixelRegion::VolumeUp};
    const PropertyValue dictionary = snapshotDictionary(frame);
    ASSERT_TRUE(dictionary.isDictionary());
    EXPECT_EQ(dictionary.dictionary()->size(), 24u);
    EXPECT_EQ(*dictionary.find("frame"), PropertyValue(42u));
    EXPECT_EQ(*dictionary.find("time"), PropertyValue(1000u));
    EXPECT_EQ(dictionary.find("readings")->array()->size(), 15u);
    EXPECT_EQ(dictionary.find("readings")->array()->at(2), PropertyValue(312));
    EXPECT_EQ(dictionary.find("pixel_values")->array()->at(2), PropertyValue(601));
    // A float keeps its exact value, as the Python package's float32 arrays hold it.
    EXPECT_EQ(dictionary.find("normalized")->array()->at(2).floating(), static_cast<double>(0.1f));
    EXPECT_EQ(dictionary.find("on")->array()->at(2), PropertyValue(true));
    EXPECT_EQ(dictionary.find("virtual_values")->array()->size(), 23u);
    EXPECT_EQ(dictionary.find("virtual_values")->array()->at(22), PropertyValue(-7));
    EXPECT_EQ(dictionary.find("virtual_normalized")->array()->at(22).floating(), static_cast<double>(0.3f));
    EXPECT_EQ(dictionary.find("virtual_on")->array()->at(22), PropertyValue(true));
    EXPECT_EQ(*dictionary.find("touch_score"), PropertyValue(12.5f));
    EXPECT_EQ(*dictionary.find("svm_score"), PropertyValue(-0.25f));
    EXPECT_EQ(dictionary.find("strength_rate")->floating(), static_cast<double>(1.5f));
    EXPECT_EQ(dictionary.find("strength_per_duration")->floating(), static_cast<double>(0.7f));
    EXPECT_EQ(dictionary.find("duration_ratio")->floating(), static_cast<double>(0.2f));
    EXPECT_EQ(*dictionary.find("active_pixel_count"), PropertyValue(4));
    EXPECT_EQ(*dictionary.find("tap_score"), PropertyValue(2.0f));
    EXPECT_EQ(*dictionary.find("touching"), PropertyValue(true));
    EXPECT_EQ(*dictionary.find("above_noise"), PropertyValue(true));
    EXPECT_EQ(*dictionary.find("since_touch_start_ms"), PropertyValue(-3));
    EXPECT_EQ(*dictionary.find("touch_length_ms"), PropertyValue(96));
    EXPECT_EQ(*dictionary.find("transition"), PropertyValue(static_cast<unsigned>(Transition::HoldMoved)));
    EXPECT_EQ(*dictionary.find("hold_suppressed"), PropertyValue(true));
    EXPECT_EQ(*dictionary.find("hold_clock"), PropertyValue(static_cast<unsigned>(HoldClock::Past)));
    EXPECT_EQ(*dictionary.find("region"), PropertyValue(static_cast<unsigned>(PixelRegion::VolumeUp)));
}

TEST(SnapshotDictionaryTest, TheRecognizerAnswersItsLastFramesSnapshotForFrameSnapshot) {
    Algs algs;
    int16_t readings[15] = {};
    readings[2] = 312;
    EventList out;
    algs.processTouchFrame(readings, 7, 1000, out);
    EXPECT_EQ(algs.getState("FrameSnapshot"), snapshotDictionary(algs.snapshot()));
    EXPECT_EQ(*algs.getState("FrameSnapshot").find("frame"), PropertyValue(7u));
}

}  // namespace
}  // namespace TolkaTouch

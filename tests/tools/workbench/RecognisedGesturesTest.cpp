// The recognizer's events fold into whole gestures: taps, holds, slides; cancelled touches give
// none, and a reset or the end of the recording ends a hold.

#include <gtest/gtest.h>

#include "tools/workbench/RecognisedGestures.h"

namespace TolkaTouch::Workbench {
namespace {

Gesture event(GestureKind kind, PixelRegion region = PixelRegion::None) { return Gesture{kind, region, 1}; }

TEST(RecognisedGesturesTest, TapTakesItsTouchStartFromMayBegin) {
    GestureCollector collector;
    collector.add(event(GestureKind::MayBegin, PixelRegion::VolumeUp), 1000);
    collector.add(event(GestureKind::Tap, PixelRegion::VolumeUp), 5000);
    const std::vector<RecognisedGesture> expected{{Recognised::Tap, PixelRegion::VolumeUp, PixelRegion::None, 1000, 5000, 5000}};
    EXPECT_EQ(collector.finish(9000), expected);
}

TEST(RecognisedGesturesTest, CancelledTouchGivesNoGesture) {
    GestureCollector collector;
    collector.add(event(GestureKind::MayBegin, PixelRegion::VolumeDown), 1000);
    collector.add(event(GestureKind::Cancel), 2000);
    collector.add(event(GestureKind::Tap, PixelRegion::PlayPause), 3000);
    const std::vector<RecognisedGesture> expected{{Recognised::Tap, PixelRegion::PlayPause, PixelRegion::None, 3000, 3000, 3000}};
    EXPECT_EQ(collector.finish(9000), expected);
}

TEST(RecognisedGesturesTest, HoldThatEndsInAnotherZoneIsASlide) {
    GestureCollector collector;
    collector.add(event(GestureKind::MayBegin, PixelRegion::VolumeUp), 100);
    collector.add(event(GestureKind::HoldStart, PixelRegion::VolumeUp), 600);
    collector.add(event(GestureKind::HoldChange, PixelRegion::PlayPause), 900);
    collector.add(event(GestureKind::HoldChange, PixelRegion::VolumeDown), 950);
    collector.add(event(GestureKind::HoldEnd, PixelRegion::VolumeDown), 1500);
    collector.add(event(GestureKind::MayBegin, PixelRegion::PlayPause), 2000);
    collector.add(event(GestureKind::HoldStart, PixelRegion::PlayPause), 2500);
    collector.add(event(GestureKind::HoldChange, PixelRegion::VolumeUp), 2600);
    collector.add(event(GestureKind::HoldChange, PixelRegion::PlayPause), 2700);
    collector.add(event(GestureKind::HoldEnd, PixelRegion::PlayPause), 3000);
    const std::vector<RecognisedGesture> expected{
        {Recognised::Slide, PixelRegion::VolumeUp, PixelRegion::VolumeDown, 100, 600, 1500},
        {Recognised::Hold, PixelRegion::PlayPause, PixelRegion::None, 2000, 2500, 3000},
    };
    EXPECT_EQ(collector.finish(9000), expected);
}

TEST(RecognisedGesturesTest, ResetAndTheEndOfTheRecordingEndAHold) {
    GestureCollector collector;
    collector.add(event(GestureKind::MayBegin, PixelRegion::VolumeDown), 100);
    collector.add(event(GestureKind::HoldStart, PixelRegion::VolumeDown), 600);
    collector.add(event(GestureKind::Reset), 800);
    collector.add(event(GestureKind::HoldStart, PixelRegion::VolumeDown), 1400);
    const std::vector<RecognisedGesture> expected{
        {Recognised::Hold, PixelRegion::VolumeDown, PixelRegion::None, 100, 600, 800},
        {Recognised::Hold, PixelRegion::VolumeDown, PixelRegion::None, 1400, 1400, 2000},
    };
    EXPECT_EQ(collector.finish(2000), expected);
}

}  // namespace
}  // namespace TolkaTouch::Workbench

#include "tolkatouch/Gesture.h"

#include <gtest/gtest.h>

namespace TolkaTouch {
namespace {

using GestureCodec::encode;
using GestureCodec::decode;

HIDEventRef digitizer(uint32_t mask, uint32_t phase, double y, int64_t frame, uint64_t timestamp) {
    HIDEventRef event = makeDigitizerEvent(mask, phase, y);
    event->setIntegerValue(kDigitizerFrameNumberField, frame);
    event->timestamp = timestamp;
    return event;
}

TEST(GestureTest, JsonLineHoldsExactlyTheFiveFieldsInOrder) {
    EXPECT_EQ(GestureCodec::jsonLine(*digitizer(0x20000, 0, 3.0, 1234, 1002416000000)),
              R"({"frame":1234,"event":"tap","region":3,"phase":0,"timestamp":1002416000000})");
    EXPECT_EQ(GestureCodec::jsonLine(*digitizer(0, 128, 1.0, 7, 5)),
              R"({"frame":7,"event":"may-begin","region":1,"phase":128,"timestamp":5})");
    EXPECT_EQ(GestureCodec::jsonLine(*digitizer(2, 1, 2.0, 8, 6)), R"({"frame":8,"event":"hold-start","region":2,"phase":1,"timestamp":6})");
    EXPECT_EQ(GestureCodec::jsonLine(*digitizer(2, 2, 1.0, 9, 7)), R"({"frame":9,"event":"hold-change","region":1,"phase":2,"timestamp":7})");
    EXPECT_EQ(GestureCodec::jsonLine(*digitizer(2, 4, 1.0, 0, 8)), R"({"frame":0,"event":"hold-end","region":1,"phase":4,"timestamp":8})");
    EXPECT_EQ(GestureCodec::jsonLine(*digitizer(0, 8, 0.0, 10, 9)), R"({"frame":10,"event":"cancel","region":0,"phase":8,"timestamp":9})");
}

TEST(GestureTest, ResetEventHasNoFrameAndRegionZero) {
    HIDEventRef reset = GestureCodec::encode(GestureKind::Reset);
    reset->timestamp = 42;
    EXPECT_EQ(GestureCodec::jsonLine(*reset), R"({"frame":null,"event":"reset","region":0,"phase":0,"timestamp":42})");
}

TEST(GestureTest, UnexpectedEventsAreUnknown) {
    EXPECT_EQ(GestureCodec::kindName(*digitizer(0, 1, 1.0, 0, 0)), "unknown");
    HIDEvent vendor;
    vendor.type = HIDEventType::VendorDefined;
    vendor.usagePage = 0xFF00;
    EXPECT_EQ(GestureCodec::kindName(vendor), "unknown");
}

TEST(GestureTest, VendorEventOtherThanTheResetIsAnUnknownLineWithoutFrame) {
    HIDEventRef other = GestureCodec::encode(GestureKind::Reset);
    other->usage = 7;
    other->timestamp = 3;
    EXPECT_EQ(GestureCodec::jsonLine(*other), R"({"frame":null,"event":"unknown","region":0,"phase":0,"timestamp":3})");
}

TEST(GestureTest, EachGestureIsEncodedWithItsMaskPhaseAndRegion) {
    const auto check = [](GestureKind kind, PixelRegion region, uint32_t mask, uint32_t phase, double y) {
        const HIDEventRef event = encode(kind, region);
        EXPECT_EQ(event->type, HIDEventType::Digitizer);
        EXPECT_EQ(event->eventMask, mask);
        EXPECT_EQ(event->phase, phase);
        EXPECT_EQ(event->y, y);
    };
    check(GestureKind::MayBegin, PixelRegion::VolumeUp, 0, 128, 3.0);
    check(GestureKind::HoldStart, PixelRegion::PlayPause, 2, 1, 1.0);
    check(GestureKind::HoldChange, PixelRegion::VolumeDown, 2, 2, 2.0);
    check(GestureKind::HoldEnd, PixelRegion::VolumeUp, 2, 4, 3.0);
    check(GestureKind::Tap, PixelRegion::VolumeDown, 0x20000, 0, 2.0);
    check(GestureKind::Cancel, PixelRegion::VolumeDown, 0, 8, 0.0);
}

TEST(GestureTest, TheResetIsTheVendorDefinedEventOfTheSurfacesUsagePage) {
    const HIDEventRef reset = encode(GestureKind::Reset);
    EXPECT_EQ(reset->type, HIDEventType::VendorDefined);
    EXPECT_EQ(reset->usagePage, 0xFF60u);
    EXPECT_EQ(reset->usage, 2u);
    EXPECT_EQ(reset->transducerType, 0u);
}

TEST(GestureTest, DecodingAnEncodedGestureGivesItBackWithItsFrameNumber) {
    for (GestureKind kind : {GestureKind::MayBegin, GestureKind::HoldStart, GestureKind::HoldChange,
                             GestureKind::HoldEnd, GestureKind::Tap}) {
        HIDEventRef event = encode(kind, PixelRegion::VolumeDown);
        event->setIntegerValue(kDigitizerFrameNumberField, 77);
        const auto gesture = decode(*event);
        ASSERT_TRUE(gesture);
        EXPECT_EQ(gesture->kind, kind);
        EXPECT_EQ(gesture->region, PixelRegion::VolumeDown);
        EXPECT_EQ(gesture->frameNumber, 77u);
    }
    const auto cancel = decode(*encode(GestureKind::Cancel, PixelRegion::VolumeUp));
    ASSERT_TRUE(cancel);
    EXPECT_EQ(cancel->region, PixelRegion::None);
    const auto reset = decode(*encode(GestureKind::Reset));
    ASSERT_TRUE(reset);
    EXPECT_EQ(reset->kind, GestureKind::Reset);
    EXPECT_FALSE(reset->frameNumber);
}

TEST(GestureTest, EventsThatAreNotGesturesDecodeToNothing) {
    EXPECT_FALSE(decode(*makeDigitizerEvent(0, HIDEventPhase::Began, 1.0)));
    EXPECT_FALSE(decode(*makeDigitizerEvent(2, HIDEventPhase::None, 1.0)));
    EXPECT_FALSE(decode(*makeVendorDefinedEvent(0xFF60, 3)));
    EXPECT_FALSE(decode(*makeVendorDefinedEvent(0xFF00, 2)));
}

TEST(GestureTest, ARegionOutsideTheSurfacesNumbersDecodesAsNone) {
    EXPECT_EQ(decode(*makeDigitizerEvent(0x20000, 0, 16.0))->region, PixelRegion::None);
    EXPECT_EQ(decode(*makeDigitizerEvent(0x20000, 0, -1.0))->region, PixelRegion::None);
}

}  // namespace
}  // namespace TolkaTouch

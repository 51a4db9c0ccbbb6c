#include "platform/HIDEventJson.h"

#include <gtest/gtest.h>

namespace TolkaTouch {
namespace {

HIDEventRef digitizer(uint32_t mask, uint32_t phase, double y, int64_t frame, uint64_t timestamp) {
    HIDEventRef event = makeDigitizerEvent(mask, phase, y);
    event->setIntegerValue(kDigitizerFrameNumberField, frame);
    event->timestamp = timestamp;
    return event;
}

TEST(HIDEventJsonTest, JsonLineHoldsExactlyTheFiveFieldsInOrder) {
    EXPECT_EQ(eventJsonLine(*digitizer(0x20000, 0, 3.0, 1234, 1002416000000)),
              R"({"frame":1234,"event":"tap","region":3,"phase":0,"timestamp":1002416000000})");
    EXPECT_EQ(eventJsonLine(*digitizer(0, 128, 1.0, 7, 5)),
              R"({"frame":7,"event":"may-begin","region":1,"phase":128,"timestamp":5})");
    EXPECT_EQ(eventJsonLine(*digitizer(2, 1, 2.0, 8, 6)), R"({"frame":8,"event":"hold-start","region":2,"phase":1,"timestamp":6})");
    EXPECT_EQ(eventJsonLine(*digitizer(2, 2, 1.0, 9, 7)), R"({"frame":9,"event":"hold-change","region":1,"phase":2,"timestamp":7})");
    EXPECT_EQ(eventJsonLine(*digitizer(2, 4, 1.0, 0, 8)), R"({"frame":0,"event":"hold-end","region":1,"phase":4,"timestamp":8})");
    EXPECT_EQ(eventJsonLine(*digitizer(0, 8, 0.0, 10, 9)), R"({"frame":10,"event":"cancel","region":0,"phase":8,"timestamp":9})");
}

TEST(HIDEventJsonTest, ResetEventHasNoFrameAndRegionZero) {
    HIDEventRef reset = makeFirmwareResetEvent();
    reset->timestamp = 42;
    EXPECT_EQ(eventJsonLine(*reset), R"({"frame":null,"event":"reset","region":0,"phase":0,"timestamp":42})");
}

TEST(HIDEventJsonTest, UnexpectedEventsAreUnknown) {
    EXPECT_EQ(eventKindName(*digitizer(0, 1, 1.0, 0, 0)), "unknown");
    HIDEvent vendor;
    vendor.type = HIDEventType::VendorDefined;
    vendor.usagePage = 0xFF00;
    EXPECT_EQ(eventKindName(vendor), "unknown");
}

TEST(HIDEventJsonTest, VendorEventOtherThanTheResetIsAnUnknownLineWithoutFrame) {
    HIDEventRef other = makeFirmwareResetEvent();
    other->usage = 7;
    other->timestamp = 3;
    EXPECT_EQ(eventJsonLine(*other), R"({"frame":null,"event":"unknown","region":0,"phase":0,"timestamp":3})");
}

}  // namespace
}  // namespace TolkaTouch

#include "tools/EventPrinter.h"

#include <gtest/gtest.h>

namespace TolkaTouch::Tools {
namespace {

HIDEventRef digitizer(uint32_t mask, uint32_t phase, double y, int64_t frame, uint64_t timestamp) {
    HIDEventRef event = makeDigitizerEvent(mask, phase, y);
    event->setIntegerValue(kDigitizerFrameNumberField, frame);
    event->timestamp = timestamp;
    return event;
}

TEST(EventPrinterTest, JsonLineHoldsExactlyTheFiveFieldsInOrder) {
    EXPECT_EQ(eventJsonLine(*digitizer(0x20000, 0, 3.0, 1234, 1002416000000)),
              R"({"frame":1234,"event":"tap","region":3,"phase":0,"timestamp":1002416000000})");
    EXPECT_EQ(eventJsonLine(*digitizer(0, 128, 1.0, 7, 5)),
              R"({"frame":7,"event":"may-begin","region":1,"phase":128,"timestamp":5})");
    EXPECT_EQ(eventJsonLine(*digitizer(2, 1, 2.0, 8, 6)), R"({"frame":8,"event":"hold-start","region":2,"phase":1,"timestamp":6})");
    EXPECT_EQ(eventJsonLine(*digitizer(2, 2, 1.0, 9, 7)), R"({"frame":9,"event":"hold-change","region":1,"phase":2,"timestamp":7})");
    EXPECT_EQ(eventJsonLine(*digitizer(2, 4, 1.0, 0, 8)), R"({"frame":0,"event":"hold-end","region":1,"phase":4,"timestamp":8})");
    EXPECT_EQ(eventJsonLine(*digitizer(0, 8, 0.0, 10, 9)), R"({"frame":10,"event":"cancel","region":0,"phase":8,"timestamp":9})");
}

TEST(EventPrinterTest, ResetEventHasNoFrameAndRegionZero) {
    HIDEventRef reset = makeFirmwareResetEvent();
    reset->timestamp = 42;
    EXPECT_EQ(eventJsonLine(*reset), R"({"frame":null,"event":"reset","region":0,"phase":0,"timestamp":42})");
    EXPECT_EQ(eventHumanLine(*reset, 5.0), "  5.000s  frame -     reset");
}

TEST(EventPrinterTest, HumanLineNamesTheButtonOfTheRegion) {
    EXPECT_EQ(eventHumanLine(*digitizer(0x20000, 0, 3.0, 1234, 0), 2.416),
              "  2.416s  frame 1234  tap         region 3  volume up");
    EXPECT_EQ(eventHumanLine(*digitizer(0x20000, 0, 1.0, 12, 0), 0.5), "  0.500s  frame 12    tap         region 1  play/pause");
    EXPECT_EQ(eventHumanLine(*digitizer(2, 1, 1.0, 99999, 0), 123.4567),
              "123.457s  frame 99999  hold-start  region 1  voice assistant");
    EXPECT_EQ(eventHumanLine(*digitizer(2, 4, 2.0, 77, 0), 1.0), "  1.000s  frame 77    hold-end    region 2  volume down");
    EXPECT_EQ(eventHumanLine(*digitizer(0, 8, 0.0, 78, 0), 1.0), "  1.000s  frame 78    cancel      region 0");
}

TEST(EventPrinterTest, UnexpectedEventsAreUnknown) {
    EXPECT_EQ(eventKindName(*digitizer(0, 1, 1.0, 0, 0)), "unknown");
    HIDEvent vendor;
    vendor.type = HIDEventType::VendorDefined;
    vendor.usagePage = 0xFF00;
    EXPECT_EQ(eventKindName(vendor), "unknown");
    EXPECT_EQ(eventButtonName(vendor), "");
}

}  // namespace
}  // namespace TolkaTouch::Tools

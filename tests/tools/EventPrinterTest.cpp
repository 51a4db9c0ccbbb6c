#include "tools/EventPrinter.h"
#include "tolkatouch/Gesture.h"

#include <gtest/gtest.h>

namespace TolkaTouch::Tools {
namespace {

// The human line shows no time stamp; the time since the start is passed beside the event.
HIDEventRef digitizer(uint32_t mask, uint32_t phase, double y, int64_t frame) {
    HIDEventRef event = makeDigitizerEvent(mask, phase, y);
    event->setIntegerValue(kDigitizerFrameNumberField, frame);
    return event;
}

TEST(EventPrinterTest, ResetEventHasNoFrame) {
    HIDEventRef reset = GestureCodec::encode(GestureKind::Reset);
    EXPECT_EQ(eventHumanLine(*reset, 5.0), "  5.000s  frame -     reset");
}

TEST(EventPrinterTest, HumanLineNamesTheButtonOfTheRegion) {
    EXPECT_EQ(eventHumanLine(*digitizer(0x20000, 0, 3.0, 1234), 2.416),
              "  2.416s  frame 1234  tap         region 3  volume up");
    EXPECT_EQ(eventHumanLine(*digitizer(0x20000, 0, 1.0, 12), 0.5), "  0.500s  frame 12    tap         region 1  play/pause");
    EXPECT_EQ(eventHumanLine(*digitizer(2, 1, 1.0, 99999), 123.4567),
              "123.457s  frame 99999  hold-start  region 1  voice assistant");
    EXPECT_EQ(eventHumanLine(*digitizer(2, 4, 2.0, 77), 1.0), "  1.000s  frame 77    hold-end    region 2  volume down");
    EXPECT_EQ(eventHumanLine(*digitizer(0, 8, 0.0, 78), 1.0), "  1.000s  frame 78    cancel      region 0");
}

TEST(EventPrinterTest, VendorEventsNameNoButton) {
    HIDEvent vendor;
    vendor.type = HIDEventType::VendorDefined;
    vendor.usagePage = 0xFF00;
    EXPECT_EQ(eventButtonName(vendor), "");
}

}  // namespace
}  // namespace TolkaTouch::Tools

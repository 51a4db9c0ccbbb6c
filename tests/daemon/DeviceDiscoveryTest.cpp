#include "daemon/DeviceDiscovery.h"

#include <gtest/gtest.h>

namespace TolkaTouch {
namespace {

TEST(DeviceDiscoveryTest, HidIdReadsBusVendorAndProductInHex) {
    EXPECT_EQ(parseHidId("0003:00001209:00000001"), (HidId{3, 0x1209, 0x0001}));
    EXPECT_EQ(parseHidId("0005:0000046D:0000B342"), (HidId{5, 0x046D, 0xB342}));
}

TEST(DeviceDiscoveryTest, HidIdThatIsMissingOrMalformedReadsAsNothing) {
    EXPECT_FALSE(parseHidId(nullptr));
    EXPECT_FALSE(parseHidId(""));
    EXPECT_FALSE(parseHidId("0003:00001209"));
    EXPECT_FALSE(parseHidId("0003:00001209:00000001x"));
    EXPECT_FALSE(parseHidId("usb:1209:0001"));
}

}  // namespace
}  // namespace TolkaTouch

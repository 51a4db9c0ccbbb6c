#include "daemon/CountingHIDDevice.h"

#include <gtest/gtest.h>

#include "platform/RunLoop.h"
#include "platform/SimulatedHIDDevice.h"

namespace TolkaTouch {
namespace {

struct Seen {
    std::vector<std::vector<uint8_t>> reports;
    static void callback(void* context, uint32_t, void*, HIDReportType, uint32_t, const uint8_t* report, size_t length,
                         uint64_t) {
        static_cast<Seen*>(context)->reports.emplace_back(report, report + length);
    }
};

TEST(CountingHIDDeviceTest, CountsReportsOnceTheirCallbackHasReturned) {
    auto inner = SimulatedHIDDevice::create();
    CountingHIDDevice device(inner);
    Seen seen;
    uint8_t buffer[64];
    auto loop = RunLoop::current();
    ASSERT_EQ(device.open(0), 0u);
    device.registerInputReportCallback(buffer, sizeof(buffer), &Seen::callback, &seen);
    device.scheduleWithRunLoop(*loop, "test");
    inner->writeInputReport(std::vector<uint8_t>{1, 2, 3});
    inner->writeInputReport(std::vector<uint8_t>{1, 4});
    while (seen.reports.size() < 2) loop->runInMode("test", 5.0, true);
    EXPECT_EQ(device.deliveredCount(), 2u);
    device.waitForDelivered(2, [] { return false; });
    EXPECT_EQ(seen.reports, (std::vector<std::vector<uint8_t>>{{1, 2, 3}, {1, 4}}));
    device.unscheduleFromRunLoop(*loop, "test");
    device.registerInputReportCallback(buffer, sizeof(buffer), nullptr, nullptr);
    EXPECT_EQ(inner->counts().unregisterCallback, 1);
}

TEST(CountingHIDDeviceTest, WaitEndsWhenAbandoned) {
    CountingHIDDevice device(SimulatedHIDDevice::create());
    device.waitForDelivered(5, [] { return true; });
    EXPECT_EQ(device.deliveredCount(), 0u);
}

}  // namespace
}  // namespace TolkaTouch

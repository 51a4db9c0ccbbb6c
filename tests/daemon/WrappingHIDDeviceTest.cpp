#include "daemon/WrappingHIDDevice.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "platform/RunLoop.h"
#include "platform/SimulatedHIDDevice.h"

namespace TolkaTouch {
namespace {

// Writes down, in order, its own steps and the service's callbacks.
class StepsHIDDevice : public WrappingHIDDevice {
public:
    using WrappingHIDDevice::WrappingHIDDevice;
    std::vector<std::string> steps;
    static void callback(void* context, uint32_t, void*, HIDReportType, uint32_t, const uint8_t* report, size_t length,
                         uint64_t) {
        static_cast<StepsHIDDevice*>(context)->steps.push_back("service " + std::to_string(length) + " bytes from " +
                                                                std::to_string(report[0]));
    }

protected:
    void beforeInputReport(const uint8_t* report, size_t length) override {
        steps.push_back("before " + std::to_string(length) + " bytes from " + std::to_string(report[0]));
    }
    void afterInputReport() override { steps.push_back("after"); }
};

TEST(WrappingHIDDeviceTest, ItsStepsComeBeforeAndAfterTheServiceHandlesEachReport) {
    auto inner = SimulatedHIDDevice::create();
    StepsHIDDevice device(inner);
    uint8_t buffer[64];
    auto loop = RunLoop::current();
    ASSERT_EQ(device.open(0), 0u);
    device.registerInputReportCallback(buffer, sizeof(buffer), &StepsHIDDevice::callback, &device);
    device.scheduleWithRunLoop(*loop, "test");
    inner->writeInputReport(std::vector<uint8_t>{1, 2, 3});
    inner->writeInputReport(std::vector<uint8_t>{2, 4});
    while (device.steps.size() < 6) loop->runInMode("test", 5.0, true);
    EXPECT_EQ(device.steps, (std::vector<std::string>{"before 3 bytes from 1", "service 3 bytes from 1", "after",
                                                      "before 2 bytes from 2", "service 2 bytes from 2", "after"}));
    device.unscheduleFromRunLoop(*loop, "test");
    device.registerInputReportCallback(buffer, sizeof(buffer), nullptr, nullptr);
    EXPECT_EQ(inner->counts().unregisterCallback, 1);
}

TEST(WrappingHIDDeviceTest, OtherCallsReachTheInnerDevice) {
    auto inner = SimulatedHIDDevice::create();
    inner->setDeviceProperty("VendorID", PropertyValue(0x1209u));
    StepsHIDDevice device(inner);
    EXPECT_EQ(device.getProperty("VendorID"), PropertyValue(0x1209u));
    EXPECT_EQ(device.open(3), 0u);
    EXPECT_EQ(device.close(3), 0u);
    EXPECT_EQ(inner->counts().lastOpenOptions, 3u);
    EXPECT_EQ(inner->counts().close, 1);
    EXPECT_TRUE(device.steps.empty());
}

}  // namespace
}  // namespace TolkaTouch

#include "daemon/PluginInstance.h"

#include <gtest/gtest.h>

#include <condition_variable>
#include <mutex>
#include <vector>

#include "platform/HIDServiceRegistry.h"
#include "platform/SimulatedHIDDevice.h"

namespace TolkaTouch {
namespace {

struct Received {
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<HIDEventRef> events;
    std::vector<void*> refcons;
    bool onQueue = true;
    DispatchQueue* queue = nullptr;

    static void callback(void* target, void* refcon, void*, const HIDEventRef& event, uint32_t options) {
        auto* self = static_cast<Received*>(target);
        std::lock_guard lock(self->mutex);
        self->events.push_back(event);
        self->refcons.push_back(refcon);
        if (options != 0 || !self->queue->isCurrent()) self->onQueue = false;
        self->changed.notify_all();
    }
};

// Loaded once and never unloaded, as the daemon does: the service's input report thread may still
// be finishing its last lines after the service has gone, and must not find its code unmapped.
PluginLibrary& loadedOnce() {
    static PluginLibrary* library = new PluginLibrary(TOLKA_PLUGIN_PATH);
    return *library;
}

class PluginInstanceTest : public ::testing::Test {
protected:
    void SetUp() override {
        device = SimulatedHIDDevice::create();
        HIDServiceRegistry::registerService(kService, [this] { return device; });
        received.queue = queue.get();
    }
    void TearDown() override { HIDServiceRegistry::unregisterService(kService); }

    std::unique_ptr<PluginInstance> start(uint32_t service = kService) {
        PluginInstance::EventCallback callback{&Received::callback, &received, reinterpret_cast<void*>(0x51)};
        return std::make_unique<PluginInstance>(library, service, PropertyValue(PropertyValue::Dictionary{}), callback,
                                                queue);
    }

    static constexpr uint32_t kService = 4101;
    PluginLibrary& library = loadedOnce();
    DispatchQueueRef queue = DispatchQueue::create("test.events");
    std::shared_ptr<SimulatedHIDDevice> device;
    Received received;
};

TEST_F(PluginInstanceTest, BringingUpOpensTheDeviceBeforeSchedulingReturns) {
    auto instance = start();
    auto counts = device->counts();
    EXPECT_EQ(counts.open, 1);
    EXPECT_EQ(counts.close, 0);
}

TEST_F(PluginInstanceTest, ShutdownUndoesEachStepOnceAndLeavesTheServiceUnreachable) {
    auto instance = start();
    instance->shutdown();
    instance->shutdown();
    auto counts = device->counts();
    EXPECT_EQ(counts.registerCallback, 1);
    EXPECT_EQ(counts.unregisterCallback, 1);
    EXPECT_EQ(counts.schedule, 1);
    EXPECT_EQ(counts.unschedule, 1);
    EXPECT_EQ(counts.open, 1);
    EXPECT_EQ(counts.close, 1);
    EXPECT_TRUE(instance->copyProperty("Version").isNull());
    EXPECT_FALSE(instance->setProperty("Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue(700)));
}

TEST_F(PluginInstanceTest, PropertiesGoThroughTheServiceInterface) {
    auto instance = start();
    EXPECT_EQ(instance->copyProperty("Version"), PropertyValue(PropertyValue::Array{28, 0, 0}));
    EXPECT_TRUE(instance->setProperty("Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue(700)));
    EXPECT_EQ(instance->copyProperty("Pipeline.Algs.HoldTimeoutMilliseconds").toUInt64(), 700u);
}

TEST_F(PluginInstanceTest, FirmwareResetReportReachesTheCallbackOnTheQueueWithTheRefcon) {
    auto instance = start();
    device->writeInputReport(std::vector<uint8_t>{0x02, 0x00, 0, 0, 0, 0, 0, 0, 0, 0});
    std::unique_lock lock(received.mutex);
    received.changed.wait(lock, [this] {
        for (const auto& event : received.events) {
            if (event->type == HIDEventType::VendorDefined) return true;
        }
        return false;
    });
    EXPECT_TRUE(received.onQueue);
    for (void* refcon : received.refcons) EXPECT_EQ(refcon, reinterpret_cast<void*>(0x51));
    EXPECT_EQ(received.events.back()->type, HIDEventType::VendorDefined);
    EXPECT_EQ(received.events.back()->usagePage, 0xFF60u);
}

TEST_F(PluginInstanceTest, StartWithoutADeviceFailsWithItsResultCode) {
    try {
        start(9999);
        FAIL();
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()), "start of service 9999 failed (0xe00002be)");
    }
}

TEST(PluginLibraryTest, LibraryWithoutTheFactoryIsRefused) {
    try {
        PluginLibrary library("libm.so.6");
        FAIL();
    } catch (const std::runtime_error& error) {
        EXPECT_EQ(std::string(error.what()), "the plug-in libm.so.6 has no TolkaTouchHIDServiceFactory");
    }
}

}  // namespace
}  // namespace TolkaTouch

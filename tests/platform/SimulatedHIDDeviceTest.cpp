#include "platform/SimulatedHIDDevice.h"

#include <gtest/gtest.h>

#include <time.h>

#include <thread>
#include <vector>

#include "platform/RunLoop.h"
#include <semaphore>

namespace TolkaTouch {
namespace {

using Bytes = std::vector<uint8_t>;
using RunResult = RunLoop::RunResult;

constexpr double kGenerousSeconds = 10.0;
const std::string kMode = "SimulatedDeviceMode";

// Collects what the device hands its input report callback.
struct Receiver {
    struct Report {
        uint32_t result;
        void* sender;
        HIDReportType type;
        uint32_t reportID;
        Bytes bytes;
        uint64_t timestamp;
        bool operator==(const Report&) const = default;
    };
    std::vector<Report> reports;
    std::vector<const uint8_t*> pointers;
    std::counting_semaphore<>* arrived = nullptr;
    HIDDevice* unregisterOnFirst = nullptr;

    static void callback(void* context, uint32_t result, void* sender, HIDReportType type, uint32_t reportID,
                         const uint8_t* report, size_t length, uint64_t timestamp) {
        auto* self = static_cast<Receiver*>(context);
        self->reports.push_back(Report{result, sender, type, reportID, Bytes(report, report + length), timestamp});
        self->pointers.push_back(report);
        if (self->unregisterOnFirst) {
            self->unregisterOnFirst->registerInputReportCallback(nullptr, 0, nullptr, nullptr);
        }
        if (self->arrived) {
            self->arrived->release();
        }
    }
};

struct OpenDevice {
    std::shared_ptr<SimulatedHIDDevice> device;
    std::shared_ptr<RunLoop> loop = RunLoop::current();
    uint8_t buffer[512] = {};
    Receiver receiver;
    uint64_t clock = 1000;

    explicit OpenDevice(SimulatedHIDDevice::Delivery delivery = SimulatedHIDDevice::Delivery::AtOnce)
        : device(SimulatedHIDDevice::create({}, delivery)) {
        device->setTimestampSource([this] { return clock++; });
        EXPECT_EQ(device->open(0), HIDResult::Success);
        device->registerInputReportCallback(buffer, sizeof buffer, Receiver::callback, &receiver);
        device->scheduleWithRunLoop(*loop, kMode);
    }
    ~OpenDevice() { device->unscheduleFromRunLoop(*loop, kMode); }
    RunResult runOnce() { return loop->runInMode(kMode, kGenerousSeconds, true); }
    void* sender() const { return static_cast<HIDDevice*>(device.get()); }
};

TEST(SimulatedHIDDeviceTest, ReportsReachTheCallbackInOrderWithExactBytes) {
    OpenDevice fixture;
    ASSERT_TRUE(fixture.device->writeInputReport(Bytes{0x01, 0xAA}));
    ASSERT_TRUE(fixture.device->writeInputReport(Bytes{0x02}));
    ASSERT_TRUE(fixture.device->writeInputReport(Bytes{0x01, 1, 2, 3}));
    EXPECT_EQ(fixture.device->pendingInputReportCount(), 3u);
    for (int index = 0; index < 3; ++index) {
        EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    }
    EXPECT_EQ(fixture.loop->runInMode(kMode, 0.0, true), RunResult::TimedOut);
    using Report = Receiver::Report;
    const std::vector<Report> expected{
        Report{HIDResult::Success, fixture.sender(), HIDReportType::Input, 1, Bytes{0x01, 0xAA}, 1000},
        Report{HIDResult::Success, fixture.sender(), HIDReportType::Input, 2, Bytes{0x02}, 1001},
        Report{HIDResult::Success, fixture.sender(), HIDReportType::Input, 1, Bytes{0x01, 1, 2, 3}, 1002},
    };
    EXPECT_EQ(fixture.receiver.reports, expected);
    // Reports are read into the registered buffer.
    for (const uint8_t* pointer : fixture.receiver.pointers) {
        EXPECT_EQ(pointer, fixture.buffer);
    }
}

TEST(SimulatedHIDDeviceTest, ZeroLengthReportArrivesWithLengthZeroAndReportIDZero) {
    OpenDevice fixture;
    ASSERT_TRUE(fixture.device->writeInputReport(Bytes{}));
    ASSERT_TRUE(fixture.device->writeInputReport(nullptr, 5));
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    ASSERT_EQ(fixture.receiver.reports.size(), 2u);
    EXPECT_EQ(fixture.receiver.reports[0].bytes, Bytes{});
    EXPECT_EQ(fixture.receiver.reports[0].reportID, 0u);
    EXPECT_EQ(fixture.receiver.reports[1].bytes, Bytes{});
}

TEST(SimulatedHIDDeviceTest, ReportLongerThanTheBufferIsCutToTheBuffersLength) {
    auto device = SimulatedHIDDevice::create();
    auto loop = RunLoop::current();
    uint8_t small[4] = {};
    Receiver receiver;
    device->open(0);
    device->registerInputReportCallback(small, sizeof small, Receiver::callback, &receiver);
    device->scheduleWithRunLoop(*loop, kMode);
    device->writeInputReport(Bytes{9, 8, 7, 6, 5, 4});
    device->writeInputReport(Bytes{1, 2});
    EXPECT_EQ(loop->runInMode(kMode, kGenerousSeconds, true), RunResult::HandledSource);
    EXPECT_EQ(loop->runInMode(kMode, kGenerousSeconds, true), RunResult::HandledSource);
    ASSERT_EQ(receiver.reports.size(), 2u);
    EXPECT_EQ(receiver.reports[0].bytes, (Bytes{9, 8, 7, 6}));
    EXPECT_EQ(receiver.reports[1].bytes, (Bytes{1, 2}));
    device->unscheduleFromRunLoop(*loop, kMode);
}

TEST(SimulatedHIDDeviceTest, DeviceWithoutReportIDsAnswersReportIDZero) {
    OpenDevice fixture;
    fixture.device->setUsesReportIDs(false);
    fixture.device->writeInputReport(Bytes{0x05, 0x06});
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    ASSERT_EQ(fixture.receiver.reports.size(), 1u);
    EXPECT_EQ(fixture.receiver.reports[0].reportID, 0u);
    EXPECT_EQ(fixture.receiver.reports[0].bytes, (Bytes{0x05, 0x06}));
}

TEST(SimulatedHIDDeviceTest, UnregisteringStopsDelivery) {
    OpenDevice fixture;
    fixture.device->writeInputReport(Bytes{0x01, 0x10});
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    fixture.device->registerInputReportCallback(fixture.buffer, sizeof fixture.buffer, nullptr, nullptr);
    fixture.device->writeInputReport(Bytes{0x01, 0x20});
    // The report is still read (and dropped), so the source counts as handled.
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    ASSERT_EQ(fixture.receiver.reports.size(), 1u);
    EXPECT_EQ(fixture.receiver.reports[0].bytes, (Bytes{0x01, 0x10}));
    EXPECT_EQ(fixture.device->pendingInputReportCount(), 0u);
    const auto counts = fixture.device->counts();
    EXPECT_EQ(counts.registerCallback, 1);
    EXPECT_EQ(counts.unregisterCallback, 1);
}

TEST(SimulatedHIDDeviceTest, CallbackMayUnregisterItself) {
    OpenDevice fixture;
    fixture.receiver.unregisterOnFirst = fixture.device.get();
    fixture.device->writeInputReport(Bytes{0x01});
    fixture.device->writeInputReport(Bytes{0x02});
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    ASSERT_EQ(fixture.receiver.reports.size(), 1u);
    EXPECT_EQ(fixture.receiver.reports[0].bytes, Bytes{0x01});
}

TEST(SimulatedHIDDeviceTest, ClosedDeviceDropsItsReports) {
    OpenDevice fixture;
    EXPECT_EQ(fixture.device->close(0), HIDResult::Success);
    fixture.device->writeInputReport(Bytes{0x01});
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    EXPECT_TRUE(fixture.receiver.reports.empty());
    EXPECT_EQ(fixture.device->open(0), HIDResult::Success);
    fixture.device->writeInputReport(Bytes{0x02});
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    ASSERT_EQ(fixture.receiver.reports.size(), 1u);
    EXPECT_EQ(fixture.receiver.reports[0].bytes, Bytes{0x02});
}

TEST(SimulatedHIDDeviceTest, UnscheduledDeviceLeavesItsReportsWaiting) {
    OpenDevice fixture;
    fixture.device->unscheduleFromRunLoop(*fixture.loop, kMode);
    fixture.device->writeInputReport(Bytes{0x01});
    EXPECT_EQ(fixture.loop->runInMode(kMode, kGenerousSeconds, true), RunResult::Finished);
    EXPECT_EQ(fixture.device->pendingInputReportCount(), 1u);
    fixture.device->scheduleWithRunLoop(*fixture.loop, kMode);
    EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    EXPECT_EQ(fixture.receiver.reports.size(), 1u);
}

TEST(SimulatedHIDDeviceTest, SchedulingTwiceOnTheSameLoopAndModeMakesOneSource) {
    OpenDevice fixture;
    fixture.device->scheduleWithRunLoop(*fixture.loop, kMode);
    fixture.device->unscheduleFromRunLoop(*fixture.loop, kMode);
    EXPECT_EQ(fixture.loop->runInMode(kMode, kGenerousSeconds, true), RunResult::Finished);
    const auto counts = fixture.device->counts();
    EXPECT_EQ(counts.schedule, 2);
    EXPECT_EQ(counts.unschedule, 1);
}

TEST(SimulatedHIDDeviceTest, DestroyedDeviceTakesItsSourceAlong) {
    auto loop = RunLoop::current();
    auto device = SimulatedHIDDevice::create();
    device->scheduleWithRunLoop(*loop, kMode);
    device->writeInputReport(Bytes{0x01});
    device.reset();
    EXPECT_EQ(loop->runInMode(kMode, kGenerousSeconds, true), RunResult::Finished);
}

TEST(SimulatedHIDDeviceTest, ReportWrittenFromAnotherThreadWakesAnEndlessRun) {
    OpenDevice fixture;
    std::thread writer([&] { fixture.device->writeInputReport(Bytes{0x01, 0x7F}); });
    EXPECT_EQ(fixture.loop->runInMode(kMode, RunLoop::kInfinite, true), RunResult::HandledSource);
    writer.join();
    ASSERT_EQ(fixture.receiver.reports.size(), 1u);
    EXPECT_EQ(fixture.receiver.reports[0].bytes, (Bytes{0x01, 0x7F}));
}

TEST(SimulatedHIDDeviceTest, RemovalDeliversWaitingReportsThenCallsTheHandlerOnce) {
    OpenDevice fixture;
    int removals = 0;
    fixture.device->setRemovalHandler([&] { ++removals; });
    fixture.device->writeInputReport(Bytes{0x01});
    fixture.device->writeInputReport(Bytes{0x02});
    fixture.device->simulateRemoval();
    fixture.device->simulateRemoval();
    EXPECT_FALSE(fixture.device->writeInputReport(Bytes{0x03}));
    // The removal takes the device's source away, so the mode runs dry.
    EXPECT_EQ(fixture.loop->runInMode(kMode, kGenerousSeconds, false), RunResult::Finished);
    EXPECT_EQ(removals, 1);
    EXPECT_TRUE(fixture.device->isRemoved());
    ASSERT_EQ(fixture.receiver.reports.size(), 2u);
    EXPECT_EQ(fixture.receiver.reports[1].bytes, Bytes{0x02});
    uint8_t buffer[8];
    size_t length = sizeof buffer;
    EXPECT_EQ(fixture.device->getReport(HIDReportType::Feature, 0x10, buffer, length), HIDResult::NoDevice);
    EXPECT_EQ(fixture.device->open(0), HIDResult::NoDevice);
    // A removed device cannot be scheduled again.
    fixture.device->scheduleWithRunLoop(*fixture.loop, kMode);
    EXPECT_EQ(fixture.loop->runInMode(kMode, kGenerousSeconds, false), RunResult::Finished);
}

// CLOCK_MONOTONIC nanoseconds, the clock of due times.
uint64_t monotonicNow() {
    timespec now{};
    ::clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<uint64_t>(now.tv_sec) * 1'000'000'000 + static_cast<uint64_t>(now.tv_nsec);
}

TEST(SimulatedHIDDeviceTest, ReportsPastTheirDueTimeArriveInTheOrderWritten) {
    OpenDevice fixture(SimulatedHIDDevice::Delivery::AtDueTime);
    ASSERT_TRUE(fixture.device->writeInputReport(Bytes{0x01, 0xAA}, 5));
    ASSERT_TRUE(fixture.device->writeInputReport(Bytes{0x02}, 0));
    ASSERT_TRUE(fixture.device->writeInputReport(Bytes{0x01, 1, 2}, monotonicNow()));
    for (int index = 0; index < 3; ++index) {
        EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    }
    EXPECT_EQ(fixture.loop->runInMode(kMode, 0.0, true), RunResult::TimedOut);
    ASSERT_EQ(fixture.receiver.reports.size(), 3u);
    EXPECT_EQ(fixture.receiver.reports[0].bytes, (Bytes{0x01, 0xAA}));
    EXPECT_EQ(fixture.receiver.reports[1].bytes, (Bytes{0x02}));
    EXPECT_EQ(fixture.receiver.reports[2].bytes, (Bytes{0x01, 1, 2}));
}

TEST(SimulatedHIDDeviceTest, ReportsWrittenWhileEarlierOnesAreReadKeepOrderAndBytesAsTheQueueGrows) {
    // Slots are reused: a report of one length follows one of another in the same slot, and the
    // queue grows while it has wrapped round.
    OpenDevice fixture(SimulatedHIDDevice::Delivery::AtDueTime);
    auto report = [](int index) { return Bytes(static_cast<size_t>(1 + (index * 7) % 23), static_cast<uint8_t>(index)); };
    int written = 0;
    for (; written < 12; ++written) ASSERT_TRUE(fixture.device->writeInputReport(report(written), 0));
    for (int index = 0; index < 7; ++index) EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    for (; written < 60; ++written) ASSERT_TRUE(fixture.device->writeInputReport(report(written), 0));
    EXPECT_EQ(fixture.device->pendingInputReportCount(), 53u);
    for (int index = 7; index < 60; ++index) EXPECT_EQ(fixture.runOnce(), RunResult::HandledSource);
    EXPECT_EQ(fixture.loop->runInMode(kMode, 0.0, true), RunResult::TimedOut);
    ASSERT_EQ(fixture.receiver.reports.size(), 60u);
    for (int index = 0; index < 60; ++index) EXPECT_EQ(fixture.receiver.reports[index].bytes, report(index)) << index;
}

TEST(SimulatedHIDDeviceTest, ReportDueInAnHourWaitsAndHoldsBackTheReportsAfterIt) {
    OpenDevice fixture(SimulatedHIDDevice::Delivery::AtDueTime);
    ASSERT_TRUE(fixture.device->writeInputReport(Bytes{0x01}, monotonicNow() + 3'600'000'000'000));
    ASSERT_TRUE(fixture.device->writeInputReport(Bytes{0x02}, 0));
    EXPECT_EQ(fixture.loop->runInMode(kMode, 0.0, true), RunResult::TimedOut);
    EXPECT_TRUE(fixture.receiver.reports.empty());
    EXPECT_EQ(fixture.device->pendingInputReportCount(), 2u);
}

TEST(SimulatedHIDDeviceTest, DueReportWrittenFromAnotherThreadWakesAnEndlessRun) {
    OpenDevice fixture(SimulatedHIDDevice::Delivery::AtDueTime);
    std::thread writer([&] { fixture.device->writeInputReport(Bytes{0x01, 0x7F}, monotonicNow() + 1'000'000); });
    EXPECT_EQ(fixture.loop->runInMode(kMode, RunLoop::kInfinite, true), RunResult::HandledSource);
    writer.join();
    ASSERT_EQ(fixture.receiver.reports.size(), 1u);
    EXPECT_EQ(fixture.receiver.reports[0].bytes, (Bytes{0x01, 0x7F}));
}

TEST(SimulatedHIDDeviceTest, RemovalOfADeviceDeliveringAtDueTimesDeliversWaitingReportsFirst) {
    OpenDevice fixture(SimulatedHIDDevice::Delivery::AtDueTime);
    int removals = 0;
    fixture.device->setRemovalHandler([&] { ++removals; });
    fixture.device->writeInputReport(Bytes{0x01}, 0);
    fixture.device->writeInputReport(Bytes{0x02}, monotonicNow() + 1'000'000);
    fixture.device->simulateRemoval();
    EXPECT_FALSE(fixture.device->writeInputReport(Bytes{0x03}, 0));
    EXPECT_EQ(fixture.loop->runInMode(kMode, kGenerousSeconds, false), RunResult::Finished);
    EXPECT_EQ(removals, 1);
    ASSERT_EQ(fixture.receiver.reports.size(), 2u);
    EXPECT_EQ(fixture.receiver.reports[1].bytes, Bytes{0x02});
}

TEST(SimulatedHIDDeviceTest, RemovalOfAnIdleDeviceDeliveringAtDueTimesIsReadAtOnce) {
    OpenDevice fixture(SimulatedHIDDevice::Delivery::AtDueTime);
    int removals = 0;
    fixture.device->setRemovalHandler([&] { ++removals; });
    fixture.device->simulateRemoval();
    EXPECT_EQ(fixture.loop->runInMode(kMode, kGenerousSeconds, false), RunResult::Finished);
    EXPECT_EQ(removals, 1);
    EXPECT_TRUE(fixture.receiver.reports.empty());
}

TEST(SimulatedHIDDeviceTest, FeatureReportIsCopiedWithItsLength) {
    auto device = SimulatedHIDDevice::create();
    device->setFeatureReport(0x1F, Bytes{0x1F, 0x10, 0x27});
    uint8_t buffer[32] = {};
    size_t length = sizeof buffer;
    EXPECT_EQ(device->getReport(HIDReportType::Feature, 0x1F, buffer, length), HIDResult::Success);
    EXPECT_EQ(Bytes(buffer, buffer + length), (Bytes{0x1F, 0x10, 0x27}));
    EXPECT_EQ(device->counts().getReport, 1);
}

TEST(SimulatedHIDDeviceTest, FeatureReportLongerThanTheBufferIsCutToTheBuffersLength) {
    auto device = SimulatedHIDDevice::create();
    device->setFeatureReport(0x04, Bytes{0x04, 1, 2, 3, 4});
    uint8_t buffer[2] = {};
    size_t length = sizeof buffer;
    EXPECT_EQ(device->getReport(HIDReportType::Feature, 0x04, buffer, length), HIDResult::Success);
    EXPECT_EQ(Bytes(buffer, buffer + length), (Bytes{0x04, 1}));
}

TEST(SimulatedHIDDeviceTest, FailedReportAnswersItsCodeAndLeavesLengthAlone) {
    auto device = SimulatedHIDDevice::create();
    device->setFeatureReport(0x10, Bytes{0x10, 0x01});
    device->failReport(0x10, HIDResult::Unsupported);
    uint8_t buffer[128] = {};
    size_t length = sizeof buffer;
    EXPECT_EQ(device->getReport(HIDReportType::Feature, 0x10, buffer, length), 0xE00002C7u);
    EXPECT_EQ(length, 128u);
    device->failReport(0x10, HIDResult::Success);
    EXPECT_EQ(device->getReport(HIDReportType::Feature, 0x10, buffer, length), HIDResult::Success);
    EXPECT_EQ(length, 2u);
}

TEST(SimulatedHIDDeviceTest, UnknownFeatureReportAndOtherReportTypesAreUnsupported) {
    auto device = SimulatedHIDDevice::create();
    device->setFeatureReport(0x10, Bytes{0x10});
    uint8_t buffer[16] = {};
    size_t length = sizeof buffer;
    EXPECT_EQ(device->getReport(HIDReportType::Feature, 0x11, buffer, length), HIDResult::Unsupported);
    EXPECT_EQ(device->getReport(HIDReportType::Input, 0x10, buffer, length), HIDResult::Unsupported);
    EXPECT_EQ(device->getReport(HIDReportType::Output, 0x10, buffer, length), HIDResult::Unsupported);
    EXPECT_EQ(length, 16u);
}

TEST(SimulatedHIDDeviceTest, NullBufferOrZeroLengthIsABadArgument) {
    auto device = SimulatedHIDDevice::create();
    device->setFeatureReport(0x10, Bytes{0x10});
    uint8_t buffer[4];
    size_t length = 4;
    EXPECT_EQ(device->getReport(HIDReportType::Feature, 0x10, nullptr, length), HIDResult::BadArgument);
    length = 0;
    EXPECT_EQ(device->getReport(HIDReportType::Feature, 0x10, buffer, length), HIDResult::BadArgument);
}

TEST(SimulatedHIDDeviceTest, PropertiesComeFromTheHandleFirstThenTheDevice) {
    auto device = SimulatedHIDDevice::create({{"VendorID", PropertyValue(0x1234)}, {"Product", PropertyValue("Pad")}});
    EXPECT_EQ(device->getProperty("VendorID"), PropertyValue(0x1234));
    EXPECT_EQ(device->getProperty("Product"), PropertyValue("Pad"));
    EXPECT_TRUE(device->getProperty("Unknown").isNull());
    EXPECT_TRUE(device->setProperty("VendorID", PropertyValue(5)));
    EXPECT_EQ(device->getProperty("VendorID"), PropertyValue(5));
    EXPECT_TRUE(device->setProperty("Version", PropertyValue("x")));
    EXPECT_EQ(device->getProperty("Version"), PropertyValue("x"));
    EXPECT_FALSE(device->setProperty("", PropertyValue(1)));
    device->setDeviceProperty("Transport", PropertyValue("Virtual"));
    EXPECT_EQ(device->getProperty("Transport"), PropertyValue("Virtual"));
}

TEST(SimulatedHIDDeviceTest, OpenAndCloseAreCountedWithTheirOptions) {
    auto device = SimulatedHIDDevice::create();
    EXPECT_FALSE(device->isOpen());
    EXPECT_EQ(device->open(7), HIDResult::Success);
    EXPECT_TRUE(device->isOpen());
    EXPECT_EQ(device->close(3), HIDResult::Success);
    EXPECT_EQ(device->close(4), HIDResult::NotOpen);
    SimulatedHIDDevice::Counts expected;
    expected.open = 1;
    expected.close = 2;
    expected.lastOpenOptions = 7;
    expected.lastCloseOptions = 4;
    EXPECT_EQ(device->counts(), expected);
}

TEST(SimulatedHIDDeviceTest, ReportsFlowToALoopOnItsOwnThreadUntilItIsStopped) {
    // The input report thread's pattern: publish the loop, run it one source at a time, stop it
    // with a block, unregister on the way out.
    const std::string mode = "kHandleInputReportsRunLoopMode";
    auto device = SimulatedHIDDevice::create();
    device->open(0);
    Receiver receiver;
    std::counting_semaphore<> arrived{0};
    receiver.arrived = &arrived;
    std::shared_ptr<RunLoop> published;
    std::counting_semaphore<> signal{0};
    std::thread worker([&] {
        uint8_t buffer[512];
        device->registerInputReportCallback(buffer, sizeof buffer, Receiver::callback, &receiver);
        device->scheduleWithRunLoop(*RunLoop::current(), mode);
        published = RunLoop::current();
        signal.release();
        while (RunLoop::current()->runInMode(mode, RunLoop::kInfinite, true) == RunResult::HandledSource) {
        }
        device->unscheduleFromRunLoop(*RunLoop::current(), mode);
        device->registerInputReportCallback(buffer, sizeof buffer, nullptr, nullptr);
        signal.release();
    });
    ASSERT_TRUE(signal.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    for (uint8_t index = 0; index < 20; ++index) {
        device->writeInputReport(Bytes{0x01, index});
        ASSERT_TRUE(arrived.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    }
    published->performBlock(mode, [] { RunLoop::current()->stop(); });
    published->wakeUp();
    ASSERT_TRUE(signal.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    worker.join();
    ASSERT_EQ(receiver.reports.size(), 20u);
    for (uint8_t index = 0; index < 20; ++index) {
        EXPECT_EQ(receiver.reports[index].bytes, (Bytes{0x01, index}));
    }
    const auto counts = device->counts();
    EXPECT_EQ(counts.registerCallback, 1);
    EXPECT_EQ(counts.unregisterCallback, 1);
}

}  // namespace
}  // namespace TolkaTouch

// The service's lifecycle as a host drives it through the built library: probe, start, open,
// close, stop, and the input report thread that schedule starts and unschedule ends.
#include <gtest/gtest.h>

#include <thread>

#include "platform/HIDServiceRegistry.h"
#include "platform/ThreadPriority.h"
#include "pipeline/PipelineRecording.h"
#include "tests/plugin/PlugInHost.h"

namespace TolkaTouch {
namespace {

using Testing::eventually;
using Testing::firmwareEventReport;
using Testing::PlugInHost;
using Testing::SinkInstallation;

// What the input report thread's request for round-robin priority 63 answers on this machine.
int priorityRefusal() {
    int error = 0;
    std::thread([&] { error = setCurrentThreadRealtime(kSchedulingPolicyRoundRobin, 63); }).join();
    return error;
}

std::vector<std::string> linesOnThread(const Testing::ThreadTaggedLogSink& sink, std::thread::id thread) {
    std::vector<std::string> lines;
    for (const auto& line : sink.lines()) {
        if (line.thread == thread && line.record.category == "HIDService") lines.push_back(line.record.message);
    }
    return lines;
}

std::vector<std::string> linesNotOnThread(const Testing::ThreadTaggedLogSink& sink, std::thread::id thread) {
    std::vector<std::string> lines;
    for (const auto& line : sink.lines()) {
        if (line.thread != thread && line.record.category == "HIDService") lines.push_back(line.record.message);
    }
    return lines;
}

bool hasLine(const Testing::ThreadTaggedLogSink& sink, const std::string& message) {
    for (const std::string& line : sink.messages()) {
        if (line == message) return true;
    }
    return false;
}

TEST(TolkaTouchHIDServiceLifecycleTest, ProbeAnswersZeroAndNeverChangesTheScore) {
    PlugInHost host;
    int32_t score = 300;
    PropertyValue matching(PropertyValue::Dictionary{{"PrimaryUsagePage", PropertyValue(0xFF60)}});
    EXPECT_EQ((*host.plugin)->Probe(host.plugin, &matching, host.serviceHandle, &score), HIDResult::Success);
    EXPECT_EQ(score, 300);
}

TEST(TolkaTouchHIDServiceLifecycleTest, StartCreatesTheDeviceWithoutOpeningIt) {
    PlugInHost host;
    const long before = host.device.use_count();
    EXPECT_EQ(host.start(), HIDResult::Success);
    EXPECT_EQ(host.device.use_count(), before + 1);
    EXPECT_EQ(host.device->counts().open, 0);
}

TEST(TolkaTouchHIDServiceLifecycleTest, StartWithoutADeviceForTheServiceAnswersNotCreated) {
    PlugInHost host;
    HIDServiceRegistry::unregisterService(host.serviceHandle);
    EXPECT_EQ(host.start(), HIDResult::NotCreated);
    EXPECT_FALSE(host.open());
}

TEST(TolkaTouchHIDServiceLifecycleTest, OpenPassesItsOptionsAndAnswersWhetherTheDeviceOpened) {
    PlugInHost host;
    host.start();
    EXPECT_TRUE(host.open(0x2A));
    EXPECT_EQ(host.device->counts().open, 1);
    EXPECT_EQ(host.device->counts().lastOpenOptions, 0x2Au);
    EXPECT_TRUE(host.device->isOpen());
}

TEST(TolkaTouchHIDServiceLifecycleTest, OpenBeforeStartAnswersFalse) {
    PlugInHost host;
    EXPECT_FALSE(host.open());
}

TEST(TolkaTouchHIDServiceLifecycleTest, CloseClosesTheDeviceWithItsOptions) {
    PlugInHost host;
    host.start();
    host.open();
    host.close(0x2B);
    EXPECT_EQ(host.device->counts().close, 1);
    EXPECT_EQ(host.device->counts().lastCloseOptions, 0x2Bu);
    EXPECT_FALSE(host.device->isOpen());
}

TEST(TolkaTouchHIDServiceLifecycleTest, StopReleasesTheDeviceHandle) {
    PlugInHost host;
    const long before = host.device.use_count();
    host.start();
    EXPECT_EQ(host.stop(), HIDResult::Success);
    EXPECT_EQ(host.device.use_count(), before);
    EXPECT_EQ(host.stop(), HIDResult::Success);  // nothing left to release
}

TEST(TolkaTouchHIDServiceLifecycleTest, LifecycleOperationsLogTheirNamesAtDebugLevel) {
    SinkInstallation sinks;
    PlugInHost host;
    int32_t score = 0;
    (*host.plugin)->Probe(host.plugin, nullptr, host.serviceHandle, &score);
    host.start();
    host.open(0x2A);
    host.close(0x1F0);
    host.stop();
    host.release();
    EXPECT_EQ(sinks.log->messages(), (std::vector<std::string>{
                                         "probeWithService:properties:outScore:",
                                         "startWithService:properties:",
                                         "openWithOptions:2a",
                                         "closeWithOptions:1f0",
                                         "stop",
                                         "dealloc",
                                     }));
    for (const auto& line : sinks.log->lines()) EXPECT_EQ(line.record.level, LogLevel::Debug);
    for (const auto& line : sinks.log->lines()) EXPECT_EQ(line.record.subsystem, "com.zantor.hid.TolkaTouch");
}

TEST(TolkaTouchHIDServiceLifecycleTest, ScheduleReturnsWithTheThreadRunningAndTheDeviceFollowsOnIt) {
    SinkInstallation sinks;
    PlugInHost host;
    host.start();
    host.open();
    host.setEventCallback();
    host.schedule();
    EXPECT_TRUE(hasLine(*sinks.log, "input report thread start"));
    EXPECT_TRUE(eventually([&] { return host.device->counts().schedule == 1; }));
    EXPECT_EQ(host.device->counts().registerCallback, 1);
    EXPECT_EQ(host.device->counts().unregisterCallback, 0);
    host.halt();
}

TEST(TolkaTouchHIDServiceLifecycleTest, UnscheduleReturnsOnceTheThreadHasLetGoOfTheDevice) {
    PlugInHost host;
    host.run();
    host.unschedule();
    SimulatedHIDDevice::Counts counts = host.device->counts();
    EXPECT_EQ(counts.registerCallback, 1);
    EXPECT_EQ(counts.schedule, 1);
    EXPECT_EQ(counts.unschedule, 1);
    EXPECT_EQ(counts.unregisterCallback, 1);
    host.close();
    host.stop();
}

TEST(TolkaTouchHIDServiceLifecycleTest, ThreadAndHostLogTheHandshakesInOrder) {
    const int refusal = priorityRefusal();
    SinkInstallation sinks;
    PlugInHost host;
    host.start();
    host.open();
    host.setEventCallback();
    sinks.log->clear();
    host.schedule();
    host.unschedule();
    ASSERT_TRUE(eventually([&] { return hasLine(*sinks.log, "input report thread end"); }));

    const std::thread::id self = std::this_thread::get_id();
    EXPECT_EQ(linesOnThread(*sinks.log, self), (std::vector<std::string>{
                                                   "scheduleWithDispatchQueue:",
                                                   "unscheduleWithDispatchQueue:",
                                                   "signalling input report thread to exit",
                                                   "waiting for input report thread to exit",
                                                   "input report thread exited",
                                               }));
    std::vector<std::string> thread{"input report thread start"};
    if (refusal != 0) thread.push_back("pthread_setschedparam failed: " + std::to_string(refusal));
    thread.push_back("input report thread end");
    EXPECT_EQ(linesNotOnThread(*sinks.log, self), thread);
    for (const auto& line : sinks.log->lines()) {
        const bool refused = line.record.message.rfind("pthread_setschedparam failed: ", 0) == 0;
        EXPECT_EQ(line.record.level, refused ? LogLevel::Error : LogLevel::Debug) << line.record.message;
    }
    host.close();
    host.stop();
}

TEST(TolkaTouchHIDServiceLifecycleTest, UnscheduleTwiceOnlyDropsTheQueueTheSecondTime) {
    SinkInstallation sinks;
    PlugInHost host;
    const long before = host.queue.use_count();
    host.run();
    host.unschedule();
    EXPECT_EQ(host.queue.use_count(), before);
    sinks.log->clear();
    host.unschedule();
    EXPECT_EQ(sinks.log->messages(), std::vector<std::string>{"unscheduleWithDispatchQueue:"});
    EXPECT_EQ(host.queue.use_count(), before);
    EXPECT_EQ(host.device->counts().unregisterCallback, 1);
    host.close();
    host.stop();
}

TEST(TolkaTouchHIDServiceLifecycleTest, UnscheduleWithoutScheduleOnlyDropsTheQueue) {
    SinkInstallation sinks;
    PlugInHost host;
    host.start();
    host.unschedule();
    EXPECT_EQ(sinks.log->messages(),
              (std::vector<std::string>{"startWithService:properties:", "unscheduleWithDispatchQueue:"}));
}

TEST(TolkaTouchHIDServiceLifecycleTest, ServiceHoldsTheQueueOnlyWhileScheduled) {
    PlugInHost host;
    const long before = host.queue.use_count();
    host.start();
    host.open();
    host.setEventCallback();
    host.schedule();
    EXPECT_GT(host.queue.use_count(), before);
    host.unschedule();
    EXPECT_EQ(host.queue.use_count(), before);
    host.close();
    host.stop();
}

TEST(TolkaTouchHIDServiceLifecycleTest, EventsUseTheCallbackTargetAndRefconSetBeforeTheLastSchedule) {
    PlugInHost host;
    host.run();  // callback: the host's collector, refcon: the host

    Testing::EventCollector later(host.queue);
    int laterRefcon = 0;
    (*host.service)->setEventCallback(host.service, Testing::EventCollector::callback, &later, &laterRefcon);
    host.write(firmwareEventReport(0));
    ASSERT_TRUE(host.collector.waitForCount(1));
    EXPECT_EQ(host.collector.events()[0].refcon, static_cast<void*>(&host));
    EXPECT_EQ(later.count(), 0u);

    host.unschedule();
    host.schedule();
    host.write(firmwareEventReport(0));
    ASSERT_TRUE(later.waitForCount(1));
    EXPECT_EQ(later.events()[0].target, static_cast<void*>(&later));
    EXPECT_EQ(later.events()[0].refcon, static_cast<void*>(&laterRefcon));
    host.halt();
    host.queue->sync([] {});
    EXPECT_EQ(host.collector.count(), 1u);
}

TEST(TolkaTouchHIDServiceLifecycleTest, RepeatedSchedulingRunsAFreshThreadEachTime) {
    PlugInHost host;
    host.start();
    host.open();
    host.setEventCallback();
    for (size_t cycle = 1; cycle <= 5; ++cycle) {
        host.schedule();
        host.write(firmwareEventReport(0));
        ASSERT_TRUE(host.collector.waitForCount(cycle));
        host.unschedule();
    }
    EXPECT_EQ(host.device->counts().registerCallback, 5);
    EXPECT_EQ(host.device->counts().unregisterCallback, 5);
    host.close();
    host.stop();
}

TEST(TolkaTouchHIDServiceLifecycleTest, ReportsWrittenWhileUnscheduledArriveWithTheNextSchedule) {
    PlugInHost host;
    host.run();
    host.unschedule();
    host.write(firmwareEventReport(0));
    host.write(firmwareEventReport(0));
    host.schedule();
    ASSERT_TRUE(host.collector.waitForCount(2));
    host.halt();
}

TEST(TolkaTouchHIDServiceLifecycleTest, RecordingOfAFreshServiceKeepsAtMost1350Frames) {
    PlugInHost host;
    host.run();
    const size_t written = 1400;
    for (size_t i = 0; i < written; ++i) host.write(firmwareEventReport(3, {static_cast<uint8_t>(i >> 8), static_cast<uint8_t>(i)}));
    host.write(firmwareEventReport(0));
    ASSERT_TRUE(host.collector.waitForCount(1));

    PropertyValue document = host.copyProperty("Recording");
    ASSERT_TRUE(document.isString());
    std::vector<uint8_t> bytes(document.string()->begin(), document.string()->end());
    PipelineRecording recording(&bytes);
    ASSERT_EQ(recording.frames().size(), 1350u);
    // The newest 1350 reports: the last of the 1400 code-3 events and the reset.
    EXPECT_EQ(recording.frames().back().report, firmwareEventReport(0));
    std::vector<uint8_t> oldest = firmwareEventReport(3, {static_cast<uint8_t>(51 >> 8), static_cast<uint8_t>(51)});
    EXPECT_EQ(recording.frames().front().report, oldest);
    host.halt();
}

TEST(TolkaTouchHIDServiceLifecycleTest, ThreadListensWithA512ByteBufferInItsPrivateModeAndUndoesItInReverse) {
    auto device = std::make_shared<Testing::CallLogDevice>();
    Testing::ServedDevice served(device);
    PlugInHost host;
    ASSERT_EQ((*host.plugin)->Start(host.plugin, nullptr, served.serviceHandle), HIDResult::Success);
    host.open();
    host.setEventCallback();
    host.schedule();
    ASSERT_TRUE(eventually([&] { return device->calls().size() == 3; }));
    host.unschedule();
    host.close();
    host.stop();
    EXPECT_EQ(device->calls(), (std::vector<std::string>{
                                   "open 0",
                                   "register 512 callback context",
                                   "schedule kHandleInputReportsRunLoopMode",
                                   "unschedule kHandleInputReportsRunLoopMode",
                                   "register 512 null null",
                                   "close 0",
                               }));
    EXPECT_TRUE(device->oneBufferThroughout());
}

TEST(TolkaTouchHIDServiceLifecycleTest, ReportLongerThan512BytesIsCutToTheThreadsBuffer) {
    PlugInHost host;
    host.run();
    std::vector<uint8_t> longReport(600, 0x07);
    longReport[0] = 0x09;
    host.write(longReport);
    host.write(firmwareEventReport(0));
    ASSERT_TRUE(host.collector.waitForCount(1));
    host.halt();

    PropertyValue document = host.copyProperty("Recording");
    std::vector<uint8_t> bytes(document.string()->begin(), document.string()->end());
    PipelineRecording recording(&bytes);
    ASSERT_EQ(recording.frames().size(), 2u);
    EXPECT_EQ(recording.frames().front().report, std::vector<uint8_t>(longReport.begin(), longReport.begin() + 512));
}

// A host that schedules before a successful start is in error; the service's thread then has no
// device to listen to, ends by itself, and unschedule still returns.
TEST(TolkaTouchHIDServiceLifecycleTest, ScheduleWithoutADeviceRunsAThreadThatEndsAndUnscheduleStillReturns) {
    SinkInstallation sinks;
    PlugInHost host;
    host.setEventCallback();
    host.schedule();
    host.unschedule();
    EXPECT_TRUE(eventually([&] { return hasLine(*sinks.log, "input report thread end"); }));
    EXPECT_TRUE(hasLine(*sinks.log, "input report thread exited"));
    EXPECT_EQ(host.device->counts(), SimulatedHIDDevice::Counts{});
}

TEST(TolkaTouchHIDServiceLifecycleTest, ServiceReleasedRightAfterUnscheduleIsDestroyed) {
    SinkInstallation sinks;
    for (int i = 0; i < 20; ++i) {
        PlugInHost host;
        host.run();
        host.write(firmwareEventReport(0));
        host.halt();
        host.release();  // a delivery may still be queued: it keeps the service until it has run
        host.queue->sync([] {});
    }
    ASSERT_TRUE(eventually([&] {
        size_t deallocs = 0;
        for (const std::string& line : sinks.log->messages()) deallocs += line == "dealloc";
        return deallocs == 20;
    }));
}

}  // namespace
}  // namespace TolkaTouch

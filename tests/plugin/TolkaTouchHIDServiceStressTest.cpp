// Reports, property traffic and rescheduling all at once, the device unplugged while reports
// stream, and the service taken down with events still queued: nothing is lost, nothing is
// reordered, nothing deadlocks, and (under the thread sanitizer) nothing races.
#include <gtest/gtest.h>

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <future>
#include <thread>

#include "pipeline/PipelineRecording.h"
#include "tests/plugin/PlugInHost.h"

namespace TolkaTouch {
namespace {

using Testing::firmwareEventReport;
using Testing::PlugInHost;

constexpr size_t kReports = 20000;
constexpr size_t kCycles = 5;
constexpr auto kTimeLimit = std::chrono::minutes(8);

// Ends the process when the test outlives its limit: a deadlock must fail the run, not hang it.
class Watchdog {
public:
    Watchdog() : _thread([this] { watch(); }) {}
    ~Watchdog() {
        {
            std::lock_guard lock(_mutex);
            _done = true;
        }
        _changed.notify_all();
        _thread.join();
    }

private:
    void watch() {
        std::unique_lock lock(_mutex);
        if (!_changed.wait_for(lock, kTimeLimit, [this] { return _done; })) {
            std::fprintf(stderr, "stress test still running after its time limit: deadlock\n");
            std::abort();
        }
    }
    std::mutex _mutex;
    std::condition_variable _changed;
    bool _done = false;
    std::thread _thread;
};

// Counts lines without keeping them: the debug level stays on so that every logging path runs.
class CountingLogSink : public LogSink {
public:
    void write(const LogRecord&) override { count.fetch_add(1, std::memory_order_relaxed); }
    std::atomic<size_t> count{0};
};

// Firmware resets numbered by their context bytes: each yields exactly one event while no touch
// is in progress, and its number comes back in the firmware event trace point.
std::vector<uint8_t> numberedReset(uint32_t number) {
    return firmwareEventReport(0, {0, 0, 0, 0, static_cast<uint8_t>(number >> 24), static_cast<uint8_t>(number >> 16),
                                   static_cast<uint8_t>(number >> 8), static_cast<uint8_t>(number)});
}

TEST(TolkaTouchHIDServiceStressTest, ReportsPropertiesAndReschedulingTogetherLoseAndReorderNothing) {
    Watchdog watchdog;
    auto logSink = std::make_shared<CountingLogSink>();
    auto traceSink = std::make_shared<Trace::MemorySink>();
    SystemLog::setSink(logSink);
    SystemLog::setDebugEnabled(true);
    Trace::setSink(traceSink);

    PlugInHost host;
    host.start();
    ASSERT_TRUE(host.open());
    host.setEventCallback();

    std::atomic<bool> finished{false};
    std::thread writer([&] {
        for (uint32_t number = 0; number < kReports; ++number) {
            host.write(numberedReset(number));
            if (number % 64 == 63) std::this_thread::sleep_for(std::chrono::microseconds(200));
        }
    });
    size_t documentsRead = 0;
    std::thread propertyTraffic([&] {
        for (uint32_t round = 0; !finished.load(); ++round) {
            PropertyValue document = host.copyProperty("Recording");
            if (!document.isString()) ADD_FAILURE() << "Recording is not a document";
            ++documentsRead;
            host.setProperty("Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue(400 + round % 200));
            host.setProperty("Pipeline.Algs.EnableTapSuppression", PropertyValue(round % 2 == 0));
            host.setProperty("Pipeline.Algs.ActivationThreshold", PropertyValue(150.0 + round % 100));
            host.copyProperty("Pipeline.Algs.DebugInfo");
        }
    });

    for (size_t cycle = 1; cycle <= kCycles; ++cycle) {
        host.schedule();
        const size_t target = kReports * cycle / kCycles;
        host.collector.waitForCount(target, std::chrono::duration<double>(kTimeLimit).count());
        host.unschedule();
    }
    writer.join();
    finished = true;
    propertyTraffic.join();
    host.queue->sync([] {});  // deliveries queued before the last unschedule have run

    // Every report was handled once, in the order written.
    std::vector<uint64_t> handled;
    for (const Trace::Record& record : traceSink->records()) {
        if (record.code == 0x2B15018C) handled.push_back(record.arg2);
    }
    ASSERT_EQ(handled.size(), kReports);
    for (size_t i = 0; i < kReports; ++i) ASSERT_EQ(handled[i], i) << "report handled out of order";

    // Every report's event reached the host once, on the host's queue, in the order of the reports.
    std::vector<Testing::ReceivedEvent> events = host.collector.events();
    ASSERT_EQ(events.size(), kReports);
    for (size_t i = 0; i < kReports; ++i) {
        ASSERT_TRUE(events[i].onQueue);
        ASSERT_EQ(events[i].event->type, HIDEventType::VendorDefined);
        if (i > 0) {
            ASSERT_GT(events[i].event->timestamp, events[i - 1].event->timestamp) << "event " << i;
        }
    }

    // The events' time stamps are the recording's readings of the newest reports, report by report.
    PropertyValue document = host.copyProperty("Recording");
    std::vector<uint8_t> bytes(document.string()->begin(), document.string()->end());
    PipelineRecording recording(&bytes);
    std::vector<const PipelineRecording::Frame*> reports;
    for (const auto& frame : recording.frames()) {
        if (frame.type == PipelineRecording::FrameType::InputReport) reports.push_back(&frame);
    }
    ASSERT_EQ(reports.size(), 1350u);
    for (size_t i = 0; i < reports.size(); ++i) {
        const size_t number = kReports - reports.size() + i;
        EXPECT_EQ(reports[i]->report, numberedReset(static_cast<uint32_t>(number)));
        EXPECT_EQ(reports[i]->timestamp, events[number].event->timestamp);
    }
    EXPECT_GT(documentsRead, 0u);

    host.close();
    host.stop();
    host.release();
    Trace::setSink(nullptr);
    SystemLog::setSink(nullptr);
}

// Events carry the service's clock: one after another, in the order of their reports.
void expectOnePerReportInOrder(const std::vector<Testing::ReceivedEvent>& events, size_t reports) {
    ASSERT_EQ(events.size(), reports);
    for (size_t i = 0; i < events.size(); ++i) {
        ASSERT_TRUE(events[i].onQueue);
        ASSERT_EQ(events[i].event->type, HIDEventType::VendorDefined);
        if (i > 0) {
            ASSERT_GT(events[i].event->timestamp, events[i - 1].event->timestamp) << "event " << i;
        }
    }
}

TEST(TolkaTouchHIDServiceStressTest, UnplugWhileReportsStreamDeliversEveryReportTakenOnceInOrder) {
    Watchdog watchdog;
    SystemLog::setSink(std::make_shared<CountingLogSink>());
    PlugInHost host;
    host.run();

    // The writer goes on until the device refuses: every report it got in is an event.
    size_t accepted = 0;
    std::thread writer([&] {
        for (uint32_t number = 0; host.device->writeInputReport(numberedReset(number)); ++number) {
            ++accepted;
            if (number % 64 == 63) std::this_thread::sleep_for(std::chrono::microseconds(200));
        }
    });
    std::atomic<bool> unplugged{false};
    std::thread propertyTraffic([&] {
        for (uint32_t round = 0; !unplugged.load(); ++round) {
            host.copyProperty("Recording");
            host.setProperty("Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue(400 + round % 200));
        }
    });
    ASSERT_TRUE(host.collector.waitForCount(500, std::chrono::duration<double>(kTimeLimit).count()));
    host.device->simulateRemoval();
    writer.join();
    unplugged = true;
    propertyTraffic.join();
    ASSERT_TRUE(Testing::eventually([&] { return host.collector.count() >= accepted; },
                                    std::chrono::duration<double>(kTimeLimit).count()));
    host.halt();
    host.queue->sync([] {});

    expectOnePerReportInOrder(host.collector.events(), accepted);
    EXPECT_FALSE(host.device->writeInputReport(numberedReset(0)));
    host.release();
    SystemLog::setSink(nullptr);
}

TEST(TolkaTouchHIDServiceStressTest, ServiceTakenDownWithEventsStillQueuedDeliversThemAfterItsLastRelease) {
    Watchdog watchdog;
    auto traceSink = std::make_shared<Trace::MemorySink>();
    Trace::setSink(traceSink);
    SystemLog::setSink(std::make_shared<CountingLogSink>());
    PlugInHost host;
    host.run();

    // The host's queue is busy elsewhere: the service's deliveries pile up behind this task.
    std::promise<void> hostBusy;
    std::shared_future<void> hostFree = hostBusy.get_future().share();
    host.queue->async([hostFree] { hostFree.wait(); });
    constexpr uint32_t kQueued = 2000;
    for (uint32_t number = 0; number < kQueued; ++number) host.write(numberedReset(number));
    const auto handled = [&] {
        size_t count = 0;
        for (const Trace::Record& record : traceSink->records()) count += record.code == 0x2B15018C;
        return count;
    };
    ASSERT_TRUE(Testing::eventually([&] { return handled() == kQueued; },
                                    std::chrono::duration<double>(kTimeLimit).count()));
    EXPECT_EQ(host.collector.count(), 0u);

    // Unschedule, close, stop and the last release while every event still waits in the queue.
    host.halt();
    host.release();
    hostBusy.set_value();
    host.queue->sync([] {});

    expectOnePerReportInOrder(host.collector.events(), kQueued);
    Trace::setSink(nullptr);
    SystemLog::setSink(nullptr);
}

}  // namespace
}  // namespace TolkaTouch

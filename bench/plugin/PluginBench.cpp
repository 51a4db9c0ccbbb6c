// Speed of the plug-in where a host feels it:
//  - ReportToCallbackLatency: a report written into the simulated device until the host's event
//    callback runs on the host's queue, through the built library loaded with dlopen; one report
//    (a firmware reset, one event) in flight at a time. Reported: median and 99th percentile.
//  - RecordingCopyUnderLock: how long a "Recording" read holds the pipeline lock, which is the
//    copy of the recording the read makes before it writes the document outside the lock.
#include <benchmark/benchmark.h>
#include <dlfcn.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <vector>

#include "platform/DispatchQueue.h"
#include "platform/HIDServiceRegistry.h"
#include "platform/Log.h"
#include "platform/SimulatedHIDDevice.h"
#include "platform/Trace.h"
#include "tolkatouch/HIDServicePlugin.h"
#include "plugin/TolkaTouchHIDService.h"

namespace TolkaTouch {
namespace {

using Clock = std::chrono::steady_clock;

// Lines are dropped: the figures are the plug-in's, not the terminal's or the journal's.
class DiscardingLogSink : public LogSink {
public:
    void write(const LogRecord&) override {}
};

struct CallbackTarget {
    std::atomic<uint64_t> count{0};
    Clock::time_point lastCall;
};

void eventCallback(void* target, void*, void*, const HIDEventRef&, uint32_t) {
    auto* callbackTarget = static_cast<CallbackTarget*>(target);
    callbackTarget->lastCall = Clock::now();
    callbackTarget->count.fetch_add(1, std::memory_order_release);
    callbackTarget->count.notify_one();
}

// Times the trace points of the road of one report: the input report probe on the report thread
// and the dispatch task landing on the host's queue, to split the latency into its hops.
class HopTimes : public Trace::Sink {
public:
    void record(const Trace::Record& record) override {
        if (record.code == 0x2B150180) reportThread.store(Clock::now().time_since_epoch().count());
        if (record.code == 0x2B150184) queueLanding.store(Clock::now().time_since_epoch().count());
    }
    std::atomic<Clock::rep> reportThread{0};
    std::atomic<Clock::rep> queueLanding{0};
};

double microsecondsBetween(Clock::rep from, Clock::rep to) {
    return std::chrono::duration<double, std::micro>(Clock::duration(to - from)).count();
}

Host::PlugInFactoryFunction loadFactory() {
    void* library = dlopen(TOLKA_PLUGIN_PATH, RTLD_NOW | RTLD_LOCAL);
    if (!library) {
        std::fprintf(stderr, "cannot load %s: %s\n", TOLKA_PLUGIN_PATH, dlerror());
        std::abort();
    }
    return reinterpret_cast<Host::PlugInFactoryFunction>(dlsym(library, Host::kFactorySymbol));
}

double percentile(std::vector<double> values, double fraction) {
    std::sort(values.begin(), values.end());
    size_t index = static_cast<size_t>(fraction * static_cast<double>(values.size() - 1) + 0.5);
    return values[std::min(index, values.size() - 1)];
}

std::vector<uint8_t> firmwareReset() {
    return {2, 0, 0, 0, 0, 0, 0, 0, 0, 0};
}

void ReportToCallbackLatency(benchmark::State& state) {
    SystemLog::setSink(std::make_shared<DiscardingLogSink>());
    SystemLog::setDebugEnabled(false);

    const uint32_t serviceHandle = 0xBE0C;
    std::shared_ptr<SimulatedHIDDevice> device = SimulatedHIDDevice::create();
    HIDServiceRegistry::registerService(serviceHandle, [device] { return device; });
    static Host::PlugInFactoryFunction factory = loadFactory();
    auto plugin = static_cast<Host::PlugInInterface**>(factory(nullptr, Host::kHIDServicePlugInTypeID));
    Host::HIDServiceInterface** service = nullptr;
    (*plugin)->QueryInterface(plugin, Host::kHIDServiceInterfaceID, reinterpret_cast<void**>(&service));
    DispatchQueueRef queue = DispatchQueue::create("latency bench");
    CallbackTarget target;
    (*plugin)->Start(plugin, nullptr, serviceHandle);
    (*service)->open(service, 0);
    (*service)->setEventCallback(service, eventCallback, &target, nullptr);
    (*service)->scheduleWithDispatchQueue(service, &queue);

    auto hops = std::make_shared<HopTimes>();
    Trace::setSink(hops);

    const std::vector<uint8_t> report = firmwareReset();
    std::vector<double> latencies, toReportThread, toQueue;
    latencies.reserve(static_cast<size_t>(state.max_iterations));
    toReportThread.reserve(static_cast<size_t>(state.max_iterations));
    toQueue.reserve(static_cast<size_t>(state.max_iterations));
    for (auto _ : state) {
        const uint64_t before = target.count.load(std::memory_order_acquire);
        const Clock::time_point written = Clock::now();
        device->writeInputReport(report);
        for (uint64_t now = before; now == before; now = target.count.load(std::memory_order_acquire)) {
            target.count.wait(now, std::memory_order_acquire);
        }
        const double seconds = std::chrono::duration<double>(target.lastCall - written).count();
        latencies.push_back(seconds * 1e6);
        toReportThread.push_back(microsecondsBetween(written.time_since_epoch().count(), hops->reportThread.load()));
        toQueue.push_back(microsecondsBetween(hops->reportThread.load(), hops->queueLanding.load()));
        state.SetIterationTime(seconds);
    }
    Trace::setSink(nullptr);
    state.counters["to_report_thread_median_us"] = percentile(toReportThread, 0.50);
    state.counters["to_queue_median_us"] = percentile(toQueue, 0.50);
    state.counters["median_us"] = percentile(latencies, 0.50);
    state.counters["p99_us"] = percentile(latencies, 0.99);
    state.counters["max_us"] = percentile(latencies, 1.0);

    (*service)->unscheduleFromDispatchQueue(service, &queue);
    (*service)->close(service, 0);
    (*plugin)->Stop(plugin);
    (*service)->Release(service);
    (*plugin)->Release(plugin);
    HIDServiceRegistry::unregisterService(serviceHandle);
    SystemLog::setSink(nullptr);
}
BENCHMARK(ReportToCallbackLatency)->Iterations(10000)->UseManualTime()->Unit(benchmark::kMicrosecond);

// The service with its lock and recording in reach, filled through the recording as the input
// report thread fills it.
class FilledService : public TolkaTouchHIDService {
public:
    void fill(size_t reports) {
        std::vector<uint8_t> image(73, 0);
        image[0] = 1;
        std::lock_guard lock(_pipelineLock);
        for (size_t i = 0; i < reports; ++i) {
            image[1] = static_cast<uint8_t>(i);
            image[2] = static_cast<uint8_t>(i >> 8);
            _recording.handleInputReport(image.data(), image.size());
        }
    }
    size_t frameCount() {
        std::lock_guard lock(_pipelineLock);
        return _recording.frames().size();
    }
    // What a "Recording" read does while it holds the lock.
    double copyUnderLockSeconds() {
        std::unique_lock lock(_pipelineLock);
        const Clock::time_point locked = Clock::now();
        PipelineRecording copy = _recording;
        const Clock::time_point copied = Clock::now();
        lock.unlock();
        benchmark::DoNotOptimize(copy);
        return std::chrono::duration<double>(copied - locked).count();
    }
};

// Argument: input reports written. 1350 is the kept history right after a trim; 2699 is the
// most the list holds (one more report and it is trimmed back to 1350).
void RecordingCopyUnderLock(benchmark::State& state) {
    SystemLog::setSink(std::make_shared<DiscardingLogSink>());
    auto* service = new FilledService();
    service->fill(static_cast<size_t>(state.range(0)));
    std::vector<double> held;
    for (auto _ : state) {
        const double seconds = service->copyUnderLockSeconds();
        held.push_back(seconds * 1e6);
        state.SetIterationTime(seconds);
    }
    state.counters["frames"] = static_cast<double>(service->frameCount());
    state.counters["median_us"] = percentile(held, 0.50);
    state.counters["p99_us"] = percentile(held, 0.99);
    service->release();
    SystemLog::setSink(nullptr);
}
BENCHMARK(RecordingCopyUnderLock)->Arg(1350)->Arg(2699)->Iterations(2000)->UseManualTime()->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace TolkaTouch

BENCHMARK_MAIN();

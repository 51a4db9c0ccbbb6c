// Per-frame cost of Algs::handleImage with the debug level off, over a repeating mixed sequence
// of idle frames, taps in each region, holds and a sliding hold. Also counts heap allocations
// per frame by replacing the global allocation functions, apart for frames without and with an
// event. It uses only what every recognizer since the frame verdict offers, so compare.sh builds
// this same file against an earlier commit's recognizer.

#include <benchmark/benchmark.h>

#include <atomic>
#include <cstdlib>
#include <new>
#include <vector>

#include "algs/Algs.h"
#include "platform/Log.h"
#include "tests/algs/TouchScript.h"

namespace {

std::atomic<uint64_t> allocationCount{0};

}  // namespace

void* operator new(std::size_t size) {
    allocationCount.fetch_add(1, std::memory_order_relaxed);
    if (void* p = std::malloc(size == 0 ? 1 : size)) return p;
    throw std::bad_alloc();
}
void* operator new[](std::size_t size) { return operator new(size); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    allocationCount.fetch_add(1, std::memory_order_relaxed);
    return std::malloc(size == 0 ? 1 : size);
}
void* operator new[](std::size_t size, const std::nothrow_t& tag) noexcept { return operator new(size, tag); }
void operator delete(void* p) noexcept { std::free(p); }
void operator delete[](void* p) noexcept { std::free(p); }
void operator delete(void* p, std::size_t) noexcept { std::free(p); }
void operator delete[](void* p, std::size_t) noexcept { std::free(p); }
void operator delete(void* p, const std::nothrow_t&) noexcept { std::free(p); }
void operator delete[](void* p, const std::nothrow_t&) noexcept { std::free(p); }

namespace TolkaTouch {
namespace {

constexpr uint32_t kSequenceMs = 6000;

// About six seconds of use: idle stretches, a tap in each region, a hold, a hold that slides from
// one region to another, and a light brush.
std::vector<InputReport::Image> mixedSequence() {
    Algs unused;
    Testing::TouchScript script(unused, 0, 0);
    script.touch("CD", 600, 400, 496)
        .touch("MN", 600, 1000, 1096)
        .touch("HI", 600, 1600, 1696)
        .touch("CD", 600, 2200, 2900)
        .touch("N", 600, 3400, 4000)
        .ramp("N", 600, 100, 4000, 4200)
        .ramp("H", 100, 600, 4000, 4200)
        .touch("H", 600, 4200, 4400)
        .ramp("C", 80, 240, 4800, 5184);
    std::vector<InputReport::Image> frames;
    uint32_t frame = 0;
    for (uint32_t t = 0; t < kSequenceMs; t += Testing::kFramePeriodMs) {
        InputReport::Image image = script.imageAt(t);
        image.frameNumber = frame++;
        frames.push_back(image);
    }
    return frames;
}

void BM_HandleImageMixedSequence(benchmark::State& state) {
    SystemLog::setDebugEnabled(false, "Algs");
    const std::vector<InputReport::Image> frames = mixedSequence();
    Algs algs;
    size_t next = 0;
    uint32_t cycle = 0;
    uint64_t events = 0;
    // Allocations split by what the frame gave: nothing (idle, touching, holding) or events. The
    // list the events come in is counted with them.
    uint64_t quietFrames = 0;
    uint64_t quietAllocations = 0;
    uint64_t eventFrames = 0;
    uint64_t eventAllocations = 0;
    for (auto _ : state) {
        InputReport::Image image = frames[next];
        image.timeMs += cycle * kSequenceMs;
        image.frameNumber += static_cast<uint32_t>(cycle * frames.size());
        const uint64_t before = allocationCount.load(std::memory_order_relaxed);
        const EventList out = algs.handleImage(image);
        const uint64_t made = allocationCount.load(std::memory_order_relaxed) - before;
        events += out.size();
        if (out.empty()) {
            ++quietFrames;
            quietAllocations += made;
        } else {
            ++eventFrames;
            eventAllocations += made;
        }
        benchmark::DoNotOptimize(out.data());
        if (++next == frames.size()) {
            next = 0;
            ++cycle;
        }
    }
    const auto perFrame = [](uint64_t allocations, uint64_t frames) {
        return frames == 0 ? 0.0 : static_cast<double>(allocations) / static_cast<double>(frames);
    };
    state.counters["allocs/frame"] =
        benchmark::Counter(static_cast<double>(quietAllocations + eventAllocations), benchmark::Counter::kAvgIterations);
    state.counters["allocs/quiet"] = perFrame(quietAllocations, quietFrames);
    state.counters["allocs/event"] = perFrame(eventAllocations, eventFrames);
    state.counters["events/frame"] = benchmark::Counter(static_cast<double>(events), benchmark::Counter::kAvgIterations);
}
BENCHMARK(BM_HandleImageMixedSequence)->Repetitions(10)->ReportAggregatesOnly(true);

void BM_HandleImageIdle(benchmark::State& state) {
    SystemLog::setDebugEnabled(false, "Algs");
    Algs algs;
    InputReport::Image image{};
    const uint64_t allocationsBefore = allocationCount.load();
    for (auto _ : state) {
        image.timeMs += Testing::kFramePeriodMs;
        ++image.frameNumber;
        const EventList out = algs.handleImage(image);
        benchmark::DoNotOptimize(out.data());
    }
    state.counters["allocs/frame"] = benchmark::Counter(static_cast<double>(allocationCount.load() - allocationsBefore),
                                                        benchmark::Counter::kAvgIterations);
}
BENCHMARK(BM_HandleImageIdle)->Repetitions(10)->ReportAggregatesOnly(true);

}  // namespace
}  // namespace TolkaTouch

BENCHMARK_MAIN();

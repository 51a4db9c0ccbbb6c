// Heap allocations of the recognizer per frame, counted exactly by replacing the global
// allocation functions in this test program: a frame that gives no event allocates nothing, and a
// frame that gives an event allocates that event only, also through the list handleImage returns.

#include <gtest/gtest.h>

#include <cstdlib>
#include <map>
#include <new>
#include <vector>

#include "algs/Algs.h"
#include "platform/Log.h"
#include "tests/algs/TouchScript.h"

namespace {

// Single-threaded: the test's frames run on its one thread.
uint64_t allocationCount = 0;

}  // namespace

void* operator new(std::size_t size) {
    ++allocationCount;
    if (void* p = std::malloc(size == 0 ? 1 : size)) return p;
    throw std::bad_alloc();
}
void* operator new[](std::size_t size) { return operator new(size); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    ++allocationCount;
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

struct FrameCost {
    Transition transition;
    size_t events;
    uint64_t allocations;
};

enum class Path { ReusedList, HandleImage };

// Idle, a tap, a hold in one region, a hold that slides to another region, a light brush that is
// not a touch, and idle again; every frame either through processTouchFrame into one list that is
// emptied, not rebuilt, between frames, or through handleImage, which makes a list per frame.
std::vector<FrameCost> costOfEachFrame(Path path = Path::ReusedList) {
    SystemLog::setDebugEnabled(false, "Algs");
    Algs algs;
    Testing::TouchScript script(algs, 0, 0);
    script.touch("CD", 600, 400, 496)
        .touch("MN", 600, 1000, 1800)
        .touch("N", 600, 2400, 3000)
        .ramp("N", 600, 100, 3000, 3200)
        .ramp("H", 100, 600, 3000, 3200)
        .touch("H", 600, 3200, 3400)
        .ramp("C", 80, 240, 3800, 4184);
    EventList out;
    std::vector<FrameCost> costs;
    costs.reserve(1000);
    for (uint32_t t = 0; t < 5000; t += Testing::kFramePeriodMs) {
        const InputReport::Image image = script.imageAt(t);
        const uint64_t before = allocationCount;
        size_t events = 0;
        if (path == Path::ReusedList) {
            out.clear();
            algs.processTouchFrame(image.pixels, t / Testing::kFramePeriodMs, t, out);
            events = out.size();
        } else {
            // The list is made and goes away within the frame, so its own cost is counted too.
            events = algs.handleImage(image).size();
        }
        costs.push_back({algs.verdict().transition, events, allocationCount - before});
    }
    return costs;
}

TEST(AlgsAllocationTest, IdleTouchingAndHoldingFramesAllocateNothing) {
    std::map<Transition, size_t> quietFrames;
    for (const FrameCost& cost : costOfEachFrame()) {
        if (cost.events != 0) continue;
        ++quietFrames[cost.transition];
        EXPECT_EQ(cost.allocations, 0u) << "transition " << static_cast<int>(cost.transition);
    }
    // The sequence does reach each kind of quiet frame.
    EXPECT_GT(quietFrames[Transition::Idle], 100u);
    EXPECT_GT(quietFrames[Transition::Touching], 50u);
    EXPECT_GT(quietFrames[Transition::Holding], 50u);
}

TEST(AlgsAllocationTest, FrameWithAnEventAllocatesTheEventOnly) {
    size_t eventFrames = 0;
    for (const FrameCost& cost : costOfEachFrame()) {
        if (cost.events == 0) continue;
        ++eventFrames;
        EXPECT_EQ(cost.events, 1u);
        EXPECT_EQ(cost.allocations, 1u) << "transition " << static_cast<int>(cost.transition);
    }
    // May-begin, tap; may-begin, hold start, hold end (twice, with a hold change between).
    EXPECT_GE(eventFrames, 8u);
}

TEST(AlgsAllocationTest, ListThatHandleImageReturnsCostsNothingBeyondTheEvent) {
    size_t eventFrames = 0;
    for (const FrameCost& cost : costOfEachFrame(Path::HandleImage)) {
        EXPECT_EQ(cost.allocations, cost.events) << "transition " << static_cast<int>(cost.transition);
        eventFrames += cost.events;
    }
    EXPECT_GE(eventFrames, 8u);
}

}  // namespace
}  // namespace TolkaTouch

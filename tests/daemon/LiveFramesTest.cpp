#include "daemon/LiveFrames.h"

#include <gtest/gtest.h>
#include <poll.h>

#include <chrono>

#include <nlohmann/json.hpp>

namespace TolkaTouch {
namespace {

using namespace std::chrono_literals;

// The report threads' clock, advanced by the test as frames would arrive.
struct SimulatedClock {
    std::chrono::nanoseconds now{1'000'000'000};
    LiveFrames::Clock function() {
        return [this] { return now; };
    }
};

// How many frames, arriving every `spacing` for `span`, are due.
size_t dueFrames(LiveFrames& live, SimulatedClock& clock, std::chrono::nanoseconds spacing,
                 std::chrono::nanoseconds span) {
    size_t due = 0;
    for (auto end = clock.now + span; clock.now < end; clock.now += spacing) due += live.due();
    return due;
}

PropertyValue snapshotOfFrame(unsigned frame) {
    return PropertyValue(PropertyValue::Dictionary{{"frame", PropertyValue(frame)},
                                                   {"touch_score", PropertyValue(0.1f)}});
}

bool readable(int fd) {
    pollfd ready{fd, POLLIN, 0};
    return ::poll(&ready, 1, 0) > 0;
}

TEST(LiveFramesTest, NoFrameIsDueWhileNobodyFollows) {
    SimulatedClock clock;
    LiveFrames live(clock.function());
    EXPECT_EQ(dueFrames(live, clock, 8ms, 1s), 0u);
}

TEST(LiveFramesTest, FramesAt125ASecondAreCutToSixtyASecondOfTheSimulatedClock) {
    SimulatedClock clock;
    LiveFrames live(clock.function());
    live.setActive(true);
    EXPECT_EQ(dueFrames(live, clock, 8ms, 10s), 600u);
}

TEST(LiveFramesTest, FramesAtAThousandASecondAreCutToSixtyASecond) {
    SimulatedClock clock;
    LiveFrames live(clock.function());
    live.setActive(true);
    EXPECT_EQ(dueFrames(live, clock, 1ms, 1s), 60u);
}

TEST(LiveFramesTest, FramesSlowerThanTheCapAreAllDue) {
    SimulatedClock clock;
    LiveFrames live(clock.function());
    live.setActive(true);
    EXPECT_EQ(dueFrames(live, clock, 50ms, 1s), 20u);
}

TEST(LiveFramesTest, APauseIsNotMadeUpForWithABurst) {
    SimulatedClock clock;
    LiveFrames live(clock.function());
    live.setActive(true);
    EXPECT_EQ(dueFrames(live, clock, 1ms, 1s), 60u);
    clock.now += 5s;  // no frames
    EXPECT_EQ(dueFrames(live, clock, 1ms, 100ms), 6u);
}

TEST(LiveFramesTest, TheLoopGetsTheNewestSnapshotHandedOverAsOneLine) {
    SimulatedClock clock;
    LiveFrames live(clock.function());
    live.hand(2, snapshotOfFrame(10));
    live.hand(2, snapshotOfFrame(11));
    EXPECT_TRUE(readable(live.pollFd()));
    const auto line = live.take();
    ASSERT_TRUE(line);
    const auto frame = nlohmann::json::parse(*line).at("frame");
    EXPECT_EQ(frame.at("service"), 2);
    EXPECT_EQ(frame.at("frame"), 11);
    // The float's exact value, as the Python package's float32 arrays hold it.
    EXPECT_EQ(frame.at("touch_score").get<double>(), static_cast<double>(0.1f));
    EXPECT_EQ(live.replaced(), 1u);
    EXPECT_FALSE(readable(live.pollFd()));
    EXPECT_FALSE(live.take());
}

}  // namespace
}  // namespace TolkaTouch

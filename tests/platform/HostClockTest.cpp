#include "platform/HostClock.h"

#include <gtest/gtest.h>

namespace TolkaTouch {
namespace {

TEST(HostClockTest, TicksNeverGoBackwards) {
    uint64_t previous = Host::absoluteTime();
    for (int i = 0; i < 1000; ++i) {
        const uint64_t now = Host::absoluteTime();
        EXPECT_GE(now, previous);
        previous = now;
    }
}

TEST(HostClockTest, TimebaseIsOneToOneUntilAnotherIsInstalled) {
    const Timebase base = Host::timebase();
    EXPECT_EQ(base.numerator, 1u);
    EXPECT_EQ(base.denominator, 1u);
}

TEST(HostClockTest, InstalledTimebaseReadsBackExactly) {
    Host::setTimebase(Timebase{125, 3});
    EXPECT_EQ(Host::timebase().numerator, 125u);
    EXPECT_EQ(Host::timebase().denominator, 3u);
    Host::setTimebase(Timebase{UINT32_MAX, 0});
    EXPECT_EQ(Host::timebase().numerator, UINT32_MAX);
    EXPECT_EQ(Host::timebase().denominator, 0u);
    Host::setTimebase(Timebase{1, 1});
}

TEST(HostClockTest, ClockValueUsesTheHostByDefaultAndCanBeReplaced) {
    HostClock clock;
    ASSERT_TRUE(clock.now);
    ASSERT_TRUE(clock.sleepMicroseconds);
    EXPECT_GT(clock.now(), 0u);
    clock.sleepMicroseconds(0);

    uint64_t fake = 1000;
    uint64_t slept = 0;
    HostClock fakeClock{[&] { return fake; }, [&](uint64_t microseconds) {
                            slept += microseconds;
                            fake += microseconds * 1000;
                        }};
    fakeClock.sleepMicroseconds(5);
    EXPECT_EQ(slept, 5u);
    EXPECT_EQ(fakeClock.now(), 6000u);
}

}  // namespace
}  // namespace TolkaTouch

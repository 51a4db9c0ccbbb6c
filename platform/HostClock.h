#pragma once
// The host clock: a monotonic tick count with its tick-to-nanosecond timebase, and a sleep.
// Ticks are CLOCK_MONOTONIC nanoseconds with a 1/1 timebase unless a test installs another pair.
// HostClock bundles "now" and "sleep" as replaceable functions so that the code that paces or
// stamps frames can run on a fake clock in tests.

#include <cstdint>
#include <functional>

namespace TolkaTouch {

struct Timebase {
    uint32_t numerator = 1;
    uint32_t denominator = 1;
};

namespace Host {
uint64_t absoluteTime();                  // current tick count
Timebase timebase();                      // nanoseconds = ticks * numerator / denominator
void setTimebase(Timebase timebase);      // before the first conversion; for tests and other tick sources
void sleepMicroseconds(uint64_t microseconds);  // may sleep longer, never shorter
}  // namespace Host

struct HostClock {
    std::function<uint64_t()> now = Host::absoluteTime;
    std::function<void(uint64_t microseconds)> sleepMicroseconds = Host::sleepMicroseconds;
};

}  // namespace TolkaTouch

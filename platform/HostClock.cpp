#include "platform/HostClock.h"

#include <atomic>
#include <cerrno>
#include <ctime>

namespace TolkaTouch::Host {

namespace {
std::atomic<uint64_t> installedTimebase{(uint64_t{1} << 32) | 1};
}

uint64_t absoluteTime() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<uint64_t>(now.tv_sec) * 1000000000ull + static_cast<uint64_t>(now.tv_nsec);
}

Timebase timebase() {
    const uint64_t packed = installedTimebase.load(std::memory_order_acquire);
    return Timebase{static_cast<uint32_t>(packed >> 32), static_cast<uint32_t>(packed)};
}

void setTimebase(Timebase timebase) {
    installedTimebase.store((uint64_t{timebase.numerator} << 32) | timebase.denominator, std::memory_order_release);
}

void sleepMicroseconds(uint64_t microseconds) {
    timespec request{static_cast<time_t>(microseconds / 1000000), static_cast<long>(microseconds % 1000000) * 1000};
    while (nanosleep(&request, &request) != 0 && errno == EINTR) {
    }
}

}  // namespace TolkaTouch::Host

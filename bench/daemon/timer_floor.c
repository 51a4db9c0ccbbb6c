// The least a paced report can cost on this machine: one thread waking N times at 125 Hz on an
// absolute timer (timerfd + epoll, as the daemon's report thread waits for the simulated device's
// timer: one epoll_wait, then setting the timer for the next report, which also forgets the
// firing) and doing nothing else. bench/daemon/wake_floor.c compares other ways of waiting. Prints its own CPU per wake-up (from /proc/self/schedstat) and
// the share of one core that is at 125 wake-ups a second: the floor under tolkatouchd's figure.
//
//   cc -O2 -o /tmp/timer_floor bench/daemon/timer_floor.c && /tmp/timer_floor 3750
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <sys/epoll.h>
#include <sys/timerfd.h>
#include <time.h>
#include <unistd.h>

int main(int argc, char** argv) {
    const int count = argc > 1 ? atoi(argv[1]) : 3750;
    const int timer = timerfd_create(CLOCK_MONOTONIC, TFD_NONBLOCK);
    const int poller = epoll_create1(0);
    struct epoll_event event = {.events = EPOLLIN};
    epoll_ctl(poller, EPOLL_CTL_ADD, timer, &event);
    struct timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    uint64_t due = (uint64_t)now.tv_sec * 1000000000u + (uint64_t)now.tv_nsec;
    for (int i = 0; i < count; ++i) {
        due += 8000000;  // 125 Hz
        const struct itimerspec at = {{0, 0}, {(time_t)(due / 1000000000u), (long)(due % 1000000000u)}};
        timerfd_settime(timer, TFD_TIMER_ABSTIME, &at, NULL);
        epoll_wait(poller, &event, 1, -1);
    }
    unsigned long long running = 0;
    FILE* stats = fopen("/proc/self/schedstat", "r");
    if (stats == NULL || fscanf(stats, "%llu", &running) != 1) return 1;
    const double perWake = (double)running / count;  // nanoseconds
    printf("%d wake-ups: %.1f us of CPU each, %.3f %% of one core at 125 a second\n", count, perWake / 1000.0,
           perWake * 125.0 / 1e9 * 100.0);
    return 0;
}

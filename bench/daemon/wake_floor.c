// What one wake-up costs on this machine by each way a thread can wait for an absolute 125 Hz
// timer, so that the daemon's figure can be set against the cheapest: a thread wakes N times and
// does nothing else; its own processor time per wake-up is read from /proc/thread-self/schedstat
// (the figure /usr/bin/time adds up). Give "rt" to run it at the report thread's real-time
// priority (as root).
//
//   cc -O2 -o /tmp/wake_floor bench/daemon/wake_floor.c
//   for m in epoll-read-settime epoll-settime poll-settime read-settime periodic-read nanosleep; do
//       /tmp/wake_floor $m 1250; done
//
// Modes (the calls made per wake-up):
//   epoll-read-settime  epoll_wait, read of the timer, timerfd_settime (the report thread before)
//   epoll-settime       epoll_wait, timerfd_settime, which forgets the firing (the report thread now)
//   poll-settime        poll of the timer and an eventfd, timerfd_settime
//   read-settime        a blocking read of the timer, timerfd_settime
//   periodic-read       a blocking read of a periodic timer: one call
//   nanosleep           clock_nanosleep to the due time: one call
#define _GNU_SOURCE
#include <poll.h>
#include <pthread.h>
#include <sched.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/timerfd.h>
#include <time.h>
#include <unistd.h>

static const uint64_t kPeriod = 8000000;  // 125 Hz

static uint64_t nowNanoseconds(void) {
    struct timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return (uint64_t)now.tv_sec * 1000000000u + (uint64_t)now.tv_nsec;
}

static struct timespec at(uint64_t nanoseconds) {
    return (struct timespec){(time_t)(nanoseconds / 1000000000u), (long)(nanoseconds % 1000000000u)};
}

static void setTimer(int timer, uint64_t due) {
    const struct itimerspec value = {{0, 0}, at(due)};
    timerfd_settime(timer, TFD_TIMER_ABSTIME, &value, NULL);
}

static unsigned long long threadRunNanoseconds(void) {
    unsigned long long running = 0;
    FILE* stats = fopen("/proc/thread-self/schedstat", "r");
    if (stats == NULL || fscanf(stats, "%llu", &running) != 1) exit(1);
    fclose(stats);
    return running;
}

int main(int argc, char** argv) {
    if (argc < 3) {
        fprintf(stderr, "usage: %s MODE COUNT [rt]\n", argv[0]);
        return 2;
    }
    const char* mode = argv[1];
    const int count = atoi(argv[2]);
    if (argc > 3 && strcmp(argv[3], "rt") == 0) {
        const struct sched_param priority = {.sched_priority = 63};
        if (pthread_setschedparam(pthread_self(), SCHED_RR, &priority) != 0) fprintf(stderr, "no real-time priority\n");
    }
    const int blocking = strcmp(mode, "read-settime") == 0 || strcmp(mode, "periodic-read") == 0;
    const int timer = timerfd_create(CLOCK_MONOTONIC, blocking ? 0 : TFD_NONBLOCK);
    const int wake = eventfd(0, EFD_NONBLOCK);
    const int poller = epoll_create1(0);
    struct epoll_event event = {.events = EPOLLIN};
    epoll_ctl(poller, EPOLL_CTL_ADD, timer, &event);
    uint64_t due = nowNanoseconds();
    if (strcmp(mode, "periodic-read") == 0) {
        const struct itimerspec periodic = {at(kPeriod), at(due + kPeriod)};
        timerfd_settime(timer, TFD_TIMER_ABSTIME, &periodic, NULL);
    } else if (strcmp(mode, "epoll-settime") == 0 || strcmp(mode, "poll-settime") == 0) {
        setTimer(timer, due + kPeriod);  // these set the next due time after each wake-up
    }
    const unsigned long long before = threadRunNanoseconds();
    uint64_t firings;
    for (int i = 0; i < count; ++i) {
        due += kPeriod;
        if (strcmp(mode, "epoll-read-settime") == 0) {
            setTimer(timer, due);
            epoll_wait(poller, &event, 1, -1);
            if (read(timer, &firings, sizeof firings) < 0) return 1;
        } else if (strcmp(mode, "epoll-settime") == 0) {
            epoll_wait(poller, &event, 1, -1);
            setTimer(timer, due + kPeriod);
        } else if (strcmp(mode, "poll-settime") == 0) {
            struct pollfd ready[2] = {{timer, POLLIN, 0}, {wake, POLLIN, 0}};
            poll(ready, 2, -1);
            setTimer(timer, due + kPeriod);
        } else if (strcmp(mode, "read-settime") == 0) {
            setTimer(timer, due);
            if (read(timer, &firings, sizeof firings) < 0) return 1;
        } else if (strcmp(mode, "periodic-read") == 0) {
            if (read(timer, &firings, sizeof firings) < 0) return 1;
        } else if (strcmp(mode, "nanosleep") == 0) {
            const struct timespec until = at(due);
            clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &until, NULL);
        } else {
            fprintf(stderr, "unknown mode %s\n", mode);
            return 2;
        }
    }
    const double perWake = (double)(threadRunNanoseconds() - before) / count;
    printf("%-19s %s %d wake-ups: %5.1f us of CPU each, %.3f %% of one core at 125 a second\n", mode,
           argc > 3 ? "rt   " : "other", count, perWake / 1000.0, perWake * 125.0 / 1e9 * 100.0);
    return 0;
}

#include "platform/ThreadPriority.h"

#include <gtest/gtest.h>
#include <pthread.h>
#include <sched.h>

#include <cerrno>
#include <thread>

namespace TolkaTouch {
namespace {

TEST(ThreadPriorityTest, PolicyNumbersAreThePosixOnes) {
    EXPECT_EQ(kSchedulingPolicyRoundRobin, SCHED_RR);
    EXPECT_EQ(kSchedulingPolicyFIFO, SCHED_FIFO);
}

TEST(ThreadPriorityTest, RoundRobinAtSixtyThreeSucceedsOrAnswersPermissionDenied) {
    // On a thread of its own, so the test runner keeps its ordinary scheduling.
    int result = -1;
    int policy = -1;
    sched_param parameters{};
    std::thread([&] {
        result = setCurrentThreadRealtime(2, 63);
        pthread_getschedparam(pthread_self(), &policy, &parameters);
    }).join();
    if (result == 0) {
        EXPECT_EQ(policy, SCHED_RR);
        EXPECT_EQ(parameters.sched_priority, 63);
    } else {
        EXPECT_EQ(result, EPERM);
        EXPECT_EQ(policy, SCHED_OTHER);
    }
}

TEST(ThreadPriorityTest, UnknownPolicyAnswersInvalidArgument) {
    int result = -1;
    std::thread([&] { result = setCurrentThreadRealtime(12345, 1); }).join();
    EXPECT_EQ(result, EINVAL);
}

TEST(ThreadPriorityTest, PriorityOutsideThePolicysRangeAnswersInvalidArgument) {
    int result = -1;
    std::thread([&] { result = setCurrentThreadRealtime(SCHED_RR, 1000); }).join();
    EXPECT_EQ(result, EINVAL);
}

}  // namespace
}  // namespace TolkaTouch

#include "platform/ThreadPriority.h"

#include <pthread.h>
#include <sched.h>

namespace TolkaTouch {

int setCurrentThreadRealtime(int policy, int priority) {
    sched_param parameters{};
    parameters.sched_priority = priority;
    return pthread_setschedparam(pthread_self(), policy, &parameters);
}

}  // namespace TolkaTouch

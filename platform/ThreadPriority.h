#pragma once
// Scheduling of the calling thread: raising a thread that must keep up with a device to a
// real-time policy. Without the privilege for it the call fails and the thread keeps its priority.

namespace TolkaTouch {

// POSIX policy numbers as the scheduling interface takes them.
inline constexpr int kSchedulingPolicyFIFO = 1;
inline constexpr int kSchedulingPolicyRoundRobin = 2;

// Sets the calling thread's policy and priority; answers 0 or the error number (EPERM when the
// process may not use real-time scheduling, EINVAL for a priority outside the policy's range).
int setCurrentThreadRealtime(int policy, int priority);

}  // namespace TolkaTouch

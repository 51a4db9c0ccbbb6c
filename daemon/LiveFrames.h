#pragma once
// LiveFrames: the recognizer's per-frame diagnostics snapshots that `tolkatouch view --live`
// follows, handed from the plug-in's report thread to the daemon's loop. The report thread asks
// due() after each frame (one atomic load while nobody follows, and at most kMaxPerSecond yeses a
// second by the given clock), and hands a due frame's snapshot over through a one-slot mailbox:
// the newest replaces one the loop has not taken yet, the lock is held only to move it in or out,
// and an eventfd wakes the loop, which formats the line. The report thread never waits for the
// loop or for a reader.
//
// The line, one JSON object: {"frame": {"service": S, "frame": N, "time": MS, "readings": [...],
// ...}} with every number of the snapshot under the names of the Python package's Frames.

#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <mutex>
#include <optional>
#include <string>

#include "platform/PropertyValue.h"

namespace TolkaTouch {

class LiveFrames {
public:
    static constexpr int kMaxPerSecond = 60;
    static constexpr std::chrono::nanoseconds kPeriod{1'000'000'000 / kMaxPerSecond};
    using Clock = std::function<std::chrono::nanoseconds()>;

    explicit LiveFrames(Clock clock);  // throws std::runtime_error when the eventfd cannot be made
    ~LiveFrames();
    LiveFrames(const LiveFrames&) = delete;
    LiveFrames& operator=(const LiveFrames&) = delete;

    // Readable when a snapshot waits; take() it.
    int pollFd() const { return _wakeFd; }

    void setActive(bool active) { _active.store(active, std::memory_order_relaxed); }
    bool active() const { return _active.load(std::memory_order_relaxed); }

    // The report thread's question after each frame: whether to hand this one over. Yes at most
    // kMaxPerSecond times a second on average, never twice within a period after a pause.
    bool due();
    // The report thread's hand-over of a due frame's snapshot (a dictionary, as the plug-in's
    // "Pipeline.Algs.FrameSnapshot" property answers it).
    void hand(uint32_t service, PropertyValue snapshot);

    // The loop's side: the newest snapshot handed over since the last take, as its line.
    std::optional<std::string> take();
    // How many snapshots were handed over and replaced before the loop took them.
    uint64_t replaced() const { return _replaced.load(std::memory_order_relaxed); }

private:
    Clock _clock;
    int _wakeFd = -1;
    std::atomic<bool> _active{false};
    std::atomic<int64_t> _nextDue{INT64_MIN};  // nanoseconds by the clock
    std::atomic<uint64_t> _replaced{0};
    std::mutex _slotMutex;
    std::optional<std::pair<uint32_t, PropertyValue>> _slot;
};

}  // namespace TolkaTouch

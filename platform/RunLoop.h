#pragma once
// RunLoop: the per-thread event loop on which device reports and queued blocks are handled.
// Each thread has one, reached through RunLoop::current(). Sources (a file descriptor with a
// callback) and blocks are scheduled for a named mode; a run in a mode serves only that mode's
// sources and blocks, so a private mode keeps unrelated work off a dedicated thread.
//
// Built on epoll (one epoll set per mode) with an eventfd for wake-ups: both are plain kernel
// facilities, and a private mode per loop maps directly onto a private epoll set, which a
// single-dispatcher event library does not offer.

#include <condition_variable>
#include <cstdint>
#include <deque>
#include <functional>
#include <limits>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>

namespace TolkaTouch {

class RunLoop : public std::enable_shared_from_this<RunLoop> {
public:
    enum class RunResult { Finished = 1, Stopped = 2, TimedOut = 3, HandledSource = 4 };

    using SourceID = uint64_t;  // 0 is never a valid source
    using SourceCallback = std::function<void()>;
    using Block = std::function<void()>;

    // A time-out at or above this many seconds (infinity included) never expires.
    static constexpr double kInfinite = std::numeric_limits<double>::infinity();

    // The calling thread's run loop, created on first use; it lives as long as its thread or the
    // last reference held elsewhere, whichever is longer.
    static std::shared_ptr<RunLoop> current();

    ~RunLoop();
    RunLoop(const RunLoop&) = delete;
    RunLoop& operator=(const RunLoop&) = delete;

    // Calls `callback` on the loop's thread whenever `fd` is readable (or has hung up / failed)
    // while the loop runs in `mode`. The fd stays the caller's: remove the source before closing
    // it. One source per fd and mode: a second one for the same pair (or a bad fd) answers 0.
    // May be called from any thread.
    SourceID addSource(int fd, const std::string& mode, SourceCallback callback);

    // Removes a source (unknown IDs are ignored). From another thread, waits until a callback of
    // that source that is running on the loop's thread has returned, and wakes the loop (a run whose
    // mode is left empty answers Finished); from the loop's own thread it returns at once.
    void removeSource(SourceID id);

    // Runs the loop in `mode` on the calling thread (which should be the loop's own thread) until:
    //   Stopped        stop() was called (before or during the run);
    //   HandledSource  a source callback or a block ran and returnAfterSourceHandled is set;
    //   Finished       the mode has neither sources nor blocks;
    //   TimedOut       `timeoutSeconds` passed (0 polls once; kInfinite waits for ever).
    // Stop is checked first, then blocks, then emptiness, then the time-out. A wake-up alone does
    // not end a run.
    RunResult runInMode(const std::string& mode, double timeoutSeconds, bool returnAfterSourceHandled);

    // Enqueues `block` to run on the loop's thread during a run in `mode`; from any thread. The
    // loop is woken. Blocks run in the order they were enqueued; each one counts as a handled
    // source.
    void performBlock(const std::string& mode, Block block);

    // Makes a waiting run re-check its stop flag and blocks. From any thread.
    void wakeUp();

    // Makes the current run (or, when none runs, the next one) answer Stopped. From any thread.
    void stop();

    // True when called on the thread this loop belongs to.
    bool isCurrent() const;

private:
    struct Source {
        int fd;
        std::string mode;
        SourceCallback callback;
    };
    struct Mode {
        int epollFd = -1;
        size_t sourceCount = 0;
        std::deque<Block> blocks;
    };

    RunLoop();
    Mode& modeLocked(const std::string& name);  // creates the mode's epoll set on first use
    void drainWakeUp();

    const std::thread::id _thread;
    const int _wakeFd;  // eventfd, registered in every mode's epoll set

    mutable std::mutex _mutex;
    std::condition_variable _sourceDone;
    std::map<std::string, Mode, std::less<>> _modes;
    std::map<SourceID, Source> _sources;
    SourceID _nextSourceID = 1;
    SourceID _runningSource = 0;  // the source whose callback runs now, 0 when none
    bool _stopRequested = false;
};

}  // namespace TolkaTouch

#include "platform/RunLoop.h"

#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cmath>
#include <optional>

namespace TolkaTouch {

namespace {

// Epoll data of the wake-up eventfd; sources carry their ID, which is never 0.
constexpr uint64_t kWakeUpMarker = 0;
// Longer time-outs than this are waits without end (and keep the deadline arithmetic in range).
constexpr double kLongestTimeoutSeconds = 1.0e9;
constexpr int kEventsPerWait = 16;

}  // namespace

std::shared_ptr<RunLoop> RunLoop::current() {
    thread_local std::shared_ptr<RunLoop> loop;
    if (!loop) {
        loop.reset(new RunLoop());
    }
    return loop;
}

RunLoop::RunLoop() : _thread(std::this_thread::get_id()), _wakeFd(eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC)) {}

RunLoop::~RunLoop() {
    for (auto& [name, mode] : _modes) {
        if (mode.epollFd >= 0) {
            ::close(mode.epollFd);
        }
    }
    if (_wakeFd >= 0) {
        ::close(_wakeFd);
    }
}

bool RunLoop::isCurrent() const {
    return std::this_thread::get_id() == _thread;
}

RunLoop::Mode& RunLoop::modeLocked(const std::string& name) {
    auto found = _modes.find(name);
    if (found != _modes.end()) {
        return found->second;
    }
    Mode& mode = _modes[name];
    mode.epollFd = epoll_create1(EPOLL_CLOEXEC);
    if (mode.epollFd >= 0 && _wakeFd >= 0) {
        epoll_event event{};
        event.events = EPOLLIN;
        event.data.u64 = kWakeUpMarker;
        epoll_ctl(mode.epollFd, EPOLL_CTL_ADD, _wakeFd, &event);
    }
    return mode;
}

RunLoop::SourceID RunLoop::addSource(int fd, const std::string& mode, SourceCallback callback) {
    if (fd < 0 || !callback) {
        return 0;
    }
    std::lock_guard lock(_mutex);
    Mode& target = modeLocked(mode);
    if (target.epollFd < 0) {
        return 0;
    }
    for (const auto& [id, source] : _sources) {
        if (source.fd == fd && source.mode == mode) {
            return 0;
        }
    }
    const SourceID id = _nextSourceID++;
    epoll_event event{};
    event.events = EPOLLIN;
    event.data.u64 = id;
    if (epoll_ctl(target.epollFd, EPOLL_CTL_ADD, fd, &event) != 0) {
        return 0;
    }
    _sources.emplace(id, Source{fd, mode, std::move(callback)});
    ++target.sourceCount;
    return id;
}

void RunLoop::removeSource(SourceID id) {
    std::unique_lock lock(_mutex);
    auto found = _sources.find(id);
    if (found == _sources.end()) {
        return;
    }
    Mode& mode = _modes.find(found->second.mode)->second;
    // The fd may already be closed (the kernel then dropped it from the set): nothing to undo.
    epoll_ctl(mode.epollFd, EPOLL_CTL_DEL, found->second.fd, nullptr);
    --mode.sourceCount;
    _sources.erase(found);
    if (!isCurrent()) {
        _sourceDone.wait(lock, [this, id] { return _runningSource != id; });
        lock.unlock();
        // A run waiting without end must notice when its mode has run dry.
        wakeUp();
    }
}

void RunLoop::performBlock(const std::string& mode, Block block) {
    if (!block) {
        return;
    }
    {
        std::lock_guard lock(_mutex);
        modeLocked(mode).blocks.push_back(std::move(block));
    }
    wakeUp();
}

void RunLoop::wakeUp() {
    const uint64_t one = 1;
    // A full counter (never in practice) still leaves the loop readable, which is all a wake-up needs.
    [[maybe_unused]] const ssize_t written = ::write(_wakeFd, &one, sizeof one);
}

void RunLoop::drainWakeUp() {
    uint64_t count = 0;
    [[maybe_unused]] const ssize_t read = ::read(_wakeFd, &count, sizeof count);
}

void RunLoop::stop() {
    {
        std::lock_guard lock(_mutex);
        _stopRequested = true;
    }
    wakeUp();
}

RunLoop::RunResult RunLoop::runInMode(const std::string& modeName, double timeoutSeconds,
                                      bool returnAfterSourceHandled) {
    using Clock = std::chrono::steady_clock;
    if (std::isnan(timeoutSeconds) || timeoutSeconds < 0) {
        timeoutSeconds = 0;
    }
    const bool endless = timeoutSeconds >= kLongestTimeoutSeconds;
    const Clock::time_point deadline =
        endless ? Clock::time_point::max()
                : Clock::now() + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(timeoutSeconds));

    // Modes are never erased, so the mode found once stays valid for the whole run.
    Mode* mode = nullptr;
    {
        std::lock_guard lock(_mutex);
        mode = &modeLocked(modeName);
    }
    const int epollFd = mode->epollFd;

    bool handled = false;
    for (;;) {
        // Made only when blocks wait: an empty deque already allocates, and a report thread passes
        // here twice for every report.
        std::optional<std::deque<Block>> blocks;
        {
            std::lock_guard lock(_mutex);
            if (_stopRequested) {
                _stopRequested = false;
                return RunResult::Stopped;
            }
            if (handled && returnAfterSourceHandled) {
                return RunResult::HandledSource;
            }
            if (!mode->blocks.empty()) {
                blocks.emplace().swap(mode->blocks);
            } else if (mode->sourceCount == 0) {
                return RunResult::Finished;
            }
        }
        if (blocks) {
            // Every block queued before this pass runs in it; later ones wait for the next pass.
            for (Block& block : *blocks) {
                block();
                block = nullptr;
            }
            handled = true;
            continue;
        }
        if (epollFd < 0) {
            return RunResult::Finished;
        }

        int waitMilliseconds = -1;
        if (!endless) {
            const auto remaining = deadline - Clock::now();
            const auto milliseconds = std::chrono::ceil<std::chrono::milliseconds>(remaining).count();
            waitMilliseconds = milliseconds <= 0 ? 0 : static_cast<int>(std::min<int64_t>(milliseconds, 1 << 30));
        }
        epoll_event events[kEventsPerWait];
        const int count = epoll_wait(epollFd, events, kEventsPerWait, waitMilliseconds);
        if (count < 0 && errno != EINTR) {
            return RunResult::Finished;  // the set itself is broken: nothing can be served
        }
        for (int index = 0; index < count; ++index) {
            const uint64_t id = events[index].data.u64;
            if (id == kWakeUpMarker) {
                drainWakeUp();
                continue;
            }
            SourceCallback callback;
            SourceID previous = 0;
            {
                std::lock_guard lock(_mutex);
                auto found = _sources.find(id);
                if (found == _sources.end()) {
                    continue;  // removed since the wait returned
                }
                callback = found->second.callback;
                previous = _runningSource;
                _runningSource = id;
            }
            callback();
            callback = nullptr;
            {
                std::lock_guard lock(_mutex);
                _runningSource = previous;
            }
            _sourceDone.notify_all();
            handled = true;
            if (returnAfterSourceHandled) {
                break;  // the other ready sources stay ready for the next run
            }
        }
        if (!endless && Clock::now() >= deadline) {
            // Time is up: a stop or a handled source still wins over the time-out; blocks that
            // came in meanwhile wait for the next run.
            std::lock_guard lock(_mutex);
            if (_stopRequested) {
                _stopRequested = false;
                return RunResult::Stopped;
            }
            return handled && returnAfterSourceHandled ? RunResult::HandledSource : RunResult::TimedOut;
        }
    }
}

}  // namespace TolkaTouch

#pragma once
// Semaphore: a counting semaphore for handshakes between threads (signal, wait without limit), with
// a bounded wait so that tests can give up instead of hanging.

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <mutex>

namespace TolkaTouch {

class Semaphore {
public:
    explicit Semaphore(uint64_t initial = 0) : _count(initial) {}
    Semaphore(const Semaphore&) = delete;
    Semaphore& operator=(const Semaphore&) = delete;

    // Notifies under the lock: a waiter may destroy the semaphore as soon as its wait returns.
    void signal() {
        std::lock_guard lock(_mutex);
        ++_count;
        _changed.notify_one();
    }

    void wait() {
        std::unique_lock lock(_mutex);
        _changed.wait(lock, [this] { return _count > 0; });
        --_count;
    }

    // Answers false when no signal came within `seconds`.
    bool waitFor(double seconds) {
        std::unique_lock lock(_mutex);
        if (!_changed.wait_for(lock, std::chrono::duration<double>(seconds), [this] { return _count > 0; })) {
            return false;
        }
        --_count;
        return true;
    }

private:
    std::mutex _mutex;
    std::condition_variable _changed;
    uint64_t _count;
};

}  // namespace TolkaTouch

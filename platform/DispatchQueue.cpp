#include "platform/DispatchQueue.h"

#include <pthread.h>

#include <condition_variable>
#include <deque>
#include <mutex>
#include <thread>

#include <semaphore>

namespace TolkaTouch {

struct DispatchQueue::State {
    std::mutex mutex;
    std::condition_variable changed;
    std::deque<Task> tasks;
    bool released = false;  // the last reference went: drain, then end
};

namespace {

thread_local const DispatchQueue::State* currentQueue = nullptr;

void drain(const std::shared_ptr<DispatchQueue::State>& state) {
    currentQueue = state.get();
    std::unique_lock lock(state->mutex);
    for (;;) {
        state->changed.wait(lock, [&] { return !state->tasks.empty() || state->released; });
        if (state->tasks.empty()) {
            return;  // released and drained
        }
        DispatchQueue::Task task = std::move(state->tasks.front());
        state->tasks.pop_front();
        lock.unlock();
        task();
        // A task may hold the last reference to its own queue: let it go before taking the lock.
        task = nullptr;
        lock.lock();
    }
}

}  // namespace

std::shared_ptr<DispatchQueue> DispatchQueue::create(std::string label) {
    auto state = std::make_shared<State>();
    std::thread thread([state] { drain(state); });
    // The kernel keeps at most 15 characters of a thread's name.
    pthread_setname_np(thread.native_handle(), label.substr(0, 15).c_str());
    thread.detach();
    return std::shared_ptr<DispatchQueue>(new DispatchQueue(std::move(label), std::move(state)));
}

DispatchQueue::DispatchQueue(std::string label, std::shared_ptr<State> state)
    : _label(std::move(label)), _state(std::move(state)) {}

DispatchQueue::~DispatchQueue() {
    {
        std::lock_guard lock(_state->mutex);
        _state->released = true;
    }
    _state->changed.notify_one();
}

void DispatchQueue::async(Task task) {
    if (!task) {
        return;
    }
    {
        std::lock_guard lock(_state->mutex);
        _state->tasks.push_back(std::move(task));
    }
    _state->changed.notify_one();
}

bool DispatchQueue::sync(Task task) {
    if (isCurrent()) {
        return false;
    }
    std::counting_semaphore<> done{0};
    async([&task, &done] {
        if (task) {
            task();
        }
        done.release();
    });
    done.acquire();
    return true;
}

bool DispatchQueue::isCurrent() const {
    return currentQueue == _state.get();
}

}  // namespace TolkaTouch

#pragma once
// DispatchQueue: a serial queue of tasks run in submission order on a thread of its own. Shared by
// reference (shared_ptr); tasks submitted before the last reference goes still run, after which
// the thread ends by itself. Dropping the last reference never waits, so it may happen inside one
// of the queue's own tasks.

#include <functional>
#include <memory>
#include <string>

namespace TolkaTouch {

class DispatchQueue {
public:
    using Task = std::function<void()>;

    static std::shared_ptr<DispatchQueue> create(std::string label);

    ~DispatchQueue();  // lets the thread drain the pending tasks and end; does not wait for it
    DispatchQueue(const DispatchQueue&) = delete;
    DispatchQueue& operator=(const DispatchQueue&) = delete;

    const std::string& label() const { return _label; }

    // Queues `task`; it runs later on the queue's thread, never inside this call. Empty tasks are
    // ignored.
    void async(Task task);

    // Runs `task` on the queue's thread after every earlier task and waits for it. Answers false
    // (and runs nothing) when called from the queue's own thread, where waiting would never end.
    bool sync(Task task);

    // True when called from a task of this queue.
    bool isCurrent() const;

    struct State;  // shared by the queue object and its thread

private:
    DispatchQueue(std::string label, std::shared_ptr<State> state);

    std::string _label;
    std::shared_ptr<State> _state;
};

using DispatchQueueRef = std::shared_ptr<DispatchQueue>;

}  // namespace TolkaTouch

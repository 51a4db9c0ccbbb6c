#include "platform/DispatchQueue.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "platform/Semaphore.h"

namespace TolkaTouch {
namespace {

constexpr double kGenerousSeconds = 10.0;

TEST(DispatchQueueTest, KeepsItsLabel) {
    EXPECT_EQ(DispatchQueue::create("events")->label(), "events");
}

TEST(DispatchQueueTest, TasksRunInSubmissionOrder) {
    auto queue = DispatchQueue::create("order");
    std::vector<int> order;  // touched only by the queue's tasks until `done`
    Semaphore done;
    for (int index = 0; index < 100; ++index) {
        queue->async([&order, index] { order.push_back(index); });
    }
    queue->async([&] { done.signal(); });
    ASSERT_TRUE(done.waitFor(kGenerousSeconds));
    std::vector<int> expected;
    for (int index = 0; index < 100; ++index) {
        expected.push_back(index);
    }
    EXPECT_EQ(order, expected);
}

TEST(DispatchQueueTest, TasksRunOnTheQueuesOwnThread) {
    auto queue = DispatchQueue::create("thread");
    EXPECT_FALSE(queue->isCurrent());
    std::vector<std::thread::id> threads;
    std::vector<bool> current;
    Semaphore done;
    for (int index = 0; index < 3; ++index) {
        queue->async([&] {
            threads.push_back(std::this_thread::get_id());
            current.push_back(queue->isCurrent());
        });
    }
    queue->async([&] { done.signal(); });
    ASSERT_TRUE(done.waitFor(kGenerousSeconds));
    ASSERT_EQ(threads.size(), 3u);
    EXPECT_NE(threads[0], std::this_thread::get_id());
    EXPECT_EQ(threads[1], threads[0]);
    EXPECT_EQ(threads[2], threads[0]);
    EXPECT_EQ(current, (std::vector<bool>{true, true, true}));
}

TEST(DispatchQueueTest, IsCurrentOnlyForItsOwnQueue) {
    auto first = DispatchQueue::create("first");
    auto second = DispatchQueue::create("second");
    bool secondCurrent = true;
    Semaphore done;
    first->async([&] {
        secondCurrent = second->isCurrent();
        done.signal();
    });
    ASSERT_TRUE(done.waitFor(kGenerousSeconds));
    EXPECT_FALSE(secondCurrent);
}

TEST(DispatchQueueTest, AsyncFromATaskNeverRunsInline) {
    auto queue = DispatchQueue::create("inline");
    std::vector<std::string> order;
    Semaphore done;
    queue->async([&] {
        queue->async([&] {
            order.push_back("inner");
            done.signal();
        });
        order.push_back("outer finished");
    });
    ASSERT_TRUE(done.waitFor(kGenerousSeconds));
    EXPECT_EQ(order, (std::vector<std::string>{"outer finished", "inner"}));
}

TEST(DispatchQueueTest, PendingTasksStillRunAfterTheLastReferenceGoes) {
    auto queue = DispatchQueue::create("drain");
    Semaphore gate;
    Semaphore allDone;
    std::atomic<int> ran{0};
    queue->async([&] { gate.waitFor(kGenerousSeconds); });
    for (int index = 0; index < 10; ++index) {
        queue->async([&] {
            if (++ran == 10) {
                allDone.signal();
            }
        });
    }
    queue.reset();  // returns without waiting for the blocked task
    gate.signal();
    ASSERT_TRUE(allDone.waitFor(kGenerousSeconds));
    EXPECT_EQ(ran.load(), 10);
}

TEST(DispatchQueueTest, LastReferenceMayGoInsideOneOfItsTasks) {
    auto queue = DispatchQueue::create("self");
    Semaphore gate;
    Semaphore released;
    Semaphore laterRan;
    std::weak_ptr<DispatchQueue> watcher = queue;
    queue->async([held = queue, &gate, &released]() mutable {
        gate.waitFor(kGenerousSeconds);
        held.reset();  // the last reference: the queue object is destroyed here, on its own thread
        released.signal();
    });
    queue->async([&] { laterRan.signal(); });
    queue.reset();
    gate.signal();
    ASSERT_TRUE(released.waitFor(kGenerousSeconds));
    EXPECT_TRUE(watcher.expired());
    EXPECT_TRUE(laterRan.waitFor(kGenerousSeconds));
}

TEST(DispatchQueueTest, TaskHoldingTheLastReferenceReleasesItAfterRunning) {
    auto queue = DispatchQueue::create("captured");
    std::weak_ptr<DispatchQueue> watcher = queue;
    Semaphore ran;
    queue->async([held = queue, &ran] { ran.signal(); });
    queue.reset();
    ASSERT_TRUE(ran.waitFor(kGenerousSeconds));
    // The task object (and with it the last reference) goes right after it ran.
    for (int attempt = 0; attempt < 1000 && !watcher.expired(); ++attempt) {
        Semaphore().waitFor(0.01);
    }
    EXPECT_TRUE(watcher.expired());
}

TEST(DispatchQueueTest, SyncWaitsForEarlierTasksAndItsOwn) {
    auto queue = DispatchQueue::create("sync");
    std::vector<int> order;
    queue->async([&] { order.push_back(1); });
    EXPECT_TRUE(queue->sync([&] { order.push_back(2); }));
    EXPECT_EQ(order, (std::vector<int>{1, 2}));
}

TEST(DispatchQueueTest, SyncFromItsOwnQueueAnswersFalseAndRunsNothing) {
    auto queue = DispatchQueue::create("selfsync");
    bool answer = true;
    bool innerRan = false;
    EXPECT_TRUE(queue->sync([&] { answer = queue->sync([&] { innerRan = true; }); }));
    EXPECT_FALSE(answer);
    EXPECT_FALSE(innerRan);
}

TEST(DispatchQueueTest, EmptyTaskIsIgnored) {
    auto queue = DispatchQueue::create("empty");
    queue->async(nullptr);
    EXPECT_TRUE(queue->sync([] {}));
}

}  // namespace
}  // namespace TolkaTouch

#include "platform/DispatchQueue.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include <semaphore>

namespace TolkaTouch {
namespace {

constexpr double kGenerousSeconds = 10.0;

TEST(DispatchQueueTest, KeepsItsLabel) {
    EXPECT_EQ(DispatchQueue::create("events")->label(), "events");
}

TEST(DispatchQueueTest, TasksRunInSubmissionOrder) {
    auto queue = DispatchQueue::create("order");
    std::vector<int> order;  // touched only by the queue's tasks until `done`
    std::counting_semaphore<> done{0};
    for (int index = 0; index < 100; ++index) {
        queue->async([&order, index] { order.push_back(index); });
    }
    queue->async([&] { done.release(); });
    ASSERT_TRUE(done.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
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
    std::counting_semaphore<> done{0};
    for (int index = 0; index < 3; ++index) {
        queue->async([&] {
            threads.push_back(std::this_thread::get_id());
            current.push_back(queue->isCurrent());
        });
    }
    queue->async([&] { done.release(); });
    ASSERT_TRUE(done.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
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
    std::counting_semaphore<> done{0};
    first->async([&] {
        secondCurrent = second->isCurrent();
        done.release();
    });
    ASSERT_TRUE(done.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    EXPECT_FALSE(secondCurrent);
}

TEST(DispatchQueueTest, AsyncFromATaskNeverRunsInline) {
    auto queue = DispatchQueue::create("inline");
    std::vector<std::string> order;
    std::counting_semaphore<> done{0};
    queue->async([&] {
        queue->async([&] {
            order.push_back("inner");
            done.release();
        });
        order.push_back("outer finished");
    });
    ASSERT_TRUE(done.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    EXPECT_EQ(order, (std::vector<std::string>{"outer finished", "inner"}));
}

TEST(DispatchQueueTest, PendingTasksStillRunAfterTheLastReferenceGoes) {
    auto queue = DispatchQueue::create("drain");
    std::counting_semaphore<> gate{0};
    std::counting_semaphore<> allDone{0};
    std::atomic<int> ran{0};
    queue->async([&] { gate.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)); });
    for (int index = 0; index < 10; ++index) {
        queue->async([&] {
            if (++ran == 10) {
                allDone.release();
            }
        });
    }
    queue.reset();  // returns without waiting for the blocked task
    gate.release();
    ASSERT_TRUE(allDone.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    EXPECT_EQ(ran.load(), 10);
}

TEST(DispatchQueueTest, LastReferenceMayGoInsideOneOfItsTasks) {
    auto queue = DispatchQueue::create("self");
    std::counting_semaphore<> gate{0};
    std::counting_semaphore<> released{0};
    std::counting_semaphore<> laterRan{0};
    std::weak_ptr<DispatchQueue> watcher = queue;
    queue->async([held = queue, &gate, &released]() mutable {
        gate.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds));
        held.reset();  // the last reference: the queue object is destroyed here, on its own thread
        released.release();
    });
    queue->async([&] { laterRan.release(); });
    queue.reset();
    gate.release();
    ASSERT_TRUE(released.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    EXPECT_TRUE(watcher.expired());
    EXPECT_TRUE(laterRan.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
}

TEST(DispatchQueueTest, TaskHoldingTheLastReferenceReleasesItAfterRunning) {
    auto queue = DispatchQueue::create("captured");
    std::weak_ptr<DispatchQueue> watcher = queue;
    std::counting_semaphore<> ran{0};
    queue->async([held = queue, &ran] { ran.release(); });
    queue.reset();
    ASSERT_TRUE(ran.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    // The task object (and with it the last reference) goes right after it ran.
    for (int attempt = 0; attempt < 1000 && !watcher.expired(); ++attempt) {
        std::counting_semaphore<>(0).try_acquire_for(std::chrono::duration<double>(0.01));
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

#include "platform/RunLoop.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include <semaphore>

namespace TolkaTouch {
namespace {

using RunResult = RunLoop::RunResult;

constexpr double kGenerousSeconds = 10.0;

// A pipe whose read end serves as a run loop source; closed at the end of the test.
struct Pipe {
    int readEnd = -1;
    int writeEnd = -1;
    Pipe() {
        int fds[2];
        if (::pipe(fds) == 0) {
            readEnd = fds[0];
            writeEnd = fds[1];
        }
    }
    ~Pipe() {
        ::close(readEnd);
        ::close(writeEnd);
    }
    void put(char byte) const { ASSERT_EQ(::write(writeEnd, &byte, 1), 1); }
    char take() const {
        char byte = 0;
        EXPECT_EQ(::read(readEnd, &byte, 1), 1);
        return byte;
    }
};

TEST(RunLoopTest, ModeWithoutSourcesOrBlocksFinishesAtOnce) {
    EXPECT_EQ(RunLoop::current()->runInMode("Empty", RunLoop::kInfinite, false), RunResult::Finished);
    EXPECT_EQ(RunLoop::current()->runInMode("Empty", RunLoop::kInfinite, true), RunResult::Finished);
}

TEST(RunLoopTest, CurrentIsTheSameLoopOnOneThreadAndAnotherOnAnother) {
    auto loop = RunLoop::current();
    EXPECT_EQ(RunLoop::current(), loop);
    EXPECT_TRUE(loop->isCurrent());
    std::shared_ptr<RunLoop> other;
    std::thread([&] { other = RunLoop::current(); }).join();
    ASSERT_NE(other, nullptr);
    EXPECT_NE(other, loop);
    EXPECT_FALSE(other->isCurrent());
}

TEST(RunLoopTest, PerformedBlockCountsAsHandledSource) {
    auto loop = RunLoop::current();
    int runs = 0;
    loop->performBlock("Blocks", [&] { ++runs; });
    EXPECT_EQ(loop->runInMode("Blocks", RunLoop::kInfinite, true), RunResult::HandledSource);
    EXPECT_EQ(runs, 1);
    EXPECT_EQ(loop->runInMode("Blocks", RunLoop::kInfinite, true), RunResult::Finished);
    EXPECT_EQ(runs, 1);
}

TEST(RunLoopTest, BlocksRunInTheOrderTheyWereEnqueued) {
    auto loop = RunLoop::current();
    std::vector<int> order;
    for (int index = 0; index < 5; ++index) {
        loop->performBlock("Order", [&order, index] { order.push_back(index); });
    }
    EXPECT_EQ(loop->runInMode("Order", RunLoop::kInfinite, false), RunResult::Finished);
    EXPECT_EQ(order, (std::vector<int>{0, 1, 2, 3, 4}));
}

TEST(RunLoopTest, BlockEnqueuedByABlockRunsInTheNextPass) {
    auto loop = RunLoop::current();
    std::vector<std::string> order;
    loop->performBlock("Nested", [&] {
        order.push_back("outer");
        loop->performBlock("Nested", [&] { order.push_back("inner"); });
    });
    EXPECT_EQ(loop->runInMode("Nested", RunLoop::kInfinite, true), RunResult::HandledSource);
    EXPECT_EQ(order, (std::vector<std::string>{"outer"}));
    EXPECT_EQ(loop->runInMode("Nested", RunLoop::kInfinite, true), RunResult::HandledSource);
    EXPECT_EQ(order, (std::vector<std::string>{"outer", "inner"}));
}

TEST(RunLoopTest, BlockOfAnotherModeWaitsForARunInItsMode) {
    auto loop = RunLoop::current();
    int runs = 0;
    loop->performBlock("Theirs", [&] { ++runs; });
    EXPECT_EQ(loop->runInMode("Mine", RunLoop::kInfinite, true), RunResult::Finished);
    EXPECT_EQ(runs, 0);
    EXPECT_EQ(loop->runInMode("Theirs", RunLoop::kInfinite, true), RunResult::HandledSource);
    EXPECT_EQ(runs, 1);
}

TEST(RunLoopTest, ReadableSourceCallsItsCallbackOnce) {
    auto loop = RunLoop::current();
    Pipe pipe;
    std::vector<char> seen;
    const auto id = loop->addSource(pipe.readEnd, "Source", [&] { seen.push_back(pipe.take()); });
    ASSERT_NE(id, 0u);
    pipe.put('a');
    EXPECT_EQ(loop->runInMode("Source", RunLoop::kInfinite, true), RunResult::HandledSource);
    EXPECT_EQ(seen, (std::vector<char>{'a'}));
    loop->removeSource(id);
}

TEST(RunLoopTest, IdleSourceTimesOut) {
    auto loop = RunLoop::current();
    Pipe pipe;
    int calls = 0;
    const auto id = loop->addSource(pipe.readEnd, "Idle", [&] { ++calls; });
    EXPECT_EQ(loop->runInMode("Idle", 0.0, true), RunResult::TimedOut);
    EXPECT_EQ(loop->runInMode("Idle", 0.02, true), RunResult::TimedOut);
    EXPECT_EQ(loop->runInMode("Idle", -1.0, false), RunResult::TimedOut);
    EXPECT_EQ(calls, 0);
    loop->removeSource(id);
}

TEST(RunLoopTest, ZeroTimeOutStillHandlesAReadySource) {
    auto loop = RunLoop::current();
    Pipe pipe;
    int calls = 0;
    const auto id = loop->addSource(pipe.readEnd, "Poll", [&] {
        pipe.take();
        ++calls;
    });
    pipe.put('x');
    EXPECT_EQ(loop->runInMode("Poll", 0.0, true), RunResult::HandledSource);
    EXPECT_EQ(calls, 1);
    loop->removeSource(id);
}

TEST(RunLoopTest, WithoutReturnAfterSourceHandledTheRunGoesOnUntilItsTimeOut) {
    auto loop = RunLoop::current();
    Pipe pipe;
    std::vector<char> seen;
    const auto id = loop->addSource(pipe.readEnd, "Many", [&] { seen.push_back(pipe.take()); });
    pipe.put('1');
    pipe.put('2');
    pipe.put('3');
    EXPECT_EQ(loop->runInMode("Many", 0.05, false), RunResult::TimedOut);
    EXPECT_EQ(seen, (std::vector<char>{'1', '2', '3'}));
    loop->removeSource(id);
}

TEST(RunLoopTest, ReturnAfterSourceHandledServesOneSourcePerRun) {
    auto loop = RunLoop::current();
    Pipe pipe;
    std::vector<char> seen;
    const auto id = loop->addSource(pipe.readEnd, "One", [&] { seen.push_back(pipe.take()); });
    pipe.put('1');
    pipe.put('2');
    EXPECT_EQ(loop->runInMode("One", RunLoop::kInfinite, true), RunResult::HandledSource);
    EXPECT_EQ(seen, (std::vector<char>{'1'}));
    EXPECT_EQ(loop->runInMode("One", RunLoop::kInfinite, true), RunResult::HandledSource);
    EXPECT_EQ(seen, (std::vector<char>{'1', '2'}));
    EXPECT_EQ(loop->runInMode("One", 0.0, true), RunResult::TimedOut);
    loop->removeSource(id);
}

TEST(RunLoopTest, SourceOfAnotherModeDoesNotFire) {
    auto loop = RunLoop::current();
    Pipe ready;
    Pipe idle;
    int readyCalls = 0;
    const auto readyID = loop->addSource(ready.readEnd, "A", [&] {
        ready.take();
        ++readyCalls;
    });
    const auto idleID = loop->addSource(idle.readEnd, "B", [] {});
    ready.put('r');
    EXPECT_EQ(loop->runInMode("B", 0.02, true), RunResult::TimedOut);
    EXPECT_EQ(readyCalls, 0);
    EXPECT_EQ(loop->runInMode("A", RunLoop::kInfinite, true), RunResult::HandledSource);
    EXPECT_EQ(readyCalls, 1);
    loop->removeSource(readyID);
    loop->removeSource(idleID);
}

TEST(RunLoopTest, SecondSourceForTheSameDescriptorAndModeIsRefused) {
    auto loop = RunLoop::current();
    Pipe pipe;
    const auto first = loop->addSource(pipe.readEnd, "Twice", [] {});
    EXPECT_NE(first, 0u);
    EXPECT_EQ(loop->addSource(pipe.readEnd, "Twice", [] {}), 0u);
    const auto otherMode = loop->addSource(pipe.readEnd, "Elsewhere", [] {});
    EXPECT_NE(otherMode, 0u);
    EXPECT_EQ(loop->addSource(-1, "Twice", [] {}), 0u);
    EXPECT_EQ(loop->addSource(pipe.readEnd, "Twice3", nullptr), 0u);
    loop->removeSource(first);
    loop->removeSource(otherMode);
}

TEST(RunLoopTest, RemovedSourceNoLongerFiresAndItsModeFinishes) {
    auto loop = RunLoop::current();
    Pipe pipe;
    int calls = 0;
    const auto id = loop->addSource(pipe.readEnd, "Removed", [&] { ++calls; });
    loop->removeSource(id);
    loop->removeSource(id);  // a second removal is ignored
    pipe.put('x');
    EXPECT_EQ(loop->runInMode("Removed", RunLoop::kInfinite, true), RunResult::Finished);
    EXPECT_EQ(calls, 0);
}

TEST(RunLoopTest, RemovingTheLastSourceFromAnotherThreadFinishesAnEndlessRun) {
    auto loop = RunLoop::current();
    Pipe idle;
    const auto id = loop->addSource(idle.readEnd, "Drying", [] {});
    std::counting_semaphore<> running{0};
    loop->performBlock("Drying", [&] { running.release(); });
    std::thread remover([&] {
        running.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds));
        loop->removeSource(id);
    });
    EXPECT_EQ(loop->runInMode("Drying", RunLoop::kInfinite, false), RunResult::Finished);
    remover.join();
}

TEST(RunLoopTest, SourceMayRemoveItselfFromItsCallback) {
    auto loop = RunLoop::current();
    Pipe pipe;
    int calls = 0;
    RunLoop::SourceID id = 0;
    id = loop->addSource(pipe.readEnd, "SelfRemoving", [&] {
        ++calls;
        loop->removeSource(id);
    });
    pipe.put('x');
    EXPECT_EQ(loop->runInMode("SelfRemoving", RunLoop::kInfinite, false), RunResult::Finished);
    EXPECT_EQ(calls, 1);
}

TEST(RunLoopTest, StopBeforeARunMakesThatRunAnswerStopped) {
    auto loop = RunLoop::current();
    loop->stop();
    EXPECT_EQ(loop->runInMode("Anything", RunLoop::kInfinite, true), RunResult::Stopped);
    // The stop is used up by that run.
    EXPECT_EQ(loop->runInMode("Anything", RunLoop::kInfinite, true), RunResult::Finished);
}

TEST(RunLoopTest, StopFromABlockEndsTheRunWithStopped) {
    auto loop = RunLoop::current();
    Pipe idle;
    const auto id = loop->addSource(idle.readEnd, "Stoppable", [] {});
    loop->performBlock("Stoppable", [] { RunLoop::current()->stop(); });
    EXPECT_EQ(loop->runInMode("Stoppable", RunLoop::kInfinite, true), RunResult::Stopped);
    loop->performBlock("Stoppable", [] { RunLoop::current()->stop(); });
    EXPECT_EQ(loop->runInMode("Stoppable", RunLoop::kInfinite, false), RunResult::Stopped);
    loop->removeSource(id);
}

TEST(RunLoopTest, StopFromAnotherThreadEndsAnEndlessRun) {
    auto loop = RunLoop::current();
    Pipe idle;
    const auto id = loop->addSource(idle.readEnd, "Remote", [] {});
    std::counting_semaphore<> running{0};
    loop->performBlock("Remote", [&] { running.release(); });
    std::thread stopper([&] {
        running.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds));
        loop->stop();
    });
    EXPECT_EQ(loop->runInMode("Remote", RunLoop::kInfinite, false), RunResult::Stopped);
    stopper.join();
    loop->removeSource(id);
}

TEST(RunLoopTest, BlockFromAnotherThreadWakesAnEndlessRun) {
    auto loop = RunLoop::current();
    Pipe idle;
    const auto id = loop->addSource(idle.readEnd, "Woken", [] {});
    std::thread::id ranOn;
    std::thread sender([&] { loop->performBlock("Woken", [&] { ranOn = std::this_thread::get_id(); }); });
    EXPECT_EQ(loop->runInMode("Woken", RunLoop::kInfinite, true), RunResult::HandledSource);
    sender.join();
    EXPECT_EQ(ranOn, std::this_thread::get_id());
    loop->removeSource(id);
}

TEST(RunLoopTest, WakeUpAloneDoesNotEndARun) {
    auto loop = RunLoop::current();
    Pipe idle;
    const auto id = loop->addSource(idle.readEnd, "Wake", [] {});
    std::counting_semaphore<> running{0};
    std::counting_semaphore<> wokenThrice{0};
    loop->performBlock("Wake", [&] { running.release(); });
    std::thread waker([&] {
        running.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds));
        for (int index = 0; index < 3; ++index) {
            loop->wakeUp();
        }
        wokenThrice.release();
    });
    // Without returnAfterSourceHandled the block does not end the run, and neither do the
    // wake-ups: only the time-out does.
    EXPECT_EQ(loop->runInMode("Wake", 0.2, false), RunResult::TimedOut);
    EXPECT_TRUE(wokenThrice.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    waker.join();
    loop->removeSource(id);
}

TEST(RunLoopTest, LoopOnItsOwnThreadStopsOnRequestLikeTheInputReportThread) {
    const std::string mode = "kHandleInputReportsRunLoopMode";
    std::shared_ptr<RunLoop> published;
    std::counting_semaphore<> signal{0};
    Pipe idle;
    std::vector<RunResult> answers;
    std::thread worker([&] {
        published = RunLoop::current();
        const auto id = published->addSource(idle.readEnd, mode, [] {});
        signal.release();
        RunResult answer;
        do {
            answer = RunLoop::current()->runInMode(mode, RunLoop::kInfinite, true);
            answers.push_back(answer);
        } while (answer == RunResult::HandledSource);
        RunLoop::current()->removeSource(id);
        signal.release();
    });
    ASSERT_TRUE(signal.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    published->performBlock(mode, [] { RunLoop::current()->stop(); });
    published->wakeUp();
    ASSERT_TRUE(signal.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds)));
    worker.join();
    EXPECT_EQ(answers, (std::vector<RunResult>{RunResult::Stopped}));
}

TEST(RunLoopTest, RemovingASourceFromAnotherThreadWaitsForItsRunningCallback) {
    auto loop = RunLoop::current();
    Pipe pipe;
    std::counting_semaphore<> entered{0};
    std::counting_semaphore<> neverSignalled{0};
    std::atomic<bool> callbackFinished{false};
    const auto id = loop->addSource(pipe.readEnd, "Busy", [&] {
        pipe.take();
        entered.release();
        // Keep the callback busy for a moment so that the removal really has to wait for it.
        neverSignalled.try_acquire_for(std::chrono::duration<double>(0.05));
        callbackFinished.store(true);
    });
    bool finishedWhenRemoved = false;
    std::thread remover([&] {
        entered.try_acquire_for(std::chrono::duration<double>(kGenerousSeconds));
        loop->removeSource(id);
        finishedWhenRemoved = callbackFinished.load();
    });
    pipe.put('x');
    EXPECT_EQ(loop->runInMode("Busy", RunLoop::kInfinite, true), RunResult::HandledSource);
    remover.join();
    EXPECT_TRUE(finishedWhenRemoved);
    EXPECT_EQ(loop->runInMode("Busy", RunLoop::kInfinite, true), RunResult::Finished);
}

TEST(RunLoopTest, BlocksLeftInADeadThreadsLoopAreDroppedWithIt) {
    std::shared_ptr<RunLoop> loop;
    std::thread([&] { loop = RunLoop::current(); }).join();
    auto counted = std::make_shared<int>(0);
    loop->performBlock("Late", [counted] { ++*counted; });
    EXPECT_EQ(counted.use_count(), 2);
    loop.reset();
    EXPECT_EQ(counted.use_count(), 1);
}

}  // namespace
}  // namespace TolkaTouch

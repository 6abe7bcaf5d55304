// Run loops with their sources, dispatch queues and threads.
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <numeric>
#include <thread>

#include "Platform/DispatchQueue.h"
#include "Platform/RunLoop.h"
#include "Platform/Semaphore.h"
#include "Platform/Thread.h"
#include "Platform/TimerSource.h"

namespace ZeltoTouch::Platform {
namespace {

using namespace std::chrono_literals;
const std::string kMode = "kHandleInputReportsRunLoopMode";

TEST(RunLoop, AStopCalledOrQueuedBeforeTheLoopRunsIsHonoured) {
    auto runLoop = RunLoop::current();
    for (const bool queued : {true, false}) {
        if (queued) {
            runLoop->perform(kMode, [&] { runLoop->stop(); });
        } else {
            runLoop->stop();
        }
        bool timedOut = false;
        TimerSource watchdog(2s, [&] {
            timedOut = true;
            runLoop->stop();
        });
        watchdog.attach(runLoop, kMode);
        runLoop->runInMode(kMode);
        EXPECT_FALSE(timedOut) << (queued ? "queued" : "called");
    }
}

// The loop runs on a thread of its own, the way the service's input thread does.
TEST(RunLoop, TasksFromAnotherThreadRunInOrderOnTheLoopsThreadWhichAWakeUpKeepsRunning) {
    std::shared_ptr<RunLoop> runLoop;
    Semaphore published, finished, done;
    std::thread thread([&] {
        runLoop = RunLoop::current();
        published.signal();
        RunLoop::current()->runInMode(kMode);
        finished.signal();
    });
    published.wait();
    std::vector<int> order;
    std::thread::id taskThread;
    for (int i = 0; i < 5; ++i) runLoop->perform(kMode, [&, i] { order.push_back(i); });
    runLoop->perform(kMode, [&] {
        taskThread = std::this_thread::get_id();
        done.signal();
    });
    ASSERT_TRUE(done.waitFor(2s));
    EXPECT_EQ(order, (std::vector<int>{0, 1, 2, 3, 4}));
    EXPECT_EQ(taskThread, thread.get_id());

    runLoop->wakeUp();
    EXPECT_TRUE(runLoop->isRunning());
    runLoop->perform(kMode, [] { RunLoop::current()->stop(); });
    runLoop->wakeUp();
    EXPECT_TRUE(finished.waitFor(2s));
    thread.join();
    EXPECT_FALSE(runLoop->isRunning());
}

TEST(RunLoop, TasksAndTimersForAnotherModeWaitUntilTheLoopRunsInItAndTimersRepeatUntilDetached) {
    auto runLoop = RunLoop::current();
    std::vector<std::string> ran;
    int fired = 0;
    TimerSource timer(2ms, [&] {
        if (++fired == 3) runLoop->stop();
    });
    timer.attach(runLoop, "other");
    runLoop->perform("other", [&] { ran.push_back("other"); });
    runLoop->perform(kMode, [&] {
        ran.push_back(kMode);
        runLoop->stop();
    });
    runLoop->perform(kMode, [&] { ran.push_back("after stop"); });
    runLoop->runInMode(kMode);
    EXPECT_EQ(ran, std::vector<std::string>{kMode});
    runLoop->runInMode("other");
    EXPECT_EQ(ran, (std::vector<std::string>{kMode, "other"}));
    EXPECT_EQ(fired, 3);

    timer.detach();
    std::this_thread::sleep_for(5ms);  // the timer would be due now
    runLoop->perform("other", [&] { runLoop->stop(); });
    runLoop->runInMode("other");
    EXPECT_EQ(fired, 3);
    runLoop->perform(kMode, [&] { runLoop->stop(); });
    runLoop->runInMode(kMode);  // the task queued behind the first stop was kept, not lost
    EXPECT_EQ(ran, (std::vector<std::string>{kMode, "other", "after stop"}));
}

TEST(RunLoop, ASourceMayDestroyItselfInItsCallback) {
    auto runLoop = RunLoop::current();
    std::unique_ptr<TimerSource> timer;
    timer = std::make_unique<TimerSource>(1ms, [&] {
        timer.reset();
        runLoop->stop();
    });
    timer->attach(runLoop, kMode);
    runLoop->runInMode(kMode);
    EXPECT_EQ(timer, nullptr);
}

TEST(DispatchQueue, RunsTasksInSubmissionOrderOnItsOwnThreadPastOneThatThrowsAndDrainsWhenDestroyed) {
    auto queue = DispatchQueue::create("test.order");
    std::vector<int> order;
    std::atomic<bool> onQueueThread{true};
    for (int i = 0; i < 100; ++i) {
        queue->async([&, i] {
            order.push_back(i);
            if (!queue->isCurrent()) onQueueThread = false;
            if (i == 50) throw std::runtime_error("boom");
        });
    }
    queue->barrier();
    std::vector<int> expected(100);
    std::iota(expected.begin(), expected.end(), 0);
    EXPECT_EQ(order, expected);
    EXPECT_TRUE(onQueueThread);

    bool ran = false;
    queue->sync([&] { queue->sync([&] { ran = true; }); });  // sync on the queue itself runs at once
    EXPECT_TRUE(ran);
    EXPECT_EQ(DispatchQueue::fromHandle(queue->handle()), queue);
    EXPECT_EQ(DispatchQueue::fromHandle(nullptr), nullptr);

    std::atomic<int> drained{0};  // destruction runs every submitted task
    for (int i = 0; i < 50; ++i) queue->async([&] { ++drained; });
    queue.reset();
    EXPECT_EQ(drained, 50);
}

TEST(DispatchQueue, TheLastReferenceMayGoAwayInsideItsOwnTask) {
    Semaphore done;
    auto queue = DispatchQueue::create("test.self");
    queue->async([queue, &done]() mutable {
        queue.reset();
        done.signal();
    });
    queue.reset();  // the task now holds the last reference
    EXPECT_TRUE(done.waitFor(2s));
}

TEST(Thread, ADetachedThreadSignalsAcrossAndReportsTheSystemsRealtimeAnswer) {
    Semaphore semaphore;
    EXPECT_FALSE(semaphore.waitFor(1ms));
    std::atomic<int> result{-1}, refused{-1};
    startDetachedThread([&] {
        result = setRealtimeRoundRobin(63);
        refused = setRealtimeRoundRobin(1000);  // beyond every priority range
        semaphore.signal();
        semaphore.signal();
    }, "test.realtime");
    semaphore.wait();
    EXPECT_TRUE(semaphore.waitFor(2s));  // the semaphore counts both signals
    EXPECT_FALSE(semaphore.waitFor(1ms));
    EXPECT_TRUE(result == 0 || result == EPERM) << result;  // granted as root, refused otherwise
    EXPECT_NE(refused, 0);
}

}  // namespace
}  // namespace ZeltoTouch::Platform

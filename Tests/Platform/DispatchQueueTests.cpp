#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>

#include "Platform/DispatchQueue.h"
#include "Platform/Semaphore.h"
#include "Platform/Thread.h"

namespace ZeltoTouch::Platform {
namespace {

using namespace std::chrono_literals;

TEST(DispatchQueue, RunsTasksInSubmissionOrderOnItsOwnThread) {
    auto queue = DispatchQueue::create("test.order");
    std::vector<int> order;
    std::atomic<bool> onQueueThread{true};
    for (int i = 0; i < 100; ++i) {
        queue->async([&, i] {
            order.push_back(i);
            if (!queue->isCurrent()) onQueueThread = false;
        });
    }
    queue->barrier();
    ASSERT_EQ(order.size(), 100u);
    for (int i = 0; i < 100; ++i) EXPECT_EQ(order[static_cast<size_t>(i)], i);
    EXPECT_TRUE(onQueueThread);
}

TEST(DispatchQueue, DestructionRunsEverySubmittedTask) {
    std::atomic<int> ran{0};
    {
        auto queue = DispatchQueue::create("test.drain");
        for (int i = 0; i < 50; ++i) queue->async([&] { ++ran; });
    }
    EXPECT_EQ(ran, 50);
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

TEST(DispatchQueue, SyncOnTheQueueItselfRunsAtOnce) {
    auto queue = DispatchQueue::create("test.sync");
    bool ran = false;
    queue->sync([&] { queue->sync([&] { ran = true; }); });
    EXPECT_TRUE(ran);
}

TEST(DispatchQueue, AThrowingTaskDoesNotStopTheQueue) {
    auto queue = DispatchQueue::create("test.throw");
    bool ranAfter = false;
    queue->async([] { throw std::runtime_error("boom"); });
    queue->async([&] { ranAfter = true; });
    queue->barrier();
    EXPECT_TRUE(ranAfter);
}

TEST(DispatchQueue, HandleMapsBackToTheSameQueue) {
    auto queue = DispatchQueue::create("test.handle");
    EXPECT_EQ(DispatchQueue::fromHandle(queue->handle()), queue);
    EXPECT_EQ(DispatchQueue::fromHandle(nullptr), nullptr);
}

TEST(Semaphore, CountsSignalsAcrossThreads) {
    Semaphore semaphore;
    EXPECT_FALSE(semaphore.waitFor(1ms));
    startDetachedThread([&] {
        semaphore.signal();
        semaphore.signal();
    }, "test.signal");
    semaphore.wait();
    EXPECT_TRUE(semaphore.waitFor(2s));
    EXPECT_FALSE(semaphore.waitFor(1ms));
}

TEST(Thread, RealtimeRoundRobinReportsTheSystemsAnswer) {
    std::atomic<int> result{-1}, refused{-1};
    Semaphore done;
    startDetachedThread([&] {
        result = setRealtimeRoundRobin(63);
        refused = setRealtimeRoundRobin(1000);  // beyond every priority range
        done.signal();
    }, "test.realtime");
    ASSERT_TRUE(done.waitFor(2s));
    EXPECT_TRUE(result == 0 || result == EPERM) << result;  // granted as root, refused otherwise
    EXPECT_NE(refused, 0);
}

}  // namespace
}  // namespace ZeltoTouch::Platform

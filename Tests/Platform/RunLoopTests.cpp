#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <unistd.h>

#include "Platform/FileDescriptorSource.h"
#include "Platform/RunLoop.h"
#include "Platform/Semaphore.h"
#include "Platform/TimerSource.h"

namespace ZeltoTouch::Platform {
namespace {

using namespace std::chrono_literals;
const std::string kMode = "kHandleInputReportsRunLoopMode";

// A thread that runs its run loop in kMode until stopped, the way the service's input thread does.
class RunLoopThread {
public:
    explicit RunLoopThread(std::function<void(const std::shared_ptr<RunLoop>&)> beforeRun = {}) {
        _thread = std::thread([this, beforeRun] {
            auto runLoop = RunLoop::current();
            _runLoop = runLoop;
            if (beforeRun) beforeRun(runLoop);
            _published.signal();
            runLoop->runInMode(kMode);
            _finished.signal();
        });
        _published.wait();
    }
    ~RunLoopThread() {
        stop();
        _thread.join();
    }
    void stop() {
        _runLoop->perform(kMode, [] { RunLoop::current()->stop(); });
        _runLoop->wakeUp();
    }
    bool waitUntilFinished() { return _finished.waitFor(2s); }
    const std::shared_ptr<RunLoop>& runLoop() const { return _runLoop; }

private:
    std::shared_ptr<RunLoop> _runLoop;
    Semaphore _published, _finished;
    std::thread _thread;
};

TEST(RunLoop, AStopQueuedBeforeTheLoopRunsIsHonoured) {
    Semaphore stopQueued;
    RunLoopThread thread([&](const std::shared_ptr<RunLoop>& runLoop) {
        runLoop->perform(kMode, [] { RunLoop::current()->stop(); });  // before runInMode
    });
    EXPECT_TRUE(thread.waitUntilFinished());
}

TEST(RunLoop, AStopCalledBeforeTheLoopRunsIsHonoured) {
    RunLoopThread thread([](const std::shared_ptr<RunLoop>& runLoop) { runLoop->stop(); });
    EXPECT_TRUE(thread.waitUntilFinished());
}

TEST(RunLoop, TasksRunInOrderOnTheLoopsThread) {
    RunLoopThread thread;
    std::vector<int> order;
    std::thread::id taskThread;
    Semaphore done;
    for (int i = 0; i < 5; ++i) thread.runLoop()->perform(kMode, [&, i] { order.push_back(i); });
    thread.runLoop()->perform(kMode, [&] {
        taskThread = std::this_thread::get_id();
        done.signal();
    });
    ASSERT_TRUE(done.waitFor(2s));
    EXPECT_EQ(order, (std::vector<int>{0, 1, 2, 3, 4}));
    EXPECT_NE(taskThread, std::this_thread::get_id());
}

TEST(RunLoop, TasksForAnotherModeWaitUntilTheLoopRunsInIt) {
    auto runLoop = RunLoop::current();
    std::vector<std::string> ran;
    runLoop->perform("other", [&] { ran.push_back("other"); });
    runLoop->perform(kMode, [&] {
        ran.push_back(kMode);
        runLoop->stop();
    });
    runLoop->perform(kMode, [&] { ran.push_back("after stop"); });
    runLoop->runInMode(kMode);
    EXPECT_EQ(ran, std::vector<std::string>{kMode});

    runLoop->perform("other", [&] { runLoop->stop(); });
    runLoop->runInMode("other");
    EXPECT_EQ(ran, (std::vector<std::string>{kMode, "other"}));

    runLoop->perform(kMode, [&] { runLoop->stop(); });
    runLoop->runInMode(kMode);  // the task queued behind the first stop was kept, not lost
    EXPECT_EQ(ran, (std::vector<std::string>{kMode, "other", "after stop"}));
}

TEST(RunLoop, WakeUpFromAnotherThreadKeepsTheLoopRunning) {
    RunLoopThread thread;
    thread.runLoop()->wakeUp();
    EXPECT_TRUE(thread.runLoop()->isRunning());
    thread.stop();
    EXPECT_TRUE(thread.waitUntilFinished());
    EXPECT_FALSE(thread.runLoop()->isRunning());
}

TEST(RunLoop, TimerSourceRepeatsUntilDetached) {
    auto runLoop = RunLoop::current();
    int fired = 0;
    TimerSource timer(2ms, [&] {
        if (++fired == 3) runLoop->stop();
    });
    timer.attach(runLoop, kMode);
    runLoop->runInMode(kMode);
    EXPECT_EQ(fired, 3);
    timer.detach();
    runLoop->perform(kMode, [&] { runLoop->stop(); });
    runLoop->runInMode(kMode);
    EXPECT_EQ(fired, 3);
}

TEST(RunLoop, TimerSourceFiresOnlyInItsMode) {
    auto runLoop = RunLoop::current();
    int fired = 0;
    TimerSource timer(1ms, [&] { ++fired; });
    timer.attach(runLoop, kMode);
    TimerSource otherModeStop(20ms, [&] { runLoop->stop(); });
    otherModeStop.attach(runLoop, "other");
    runLoop->runInMode("other");
    EXPECT_EQ(fired, 0);
    TimerSource stopper(5ms, [&] { runLoop->stop(); });
    stopper.attach(runLoop, kMode);
    runLoop->runInMode(kMode);
    EXPECT_GE(fired, 1);
}

TEST(RunLoop, FileDescriptorSourceFiresWhenReadable) {
    int pipeEnds[2];
    ASSERT_EQ(pipe(pipeEnds), 0);
    auto runLoop = RunLoop::current();
    std::string received;
    FileDescriptorSource source(pipeEnds[0], [&] {
        char buffer[16];
        const ssize_t count = read(pipeEnds[0], buffer, sizeof buffer);
        received.append(buffer, static_cast<size_t>(std::max<ssize_t>(count, 0)));
        if (received == "ping") runLoop->stop();
    });
    source.attach(runLoop, kMode);
    std::thread writer([&] { EXPECT_EQ(write(pipeEnds[1], "ping", 4), 4); });
    runLoop->runInMode(kMode);
    writer.join();
    EXPECT_EQ(received, "ping");
    source.detach();
    close(pipeEnds[0]);
    close(pipeEnds[1]);
}

TEST(RunLoop, ASourceMayDestroyItselfInItsCallback) {
    auto runLoop = RunLoop::current();
    auto timer = std::make_unique<TimerSource>(1ms, [] {});
    timer = std::make_unique<TimerSource>(1ms, [&] {
        timer.reset();
        runLoop->stop();
    });
    timer->attach(runLoop, kMode);
    runLoop->runInMode(kMode);
    EXPECT_EQ(timer, nullptr);
}

}  // namespace
}  // namespace ZeltoTouch::Platform

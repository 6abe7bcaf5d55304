#pragma once

#include <asio/io_context.hpp>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>

namespace ZeltoTouch::Platform {

// A thread's run loop: an asio::io_context that runs in a named mode until stopped.
//
// Every thread has one, created on first use and shared by everyone who asks (current()).
// Tasks and source callbacks belong to a mode and run only while the loop runs in that mode;
// those for another mode wait, in order, until the loop runs in theirs. perform, wakeUp and
// stop may be called from any thread; runInMode only on the loop's own thread.
//
// A stop never gets lost: a stop() while the loop is not running makes the next runInMode
// return at once, and a stop task queued with perform before the loop runs in its mode runs
// (and stops the loop) as soon as it does.
class RunLoop {
public:
    using Task = std::function<void()>;

    static std::shared_ptr<RunLoop> current();

    RunLoop(const RunLoop&) = delete;
    RunLoop& operator=(const RunLoop&) = delete;

    // Runs the loop in mode until stop(); nesting is not supported (std::logic_error).
    void runInMode(const std::string& mode);
    // Queues task to run on the loop's thread while it runs in mode.
    void perform(const std::string& mode, Task task);
    // Makes a waiting loop look at its queued tasks and sources again.
    void wakeUp();
    // Makes runInMode return once the task or callback in progress, if any, has returned.
    void stop();

    bool isRunning() const;
    std::string currentMode() const;  // empty while not running

    // The event loop itself, for sources (RunLoopSource): objects bound to it must be created,
    // armed and destroyed on the loop's thread, or while it is not running.
    asio::io_context& ioContext() noexcept { return _io; }

private:
    RunLoop() = default;
    void runQueuedTasks();

    asio::io_context _io;
    mutable std::mutex _lock;
    std::map<std::string, std::deque<Task>> _queuedTasks;
    std::string _mode;
    bool _running = false;
    bool _stopRequested = false;
};

}  // namespace ZeltoTouch::Platform

#include "Platform/RunLoop.h"

#include <asio/executor_work_guard.hpp>
#include <asio/post.hpp>
#include <stdexcept>

namespace ZeltoTouch::Platform {

std::shared_ptr<RunLoop> RunLoop::current() {
    thread_local const std::shared_ptr<RunLoop> runLoop(new RunLoop);
    return runLoop;
}

void RunLoop::runInMode(const std::string& mode) {
    {
        std::lock_guard lock(_lock);
        if (_running) throw std::logic_error("RunLoop::runInMode: the run loop is already running");
        if (_stopRequested) {
            _stopRequested = false;
            return;
        }
        _mode = mode;
        _running = true;
        _io.restart();  // inside the lock: a stop() from now on is seen by run()
    }
    struct RunningState {
        RunLoop& loop;
        ~RunningState() {
            std::lock_guard lock(loop._lock);
            loop._running = false;
            loop._stopRequested = false;
            loop._mode.clear();
        }
    } runningState{*this};

    asio::post(_io, [this] { runQueuedTasks(); });
    auto work = asio::make_work_guard(_io);
    _io.run();
}

void RunLoop::perform(const std::string& mode, Task task) {
    {
        std::lock_guard lock(_lock);
        _queuedTasks[mode].push_back(std::move(task));
    }
    // The handler cannot outlive the loop: it lives in _io, which the loop owns.
    asio::post(_io, [this] { runQueuedTasks(); });
}

void RunLoop::wakeUp() {
    asio::post(_io, [this] { runQueuedTasks(); });
}

void RunLoop::stop() {
    std::lock_guard lock(_lock);
    _stopRequested = true;
    if (_running) _io.stop();
}

bool RunLoop::isRunning() const {
    std::lock_guard lock(_lock);
    return _running;
}

std::string RunLoop::currentMode() const {
    std::lock_guard lock(_lock);
    return _mode;
}

// One task at a time, so that tasks queued behind a stop stay queued for the next run.
void RunLoop::runQueuedTasks() {
    for (;;) {
        Task task;
        {
            std::lock_guard lock(_lock);
            if (!_running || _stopRequested) return;
            auto queue = _queuedTasks.find(_mode);
            if (queue == _queuedTasks.end() || queue->second.empty()) return;
            task = std::move(queue->second.front());
            queue->second.pop_front();
        }
        task();
    }
}

}  // namespace ZeltoTouch::Platform

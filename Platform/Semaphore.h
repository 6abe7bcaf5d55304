#pragma once

#include <chrono>
#include <climits>
#include <semaphore>

namespace ZeltoTouch::Platform {

// A counting semaphore: signal adds one, wait takes one, blocking while the count is 0.
class Semaphore {
public:
    explicit Semaphore(int initialCount = 0) : _semaphore(initialCount) {}

    void signal() { _semaphore.release(); }
    void wait() { _semaphore.acquire(); }
    // Waits at most timeout; true when a signal was taken. For tests that must not hang.
    bool waitFor(std::chrono::milliseconds timeout) { return _semaphore.try_acquire_for(timeout); }

private:
    std::counting_semaphore<INT_MAX> _semaphore;
};

}  // namespace ZeltoTouch::Platform

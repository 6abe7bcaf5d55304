#include "Platform/MonotonicClock.h"

#include <chrono>
#include <ctime>
#include <thread>

namespace ZeltoTouch::Platform {

uint64_t MonotonicClock::machTimeNow() const noexcept {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<uint64_t>(now.tv_sec) * 1'000'000'000u + static_cast<uint64_t>(now.tv_nsec);
}

void MonotonicClock::sleepMicroseconds(uint64_t microseconds) const noexcept {
    std::this_thread::sleep_for(std::chrono::microseconds(microseconds));
}

void installMonotonicClock() noexcept {
    static const MonotonicClock clock;
    Util::setHostClock(&clock);
}

}  // namespace ZeltoTouch::Platform

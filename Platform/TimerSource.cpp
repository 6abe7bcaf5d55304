#include "Platform/TimerSource.h"

#include <stdexcept>

namespace ZeltoTouch::Platform {

TimerSource::TimerSource(std::chrono::nanoseconds interval, std::function<void()> callback)
    : RunLoopSource(std::move(callback)), _interval(interval) {
    if (interval <= std::chrono::nanoseconds::zero())
        throw std::invalid_argument("TimerSource: the interval must be positive");
}

void TimerSource::startWaiting(asio::io_context& io) {
    _timer.emplace(io);
    _timer->expires_after(_interval);
    _timer->async_wait(guarded([this] { fired(); }));
}

void TimerSource::rearm() {
    _timer->expires_at(_timer->expiry() + _interval);
    _timer->async_wait(guarded([this] { fired(); }));
}

void TimerSource::stopWaiting() noexcept { _timer.reset(); }

}  // namespace ZeltoTouch::Platform

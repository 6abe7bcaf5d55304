#pragma once

#include <asio/steady_timer.hpp>
#include <chrono>
#include <optional>

#include "Platform/RunLoopSource.h"

namespace ZeltoTouch::Platform {

// A repeating timer: calls back every interval (first one interval after attach), on a fixed
// schedule; a late firing does not shift the later ones.
class TimerSource final : public RunLoopSource {
public:
    TimerSource(std::chrono::nanoseconds interval, std::function<void()> callback);
    ~TimerSource() override { detach(); }

    std::chrono::nanoseconds interval() const noexcept { return _interval; }

private:
    void startWaiting(asio::io_context& io) override;
    void stopWaiting() noexcept override;
    bool rearmsBeforeCallback() const noexcept override { return true; }
    void rearm() override;

    const std::chrono::nanoseconds _interval;
    std::optional<asio::steady_timer> _timer;
};

}  // namespace ZeltoTouch::Platform

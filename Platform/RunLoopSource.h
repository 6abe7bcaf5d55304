#pragma once

#include <asio/io_context.hpp>
#include <functional>
#include <memory>
#include <string>
#include <system_error>

#include "Platform/RunLoop.h"

namespace ZeltoTouch::Platform {

// Something that calls back on a run loop in one mode: a timer, a readable descriptor.
// attach and detach run on the loop's thread (or while the loop is not running); the callback
// runs on the loop's thread while the loop runs in the source's mode. Firings that happen while
// the loop is in another mode are coalesced into one pending callback. A callback may detach or
// destroy its own source.
class RunLoopSource {
public:
    RunLoopSource(const RunLoopSource&) = delete;
    RunLoopSource& operator=(const RunLoopSource&) = delete;
    virtual ~RunLoopSource() = default;  // subclasses detach in their destructors

    void attach(std::shared_ptr<RunLoop> runLoop, std::string mode);
    void detach();
    bool isAttached() const noexcept { return _runLoop != nullptr; }

protected:
    explicit RunLoopSource(std::function<void()> callback) : _callback(std::move(callback)) {}

    // Creates the asio object on io and starts waiting; the completion handler goes through
    // guarded() and ends by calling fired().
    virtual void startWaiting(asio::io_context& io) = 0;
    // Cancels the wait and destroys the asio object.
    virtual void stopWaiting() noexcept = 0;
    // Whether a firing re-arms at once (a timer) or only after the callback has run (a
    // descriptor, whose callback is what consumes the readiness).
    virtual bool rearmsBeforeCallback() const noexcept = 0;
    virtual void rearm() = 0;

    // Wraps a completion handler so that completions after detach (or with an error) are ignored.
    template <typename Handler>
    auto guarded(Handler handler) {
        return [alive = std::weak_ptr<void>(_alive), handler](const std::error_code& error) mutable {
            if (!error && !alive.expired()) handler();
        };
    }
    void fired();

private:
    std::function<void()> _callback;
    std::shared_ptr<RunLoop> _runLoop;
    std::string _mode;
    std::shared_ptr<void> _alive;  // reset on detach; completions and queued callbacks check it
    bool _callbackPending = false;
};

}  // namespace ZeltoTouch::Platform

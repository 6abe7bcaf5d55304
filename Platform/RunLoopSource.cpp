#include "Platform/RunLoopSource.h"

namespace ZeltoTouch::Platform {

void RunLoopSource::attach(std::shared_ptr<RunLoop> runLoop, std::string mode) {
    detach();
    _runLoop = std::move(runLoop);
    _mode = std::move(mode);
    _alive = std::make_shared<char>();
    _callbackPending = false;
    startWaiting(_runLoop->ioContext());
}

void RunLoopSource::detach() {
    if (!_runLoop) return;
    _alive.reset();
    stopWaiting();
    _runLoop.reset();
}

void RunLoopSource::fired() {
    if (rearmsBeforeCallback()) rearm();
    if (_callbackPending) return;
    _callbackPending = true;
    _runLoop->perform(_mode, [this, alive = std::weak_ptr<void>(_alive)] {
        if (alive.expired()) return;
        _callbackPending = false;
        const auto callback = _callback;  // the callback may destroy this source
        callback();
        if (!alive.expired() && !rearmsBeforeCallback()) rearm();
    });
}

}  // namespace ZeltoTouch::Platform

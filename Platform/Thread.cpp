#include "Platform/Thread.h"

#include <pthread.h>
#include <sched.h>
#include <thread>

namespace ZeltoTouch::Platform {

void setCurrentThreadName(const std::string& name) noexcept {
    if (name.empty()) return;
    pthread_setname_np(pthread_self(), name.substr(0, 15).c_str());
}

void startDetachedThread(std::function<void()> body, const std::string& name) {
    std::thread([body = std::move(body), name] {
        setCurrentThreadName(name);
        body();
    }).detach();
}

int setRealtimeRoundRobin(int priority) noexcept {
    sched_param parameters{};
    parameters.sched_priority = priority;
    return pthread_setschedparam(pthread_self(), SCHED_RR, &parameters);
}

}  // namespace ZeltoTouch::Platform

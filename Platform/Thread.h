#pragma once

#include <functional>
#include <string>

namespace ZeltoTouch::Platform {

// Starts a detached thread running body. name (at most 15 characters are kept) shows in
// debuggers and top. Throws std::system_error when the system cannot create a thread.
void startDetachedThread(std::function<void()> body, const std::string& name = {});

// Sets the calling thread's policy to real-time round robin (SCHED_RR, policy 2) at priority.
// Returns pthread_setschedparam's result: 0 on success, an errno value (EPERM without the
// privilege, EINVAL for a priority out of range) when refused.
int setRealtimeRoundRobin(int priority) noexcept;

// Names the calling thread (at most 15 characters are kept).
void setCurrentThreadName(const std::string& name) noexcept;

}  // namespace ZeltoTouch::Platform

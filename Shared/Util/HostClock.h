#pragma once

#include <cstdint>

namespace ZeltoTouch::Util {

// nanoseconds = ticks × numer ÷ denom
struct Timebase {
    uint32_t numer = 1;
    uint32_t denom = 1;
};

// What the core needs of the host's clock. The platform installs the real one; tests
// install fakes so that nothing has to wait for real time to pass.
class HostClock {
public:
    virtual ~HostClock() = default;
    virtual Timebase timebase() const noexcept = 0;
    virtual uint64_t machTimeNow() const noexcept = 0;
    virtual void sleepMicroseconds(uint64_t microseconds) const noexcept = 0;
};

// The process-wide clock; it must outlive every use. Until one is installed, a clock that
// stands still (timebase 1/1, time 0, no sleeping) answers.
void setHostClock(const HostClock* clock) noexcept;
const HostClock& hostClock() noexcept;
bool isHostClockInstalled() noexcept;

}  // namespace ZeltoTouch::Util

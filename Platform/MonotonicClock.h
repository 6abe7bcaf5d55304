#pragma once

#include "Shared/Util/HostClock.h"

namespace ZeltoTouch::Platform {

// The host clock on Linux: mach time is CLOCK_MONOTONIC in nanoseconds (timebase 1/1).
class MonotonicClock final : public Util::HostClock {
public:
    Util::Timebase timebase() const noexcept override { return {1, 1}; }
    uint64_t machTimeNow() const noexcept override;
    void sleepMicroseconds(uint64_t microseconds) const noexcept override;
};

// Installs one process-wide MonotonicClock as the host clock (idempotent).
void installMonotonicClock() noexcept;

}  // namespace ZeltoTouch::Platform

#pragma once

#include <cstdint>

#include "Shared/Util/HostClock.h"

namespace ZeltoTouch::Util {

// Conversions between the host's mach time and nanoseconds with the host's timebase, which is
// fetched from Util::hostClock() once per process, on the first call of either conversion.
uint64_t machTimeFromNanoseconds(uint64_t nanoseconds) noexcept;
uint64_t nanosecondsFromMachTime(uint64_t machTime) noexcept;

// The arithmetic with an explicit timebase: the product wraps modulo 2^64, the division
// truncates, and a zero divisor gives 0.
uint64_t machTimeFromNanoseconds(uint64_t nanoseconds, Timebase timebase) noexcept;
uint64_t nanosecondsFromMachTime(uint64_t machTime, Timebase timebase) noexcept;

}  // namespace ZeltoTouch::Util

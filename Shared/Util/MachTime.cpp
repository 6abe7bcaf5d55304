#include "Shared/Util/MachTime.h"

namespace ZeltoTouch::Util {

namespace {

uint64_t scale(uint64_t value, uint32_t multiplier, uint32_t divisor) noexcept {
    return divisor == 0 ? 0 : value * multiplier / divisor;
}

// One slot for both conversions; the local static's guard makes concurrent first calls ask
// the host exactly once.
Timebase processTimebase() noexcept {
    static const Timebase timebase = hostClock().timebase();
    return timebase;
}

}  // namespace

uint64_t machTimeFromNanoseconds(uint64_t nanoseconds, Timebase timebase) noexcept {
    return scale(nanoseconds, timebase.denom, timebase.numer);
}

uint64_t nanosecondsFromMachTime(uint64_t machTime, Timebase timebase) noexcept {
    return scale(machTime, timebase.numer, timebase.denom);
}

uint64_t machTimeFromNanoseconds(uint64_t nanoseconds) noexcept {
    return machTimeFromNanoseconds(nanoseconds, processTimebase());
}

uint64_t nanosecondsFromMachTime(uint64_t machTime) noexcept {
    return nanosecondsFromMachTime(machTime, processTimebase());
}

}  // namespace ZeltoTouch::Util

#include "Shared/Util/HostClock.h"

#include <atomic>

namespace ZeltoTouch::Util {

namespace {

class StoppedClock final : public HostClock {
public:
    Timebase timebase() const noexcept override { return {}; }
    uint64_t machTimeNow() const noexcept override { return 0; }
    void sleepMicroseconds(uint64_t) const noexcept override {}
};

const StoppedClock gStoppedClock;
std::atomic<const HostClock*> gClock{&gStoppedClock};

}  // namespace

void setHostClock(const HostClock* clock) noexcept {
    gClock.store(clock ? clock : &gStoppedClock, std::memory_order_release);
}

const HostClock& hostClock() noexcept { return *gClock.load(std::memory_order_acquire); }

bool isHostClockInstalled() noexcept { return gClock.load(std::memory_order_acquire) != &gStoppedClock; }

}  // namespace ZeltoTouch::Util

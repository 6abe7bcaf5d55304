#include "Shared/Util/MachTime.h"

#include <atomic>
#include <cstdint>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

namespace ZeltoTouch::Util {
namespace {

TEST(ConversionArithmetic, TruncatesAndWrapsInsteadOfSaturating) {
    constexpr uint64_t kMax = UINT64_MAX;
    constexpr uint64_t kWrapTicks = kMax / 125 + 1;  // the first tick count whose product wraps
    const struct {
        Timebase timebase;
        bool toMachTime;  // machTimeFromNanoseconds, else nanosecondsFromMachTime
        uint64_t input, expected;
    } cases[] = {
        {{125, 3}, true, 1000000, 24000}, {{125, 3}, false, 24000, 1000000}, {{125, 3}, false, 1, 41},
        {{125, 3}, true, 100, 2},         {{125, 3}, true, 0, 0},
        {{125, 3}, false, kWrapTicks - 1, 6148914691236517166},
        {{125, 3}, false, kWrapTicks, 3},  // the product wraps to 9
        {{125, 3}, false, kMax, 6148914691236517163},
        {{1, 1}, true, kMax, kMax},       {{1, 1}, false, kMax, kMax},
        {{0, 1}, true, 5, 0},             {{1, 0}, false, 5, 0},            {{0, 0}, true, 5, 0},
    };
    for (const auto& c : cases) {
        const uint64_t result = c.toMachTime ? machTimeFromNanoseconds(c.input, c.timebase)
                                             : nanosecondsFromMachTime(c.input, c.timebase);
        EXPECT_EQ(result, c.expected) << c.input << (c.toMachTime ? " ns" : " ticks") << " at "
                                      << c.timebase.numer << "/" << c.timebase.denom;
    }
}

class CountingClock final : public HostClock {
public:
    Timebase timebase() const noexcept override {
        ++calls;
        return {125, 3};
    }
    uint64_t machTimeNow() const noexcept override { return 0; }
    void sleepMicroseconds(uint64_t) const noexcept override {}
    mutable std::atomic<int> calls{0};
};

// The only test in this binary that uses the process-wide timebase: it must be the first to
// fetch it.
TEST(ProcessTimebase, FetchedOnceForBothConversionsEvenConcurrently) {
    static CountingClock clock;
    setHostClock(&clock);
    std::atomic<bool> go{false};
    std::atomic<int> wrong{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([&, i] {
            while (!go.load()) {}
            const bool ok = i % 2 ? machTimeFromNanoseconds(1000000) == 24000
                                  : nanosecondsFromMachTime(24000) == 1000000;
            if (!ok) ++wrong;
        });
    }
    go = true;
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(wrong.load(), 0);
    EXPECT_EQ(nanosecondsFromMachTime(1), 41u);
    EXPECT_EQ(clock.calls.load(), 1);
    setHostClock(nullptr);
}

}  // namespace
}  // namespace ZeltoTouch::Util

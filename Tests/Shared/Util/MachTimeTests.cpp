#include "Shared/Util/MachTime.h"

#include <atomic>
#include <cstdint>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

namespace ZeltoTouch::Util {
namespace {

struct ConversionCase {
    Timebase timebase;
    bool toMachTime;  // machTimeFromNanoseconds, else nanosecondsFromMachTime
    uint64_t input;
    uint64_t expected;
};

class ConversionArithmetic : public testing::TestWithParam<ConversionCase> {};

TEST_P(ConversionArithmetic, MatchesTruncatingWrappingFormula) {
    const ConversionCase& c = GetParam();
    const uint64_t result = c.toMachTime ? machTimeFromNanoseconds(c.input, c.timebase)
                                         : nanosecondsFromMachTime(c.input, c.timebase);
    EXPECT_EQ(result, c.expected);
}

constexpr uint64_t kMax = UINT64_MAX;
constexpr uint64_t kWrapTicks = kMax / 125 + 1;  // the first tick count whose product wraps

INSTANTIATE_TEST_SUITE_P(
    Timebases, ConversionArithmetic,
    testing::Values(
        ConversionCase{{125, 3}, true, 1000000, 24000}, ConversionCase{{125, 3}, false, 24000, 1000000},
        ConversionCase{{125, 3}, false, 1, 41}, ConversionCase{{125, 3}, true, 100, 2},
        ConversionCase{{125, 3}, true, 0, 0},
        // 2^64 / 125 + 1 ticks: the product wraps modulo 2^64 instead of saturating.
        ConversionCase{{125, 3}, false, kWrapTicks, (kWrapTicks * 125) / 3},
        ConversionCase{{125, 3}, false, kMax, (kMax * 125) / 3},
        ConversionCase{{1, 1}, true, kMax, kMax}, ConversionCase{{1, 1}, false, kMax, kMax},
        ConversionCase{{1, 1}, true, 12345, 12345}, ConversionCase{{1, 1}, false, 12345, 12345},
        ConversionCase{{0, 1}, true, 5, 0}, ConversionCase{{1, 0}, false, 5, 0},
        ConversionCase{{0, 0}, true, 5, 0}));

TEST(ConversionArithmetic, WrapIsNotSaturation) {
    const uint64_t wrapped = nanosecondsFromMachTime(kWrapTicks, {125, 3});
    EXPECT_LT(wrapped, nanosecondsFromMachTime(kWrapTicks - 1, {125, 3}));
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
    std::vector<std::thread> threads;
    std::atomic<int> wrong{0};
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([&, i] {
            while (!go.load()) {}
            const bool ok = i % 2 ? machTimeFromNanoseconds(1000000) == 24000 : nanosecondsFromMachTime(24000) == 1000000;
            if (!ok) ++wrong;
        });
    }
    go = true;
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(wrong.load(), 0);
    EXPECT_EQ(nanosecondsFromMachTime(1), 41u);
    EXPECT_EQ(machTimeFromNanoseconds(100), 2u);
    EXPECT_EQ(clock.calls.load(), 1);
    setHostClock(nullptr);
}

}  // namespace
}  // namespace ZeltoTouch::Util

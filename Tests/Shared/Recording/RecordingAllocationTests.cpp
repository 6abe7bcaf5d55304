// Counts heap allocations on this thread, to show that recording in steady state needs none.
#include <cstdlib>
#include <new>

#include <gtest/gtest.h>

#include "Tests/Shared/Recording/RecordingTestSupport.h"

namespace {
thread_local long tAllocations = 0;
}

// Every replacement stays out of line: once inlined next to each other, malloc and free draw
// false mismatched-allocation warnings.
[[gnu::noinline]] void* operator new(std::size_t size) {
    ++tAllocations;
    if (void* block = std::malloc(size ? size : 1)) return block;
    throw std::bad_alloc();
}
[[gnu::noinline]] void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    ++tAllocations;
    return std::malloc(size ? size : 1);
}
[[gnu::noinline]] void operator delete(void* block) noexcept { std::free(block); }
[[gnu::noinline]] void operator delete(void* block, std::size_t) noexcept { std::free(block); }
[[gnu::noinline]] void operator delete(void* block, const std::nothrow_t&) noexcept { std::free(block); }

namespace ZeltoTouch::RecordingTest {
namespace {

TEST(RecordingAllocations, NoneInSteadyStateIncludingTrimming) {
    PipelineRecording recording;
    recording.setMaxFrameCount(100);
    const Bytes report(73, 0x11);
    const PropertyValue value = PropertyValue::fromUInt64(1);
    const std::string key = "Algs.Threshold";
    auto recordRound = [&](int count) {
        for (int i = 0; i < count; ++i) {
            recording.handleInputReport(static_cast<uint64_t>(i), report.data(), report.size());
            if (i % 50 == 0) recording.setState(static_cast<uint64_t>(i), key, value);
        }
    };
    recordRound(1000);  // reaches the largest list size and trims several times
    const long before = tAllocations;
    EXPECT_GT(before, 0);  // the counter sees this thread's allocations
    recordRound(10000);
    EXPECT_EQ(tAllocations - before, 0);
    EXPECT_LT(recording.frames().size(), 200u);
}

}  // namespace
}  // namespace ZeltoTouch::RecordingTest

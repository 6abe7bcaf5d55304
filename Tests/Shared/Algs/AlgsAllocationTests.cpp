// The frame path runs on a real-time thread: a frame without an event must not allocate.
#include <gtest/gtest.h>

#include <cstdlib>
#include <new>

#include "Shared/Algs/Algs.h"

// AddressSanitizer brings its own operator new and reports a replacement mixed with it, so
// the count is taken in builds without it.
#if defined(__SANITIZE_ADDRESS__)
#define ZELTO_COUNT_ALLOCATIONS 0
#else
#define ZELTO_COUNT_ALLOCATIONS 1
#endif

namespace {
thread_local bool gCounting = false;
thread_local int gAllocations = 0;

[[maybe_unused]] void* countedAllocation(std::size_t size) {
    if (gCounting) ++gAllocations;
    if (void* p = std::malloc(size == 0 ? 1 : size)) return p;
    throw std::bad_alloc();
}
}  // namespace

#if ZELTO_COUNT_ALLOCATIONS
void* operator new(std::size_t size) { return countedAllocation(size); }
void* operator new[](std::size_t size) { return countedAllocation(size); }
void operator delete(void* p) noexcept { std::free(p); }
void operator delete[](void* p) noexcept { std::free(p); }
void operator delete(void* p, std::size_t) noexcept { std::free(p); }
void operator delete[](void* p, std::size_t) noexcept { std::free(p); }
#endif

namespace ZeltoTouch {
namespace {

TEST(AlgsAllocationTest, FramesWithoutEventsDoNotAllocate) {
    if (!ZELTO_COUNT_ALLOCATIONS) GTEST_SKIP() << "allocations are not counted under AddressSanitizer";
    Algs algs;
    algs.setState("EnableHoldSuppression", PropertyValue::fromBool(false));
    uint32_t frameNumber = 0;
    int eventlessFrames = 0;
    for (int cycle = 0; cycle < 3; ++cycle) {
        for (int i = 0; i < 200; ++i) {  // idle, touch, hold, release
            InputReport::Image image;
            image.frameNumber = ++frameNumber;
            image.timestampMs = frameNumber * 10;
            image.signedPixels[1] = static_cast<int16_t>(i >= 50 && i < 150 ? 400 : 20);
            gAllocations = 0;
            gCounting = true;
            const HIDEventList events = algs.handleImage(image);
            gCounting = false;
            if (events.empty()) {
                EXPECT_EQ(gAllocations, 0) << "frame " << frameNumber;
                ++eventlessFrames;
            }
        }
    }
    EXPECT_GT(eventlessFrames, 500);
}

}  // namespace
}  // namespace ZeltoTouch

// The input report thread is real-time: once warmed up, a report that produces no event must
// reach the recording, the pipeline and the touch algorithm without a single heap allocation.
#include <cstdlib>
#include <functional>
#include <memory>
#include <new>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"

// AddressSanitizer brings its own operator new and reports a replacement mixed with it.
#if defined(__SANITIZE_ADDRESS__)
#define ZELTO_COUNT_ALLOCATIONS 0
#else
#define ZELTO_COUNT_ALLOCATIONS 1
#endif

static thread_local long tAllocations = 0;

// Every replacement stays out of line: once inlined next to each other, malloc and free draw
// false mismatched-allocation warnings. The array forms need no replacement: the standard
// library's own forward to these.
#if ZELTO_COUNT_ALLOCATIONS
[[gnu::noinline]] void* operator new(std::size_t size) {
    ++tAllocations;
    if (void* block = std::malloc(size ? size : 1)) return block;
    throw std::bad_alloc();
}
[[gnu::noinline]] void* operator new(std::size_t size, std::align_val_t alignment) {
    ++tAllocations;
    const auto align = static_cast<std::size_t>(alignment);
    if (void* block = std::aligned_alloc(align, (size + align - 1) / align * align)) return block;
    throw std::bad_alloc();
}
[[gnu::noinline]] void operator delete(void* block) noexcept { std::free(block); }
[[gnu::noinline]] void operator delete(void* block, std::size_t) noexcept { std::free(block); }
[[gnu::noinline]] void operator delete(void* block, std::align_val_t) noexcept { std::free(block); }
[[gnu::noinline]] void operator delete(void* block, std::size_t, std::align_val_t) noexcept { std::free(block); }
#endif

namespace ZeltoTouch {
namespace {

constexpr uint64_t kServiceFrameLimit = 4350;

// Idle stretches, taps, a hold, a slide, a brush and a palm: frames that rest, touch and hold.
constexpr const char* kSessionCycle = R"(
idle 400ms
tap play-pause 120ms
idle 300ms
hold volume-up 1500ms
idle 300ms
slide volume-down volume-up 600ms
idle 300ms
brush play-pause 400ms
palm 500ms
)";

TEST(ReportPathAllocations, NoneForReportsWithoutEventsOnceWarm) {
    if (!ZELTO_COUNT_ALLOCATIONS) GTEST_SKIP() << "allocations are not counted under AddressSanitizer";
    std::string script;
    for (int i = 0; i < 40; ++i) script += kSessionCycle;
    const auto reports = Platform::SensorReportGenerator(Platform::GestureScriptParser::parse(script)).generateAll();

    // The service's arrangement: the recording in front of the pipeline, and a probe that sees
    // which reports produce events.
    auto pipeline = std::make_shared<Pipeline>();
    bool producedEvents = false;
    pipeline->hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
        [&producedEvents](uint64_t, const HIDEventList&) { producedEvents = true; });
    PipelineRecording recording;
    recording.setMaxFrameCount(kServiceFrameLimit);
    recording.pipeline = pipeline;

    // Warm-up: the list grows to twice the limit and is trimmed once, so every pool and buffer
    // on the path has reached its working size.
    const size_t warmUp = 2 * kServiceFrameLimit + 500;
    ASSERT_GT(reports.size(), warmUp + 3000);
    size_t measured = 0, eventless = 0;
    for (size_t i = 0; i < reports.size(); ++i) {
        const std::vector<uint8_t>& bytes = reports[i].bytes;
        producedEvents = false;
        const long before = tAllocations;
        recording.handleInputReport(uint64_t{reports[i].scriptTimeMs} * 1000000, bytes.data(), bytes.size());
        const long allocations = tAllocations - before;
        if (i < warmUp) continue;
        ++measured;
        if (producedEvents) continue;
        ++eventless;
        ASSERT_EQ(allocations, 0) << "report " << i;  // one report tells the story
    }
    EXPECT_GT(tAllocations, 0);  // the counter sees this thread's allocations
    EXPECT_GT(eventless, 3000u);
    EXPECT_LT(eventless, measured);  // the session did produce events along the way
    // The measured stretch spans trims: the list never holds more than twice the limit.
    EXPECT_LE(recording.frames().size(), 2 * kServiceFrameLimit);
}

}  // namespace
}  // namespace ZeltoTouch

// Cost of one touch algorithm frame, as the input report thread pays it per image report.
#include <benchmark/benchmark.h>

#include <vector>

#include "Bench/SessionReports.h"
#include "Shared/Algs/Algs.h"

namespace ZeltoTouch {
namespace {

constexpr uint32_t kFramePeriodMs = 8;

InputReport::Image frameWithContact(uint32_t frameNumber, int16_t contact) {
    InputReport::Image image;
    image.frameNumber = frameNumber;
    image.timestampMs = frameNumber * kFramePeriodMs;
    // A finger on B with some spill onto its neighbours A and E.
    image.signedPixels[1] = contact;
    image.signedPixels[0] = static_cast<int16_t>(contact / 3);
    image.signedPixels[4] = static_cast<int16_t>(contact / 4);
    return image;
}

// One cycle of a realistic session: idle frames with a little noise, a touch that starts,
// is held past the hold time (may-begin, hold start, hold frames) and is released.
std::vector<InputReport::Image> realisticCycle() {
    std::vector<InputReport::Image> frames;
    uint32_t frameNumber = 0;
    for (int i = 0; i < 40; ++i) frames.push_back(frameWithContact(frameNumber++, 10));
    for (int i = 0; i < 100; ++i) frames.push_back(frameWithContact(frameNumber++, 400));
    for (int i = 0; i < 20; ++i) frames.push_back(frameWithContact(frameNumber++, 0));
    return frames;
}

void runFrames(benchmark::State& state, const std::vector<InputReport::Image>& frames) {
    Algs algs;
    size_t next = 0;
    uint32_t timeOffset = 0;
    for (auto _ : state) {
        InputReport::Image image = frames[next];
        image.timestampMs += timeOffset;
        benchmark::DoNotOptimize(algs.handleImage(image));
        if (++next == frames.size()) {
            next = 0;
            // keep the clock running forward
            timeOffset += frames.back().timestampMs - frames.front().timestampMs + kFramePeriodMs;
        }
    }
    state.SetItemsProcessed(state.iterations());
}

void BM_AlgsFrame_RealisticMix(benchmark::State& state) { runFrames(state, realisticCycle()); }

void BM_AlgsFrame_Idle(benchmark::State& state) { runFrames(state, {frameWithContact(0, 10)}); }

// Every frame touched and gated into the classifier, no event after the first.
void BM_AlgsFrame_Touching(benchmark::State& state) {
    std::vector<InputReport::Image> frames;
    for (uint32_t n = 0; n < 50; ++n) frames.push_back(frameWithContact(n, 400));
    runFrames(state, frames);
}

// The simulated sensor's session, the input of the report-through-recording benchmark: noisy
// frames with taps, holds, slides, a brush and a palm over several regions.
void BM_AlgsFrame_SensorSession(benchmark::State& state) {
    std::vector<InputReport::Image> frames;
    for (const Platform::SimulatedReport& report : Bench::sessionReports(20)) {
        if (auto image = InputReport::Image::parse(report.bytes.data(), report.bytes.size())) frames.push_back(*image);
    }
    runFrames(state, frames);
}

BENCHMARK(BM_AlgsFrame_RealisticMix)->Repetitions(9)->ReportAggregatesOnly(true);
BENCHMARK(BM_AlgsFrame_Idle)->Repetitions(9)->ReportAggregatesOnly(true);
BENCHMARK(BM_AlgsFrame_Touching)->Repetitions(9)->ReportAggregatesOnly(true);
BENCHMARK(BM_AlgsFrame_SensorSession)->Repetitions(9)->ReportAggregatesOnly(true);

}  // namespace
}  // namespace ZeltoTouch

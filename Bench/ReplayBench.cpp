// A one-hour recording replayed as fast as the pipeline takes it, the way `replay --fast` plays.
#include <cstdint>
#include <memory>
#include <vector>

#include <benchmark/benchmark.h>

#include "Bench/SessionReports.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/HostClock.h"

namespace ZeltoTouch {
namespace {

constexpr uint64_t kOneHourOfFrames = 360000;  // 100 Hz

// Playback's waits are skipped: only the work of delivering frames is timed.
class NoSleepClock final : public Util::HostClock {
public:
    Util::Timebase timebase() const noexcept override { return {1, 1}; }
    uint64_t machTimeNow() const noexcept override { return 0; }
    void sleepMicroseconds(uint64_t) const noexcept override {}
};

PipelineRecording oneHourRecording() {
    const std::vector<Platform::SimulatedReport> cycle = Bench::sessionReports(20);
    PipelineRecording recording;
    // Frame numbers and times keep counting across repeats of the cycle, as one session's do.
    for (uint64_t i = 0; i < kOneHourOfFrames; ++i) {
        std::vector<uint8_t> bytes = cycle[i % cycle.size()].bytes;
        const auto frameNumber = static_cast<uint32_t>(i);
        const auto timeMs = static_cast<uint32_t>(i * 10);
        for (int b = 0; b < 4; ++b) {
            bytes[1 + b] = static_cast<uint8_t>(frameNumber >> (8 * b));
            bytes[5 + b] = static_cast<uint8_t>(timeMs >> (8 * b));
        }
        recording.appendFrame({PipelineRecording::Frame::Type::InputReport, timeMs * Bench::kNanosecondsPerMillisecond,
                               {}, {}, ReportBytes(bytes)});
    }
    return recording;
}

void BM_ReplayOneHourRecording_360000Frames_Fast(benchmark::State& state) {
    PipelineRecording recording = oneHourRecording();
    const NoSleepClock clock;
    const Util::HostClock& previousClock = Util::hostClock();
    Util::setHostClock(&clock);
    uint64_t events = 0;
    for (auto _ : state) {
        auto pipeline = std::make_shared<Pipeline>();
        pipeline->hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
            [&events](uint64_t, const HIDEventList& list) { events += list.size(); });
        recording.pipeline = pipeline;
        recording.playReset();
        while (recording.playCanContinue()) recording.playNextFrame(1.0f);
    }
    Util::setHostClock(&previousClock);
    state.SetItemsProcessed(state.iterations() * static_cast<int64_t>(recording.frames().size()));
    state.counters["events_per_replay"] = static_cast<double>(events) / static_cast<double>(state.iterations());
}
BENCHMARK(BM_ReplayOneHourRecording_360000Frames_Fast)->Unit(benchmark::kMillisecond)->Repetitions(3)->ReportAggregatesOnly(true);

}  // namespace
}  // namespace ZeltoTouch

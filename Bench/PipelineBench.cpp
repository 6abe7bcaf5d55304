// One input report as the report thread pays for it: recorded, parsed, run through the touch
// algorithm; and what the recording costs in memory.
#include <malloc.h>

#include <cstdint>
#include <memory>
#include <vector>

#include <benchmark/benchmark.h>

#include "Bench/SessionReports.h"
#include "Host/PropertyValue.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"

namespace ZeltoTouch {
namespace {

constexpr uint64_t kServiceFrameLimit = 4350;

// Reports of a realistic session (idle, touching and holding frames) into the service's
// arrangement: the recording with its frame limit in front of the pipeline. Amortised over
// the trims the limit causes.
void BM_ReportThroughRecordingAndPipeline_RealisticMix(benchmark::State& state) {
    const std::vector<Platform::SimulatedReport> reports = Bench::sessionReports(20);
    PipelineRecording recording;
    recording.setMaxFrameCount(kServiceFrameLimit);
    recording.pipeline = std::make_shared<Pipeline>();
    size_t next = 0;
    uint64_t timeOffsetMs = 0;
    for (auto _ : state) {
        const Platform::SimulatedReport& report = reports[next];
        const uint64_t timeNs = (timeOffsetMs + report.scriptTimeMs) * Bench::kNanosecondsPerMillisecond;
        recording.handleInputReport(timeNs, report.bytes.data(), report.bytes.size());
        if (++next == reports.size()) {
            next = 0;
            timeOffsetMs += reports.back().scriptTimeMs + 10;  // keep time running forward
        }
    }
    state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_ReportThroughRecordingAndPipeline_RealisticMix)->Repetitions(9)->ReportAggregatesOnly(true);

size_t heapBytesInUse() { return mallinfo2().uordblks; }

PropertyValue accelerometerSample(uint32_t i) {
    return PropertyValue::dictionary({{"X", PropertyValue::fromFloat(0.01f * float(i % 97))},
                                      {"Y", PropertyValue::fromFloat(-0.5f + float(i % 13) / 7.0f)},
                                      {"Z", PropertyValue::fromFloat(-0.98f)}});
}

// Heap held by the recording, from the allocator's own count (the timing is meaningless here).
// bytes_per_report_frame: one recorded image report. full_recording_heap_MB: the service's
// recording at its largest, just before a trim: twice the limit of image reports and
// accelerometer samples, plus a state write every 44 reports.
void BM_RecordingMemory_BytesPerReportFrame_FullRecordingHeap(benchmark::State& state) {
    const std::vector<Platform::SimulatedReport> reports = Bench::sessionReports(20);
    double bytesPerReportFrame = 0, fullRecordingMB = 0;
    for (auto _ : state) {
        {
            const size_t before = heapBytesInUse();
            PipelineRecording recording;
            const uint32_t frames = 2 * kServiceFrameLimit;
            for (uint32_t i = 0; i < frames; ++i) {
                const auto& bytes = reports[i % reports.size()].bytes;
                recording.handleInputReport(i, bytes.data(), bytes.size());
            }
            bytesPerReportFrame = double(heapBytesInUse() - before) / frames;
        }
        {
            const size_t before = heapBytesInUse();
            PipelineRecording recording;
            recording.setMaxFrameCount(kServiceFrameLimit);
            for (uint32_t i = 0; recording.frames().size() + 2 < 2 * kServiceFrameLimit; ++i) {
                const auto& bytes = reports[i % reports.size()].bytes;
                recording.handleInputReport(3 * i, bytes.data(), bytes.size());
                recording.handleMetadata(3 * i + 1, "Accel", accelerometerSample(i));
                if (i % 44 == 0) recording.setState(3 * i + 2, "Algs.HoldTime", PropertyValue::fromUInt64(i));
            }
            fullRecordingMB = double(heapBytesInUse() - before) / 1e6;
        }
    }
    state.counters["bytes_per_report_frame"] = bytesPerReportFrame;
    state.counters["full_recording_heap_MB"] = fullRecordingMB;
}
BENCHMARK(BM_RecordingMemory_BytesPerReportFrame_FullRecordingHeap)->Iterations(1)->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace ZeltoTouch

// Recording on the report path, and the container a full recording makes.
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include <benchmark/benchmark.h>

#include "Host/PropertyValue.h"
#include "Shared/Pipeline/PipelineInput.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Hex.h"

namespace ZeltoTouch {
namespace {

constexpr uint64_t kFrameLimit = 4350;
constexpr uint64_t kFramePeriodNs = 10000000;  // 100 Hz

class NoOpStage final : public PipelineInput {
public:
    void setState(uint64_t, const std::string&, const PropertyValue&) override {}
    void handleInputReport(uint64_t, const uint8_t* bytes, uint64_t) override { benchmark::DoNotOptimize(bytes); }
    void handleMetadata(uint64_t, const std::string&, const PropertyValue&) override {}
};

std::vector<uint8_t> imageReport(uint32_t frameNumber) {
    std::vector<uint8_t> report(73);
    report[0] = 1;
    for (size_t i = 1; i < report.size(); ++i) report[i] = static_cast<uint8_t>(frameNumber * 31 + i * 7);
    return report;
}

// Amortised over the trims that the limit causes.
void BM_RecordImageReport_RecordingOnly(benchmark::State& state) {
    PipelineRecording recording;
    recording.setMaxFrameCount(kFrameLimit);
    recording.pipeline = std::make_shared<NoOpStage>();
    const std::vector<uint8_t> report = imageReport(1);
    uint64_t time = 0;
    for (auto _ : state) recording.handleInputReport(time += 240000, report.data(), report.size());
    state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_RecordImageReport_RecordingOnly)->Repetitions(5)->ReportAggregatesOnly(true);

// What the service keeps: a full window of image reports, as many accelerometer samples, and
// some state writes.
PipelineRecording fullRecording() {
    PipelineRecording recording;
    for (uint32_t i = 0; i < kFrameLimit; ++i) {
        const uint64_t time = i * kFramePeriodNs;
        const std::vector<uint8_t> report = imageReport(i);
        recording.appendFrame({PipelineRecording::Frame::Type::InputReport, time, {}, {}, ReportBytes(report)});
        const PropertyValue sample = PropertyValue::dictionary({{"X", PropertyValue::fromFloat(0.01f * float(i % 97))},
                                                                {"Y", PropertyValue::fromFloat(-0.5f + float(i % 13) / 7.0f)},
                                                                {"Z", PropertyValue::fromFloat(-0.98f)}});
        recording.appendFrame({PipelineRecording::Frame::Type::Metadata, time + 1, "Accel", sample, {}});
        if (i % 44 == 0)
            recording.appendFrame({PipelineRecording::Frame::Type::State, time + 2, "Algs.ActivationThreshold",
                                   PropertyValue::fromFloat(float(i)), {}});
    }
    return recording;
}

void BM_ContainerWrite_FullRecording_8799Frames(benchmark::State& state) {
    PipelineRecording recording = fullRecording();
    size_t bytes = 0;
    for (auto _ : state) {
        const PropertyValue data = recording.json();
        bytes = data.bytes().size();
        benchmark::DoNotOptimize(data);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * bytes));
    state.counters["frames"] = static_cast<double>(recording.frames().size());
}
BENCHMARK(BM_ContainerWrite_FullRecording_8799Frames)
    ->Unit(benchmark::kMillisecond)
    ->Repetitions(5)
    ->ReportAggregatesOnly(true);

void BM_ContainerRead_FullRecording_8799Frames(benchmark::State& state) {
    PipelineRecording source = fullRecording();
    const PropertyValue data = source.json();
    for (auto _ : state) {
        PipelineRecording read(data);
        benchmark::DoNotOptimize(read.frames().size());
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * data.bytes().size()));
}
BENCHMARK(BM_ContainerRead_FullRecording_8799Frames)
    ->Unit(benchmark::kMillisecond)
    ->Repetitions(5)
    ->ReportAggregatesOnly(true);

// The JSON parse alone, to tell the reader's own share from the parser's.
void BM_ContainerParseOnly_FullRecording_8799Frames(benchmark::State& state) {
    PipelineRecording source = fullRecording();
    const PropertyValue data = source.json();
    for (auto _ : state) benchmark::DoNotOptimize(PropertyValue::fromJSON(data));
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * data.bytes().size()));
}
BENCHMARK(BM_ContainerParseOnly_FullRecording_8799Frames)
    ->Unit(benchmark::kMillisecond)
    ->Repetitions(5)
    ->ReportAggregatesOnly(true);

// The hex text of a full recording's reports (4350 reports of 73 bytes); bytes/s count text.
std::vector<uint8_t> fullRecordingReportBytes() {
    std::vector<uint8_t> all;
    for (uint32_t i = 0; i < kFrameLimit; ++i) {
        const std::vector<uint8_t> report = imageReport(i);
        all.insert(all.end(), report.begin(), report.end());
    }
    return all;
}

void BM_HexEncode_FullRecordingReports(benchmark::State& state) {
    const std::vector<uint8_t> bytes = fullRecordingReportBytes();
    std::string text;
    for (auto _ : state) {
        text.clear();
        Util::appendHexText(text, bytes);
        benchmark::DoNotOptimize(text.data());
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * text.size()));
}
BENCHMARK(BM_HexEncode_FullRecordingReports)
    ->Unit(benchmark::kMicrosecond)
    ->Repetitions(5)
    ->ReportAggregatesOnly(true);

void BM_HexDecode_FullRecordingReports(benchmark::State& state) {
    std::string text;
    Util::appendHexText(text, fullRecordingReportBytes());
    std::vector<uint8_t> read;
    for (auto _ : state) {
        read.clear();
        Util::appendBytesFromHexText(text, read);
        benchmark::DoNotOptimize(read.data());
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * text.size()));
}
BENCHMARK(BM_HexDecode_FullRecordingReports)
    ->Unit(benchmark::kMicrosecond)
    ->Repetitions(5)
    ->ReportAggregatesOnly(true);

}  // namespace
}  // namespace ZeltoTouch

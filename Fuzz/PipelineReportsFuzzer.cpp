// Arbitrary input reports, tunable writes, reads and metadata into a recording stage in front
// of a Pipeline. Beyond surviving, the run must replay: the recording, written as a container
// and read back, must drive a fresh Pipeline into exactly the events the live one produced.

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string_view>
#include <vector>

#include <fuzzer/FuzzedDataProvider.h>

#include "Fuzz/EventTrace.h"
#include "Fuzz/FuzzedValues.h"
#include "Host/UTF8.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Log.h"

using namespace ZeltoTouch;

namespace {

// Formats every line it is asked to (so the diagnostic descriptions run on hostile state) and
// keeps none of them.
class DiscardingLogSink final : public LogSink {
public:
    bool enabled = false;
    bool isEnabled(std::string_view, LogLevel) const noexcept override { return enabled; }
    void write(std::string_view, LogLevel, std::string_view) override {}
};

DiscardingLogSink& logSink() {
    static DiscardingLogSink sink;
    return sink;
}

[[noreturn]] void fail(const char* what) {
    fprintf(stderr, "invariant broken: %s\n", what);
    abort();
}

// A pipeline whose events are traced, and which checks that each event carries its report's time.
std::shared_ptr<Pipeline> tracingPipeline(Fuzz::EventTrace& trace) {
    auto pipeline = std::make_shared<Pipeline>();
    pipeline->hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
        [&trace](uint64_t timestamp, const HIDEventList& events) {
            if (events.empty()) fail("empty event list handed out");
            for (const HIDEventRef& event : events) {
                if (event->timestamp() != timestamp) fail("event not stamped with its report's time");
                trace.push_back(Fuzz::EventTraceEntry::of(*event));
            }
        });
    return pipeline;
}

// Image reports that mostly look like a sensor's (consecutive frames, small time steps), so the
// algorithm gets past its early exits; sometimes with a jump, an odd length or extra bytes.
class ReportMaker {
public:
    explicit ReportMaker(FuzzedDataProvider& input)
        : _input(input), _frameNumber(input.ConsumeIntegral<uint32_t>()), _timeMs(input.ConsumeIntegral<uint32_t>()) {}

    std::vector<uint8_t> image() {
        std::vector<uint8_t> report(InputReport::Image::kLength);
        report[0] = InputReport::Image::kReportID;
        _frameNumber = _input.ConsumeProbability<float>() < 0.9f ? _frameNumber + 1 : _input.ConsumeIntegral<uint32_t>();
        _timeMs += _input.ConsumeProbability<float>() < 0.9f ? _input.ConsumeIntegralInRange<uint32_t>(0, 40)
                                                               : _input.ConsumeIntegral<uint32_t>();
        put32(report, 1, _frameNumber);
        put32(report, 5, _timeMs);
        for (size_t pixel = 0; pixel < kPixelCount; ++pixel) {
            const auto delta = static_cast<int16_t>(_input.ConsumeIntegralInRange<int>(-300, 1500));
            const auto signedValue = _input.ConsumeProbability<float>() < 0.95f ? delta : _input.ConsumeIntegral<int16_t>();
            put16(report, 13 + 2 * pixel, static_cast<uint16_t>(12000 + signedValue));
            put16(report, 43 + 2 * pixel, static_cast<uint16_t>(signedValue));
        }
        if (_input.ConsumeProbability<float>() < 0.05f) report.resize(_input.ConsumeIntegralInRange<size_t>(0, 600));
        return report;
    }

    std::vector<uint8_t> firmwareEvent() {
        std::vector<uint8_t> report(InputReport::FirmwareEvent::kLength);
        report[0] = InputReport::FirmwareEvent::kReportID;
        report[1] = _input.ConsumeBool() ? InputReport::FirmwareEvent::kReset : _input.ConsumeIntegral<uint8_t>();
        return report;
    }

    std::vector<uint8_t> anything() { return _input.ConsumeBytes<uint8_t>(_input.ConsumeIntegralInRange<size_t>(0, 600)); }

private:
    static void put16(std::vector<uint8_t>& r, size_t at, uint16_t v) {
        r[at] = static_cast<uint8_t>(v);
        r[at + 1] = static_cast<uint8_t>(v >> 8);
    }
    static void put32(std::vector<uint8_t>& r, size_t at, uint32_t v) {
        put16(r, at, static_cast<uint16_t>(v));
        put16(r, at + 2, static_cast<uint16_t>(v >> 16));
    }

    FuzzedDataProvider& _input;
    uint32_t _frameNumber;
    uint32_t _timeMs;
};

// Replays a recording's frames, as written and read back, into a fresh traced pipeline.
Fuzz::EventTrace replay(PipelineRecording recording) {
    const PropertyValue container = recording.json();
    if (!container) fail("a recording of pipeline calls could not be written");
    const PipelineRecording reread(container);
    if (reread.frames().size() != recording.frames().size()) fail("container lost frames");
    Fuzz::EventTrace trace;
    auto pipeline = tracingPipeline(trace);
    for (const PipelineRecording::Frame& frame : reread.frames()) {
        switch (frame.type) {
            case PipelineRecording::Frame::Type::State: pipeline->setState(frame.timestamp, frame.key, frame.value); break;
            case PipelineRecording::Frame::Type::InputReport:
                pipeline->handleInputReport(frame.timestamp, frame.data.data(), frame.data.size());
                break;
            case PipelineRecording::Frame::Type::Metadata: pipeline->handleMetadata(frame.timestamp, frame.key, frame.value); break;
        }
    }
    return trace;
}

// Trimming to any limit keeps at most that many report and metadata frames.
void checkTrim(const PipelineRecording& recording, uint64_t limit) {
    PipelineRecording::FrameList frames = recording.frames();
    PipelineRecording::trimFrames(frames, limit);
    uint64_t kept = 0;
    for (const PipelineRecording::Frame& frame : frames) kept += frame.type != PipelineRecording::Frame::Type::State;
    if (kept > limit) fail("trimming kept more frames than its limit");
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    Log::setSink(&logSink());
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    FuzzedDataProvider input(data, size);
    Fuzz::FuzzedValues values(input);
    // Rarely, since formatting every debug line costs more than the rest of the run; a byte
    // value that padding and short inputs do not produce.
    logSink().enabled = input.ConsumeIntegral<uint8_t>() == 0xA5;

    Fuzz::EventTrace live;
    auto pipeline = tracingPipeline(live);
    PipelineRecording recording;
    recording.pipeline = pipeline;
    ReportMaker reports(input);

    // Mach time as the service takes it: it never runs backwards, so the writer's sort keeps
    // the recorded order and the replay sees the calls as the pipeline did.
    uint64_t now = input.ConsumeIntegral<uint32_t>();
    while (input.remaining_bytes() > 0) {
        now += input.ConsumeIntegralInRange<uint64_t>(0, 20'000'000);
        std::vector<uint8_t> report;
        switch (input.ConsumeIntegralInRange<int>(0, 9)) {
            case 0: recording.setState(now, "Algs." + values.algsKey(), values.value()); continue;
            case 1: recording.setState(now, values.text(), values.value()); continue;
            case 2: pipeline->getState(input.ConsumeBool() ? "Algs." + values.algsKey() : values.text()).description(); continue;
            case 3: recording.handleMetadata(now, values.text(), values.value()); continue;
            case 4: report = reports.firmwareEvent(); break;
            case 5: report = reports.anything(); break;
            default: report = reports.image(); break;
        }
        recording.handleInputReport(now, report.data(), report.size());
    }

    // Data values and text that is not UTF-8 cannot go into JSON; without them the container
    // must carry the whole run.
    bool representable = true;
    for (const PipelineRecording::Frame& frame : recording.frames()) {
        if (!isValidUTF8(frame.key) || (frame.value && !frame.value.toJSON())) representable = false;
    }
    if (representable && replay(recording) != live) fail("replay of the recording differs from the live run");
    checkTrim(recording, input.ConsumeIntegralInRange<uint64_t>(0, 64));
    return 0;
}

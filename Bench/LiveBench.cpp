// The live path of the plug-in: a device delivers input reports on the input report thread,
// they pass the recording and the pipeline under the service's lock, and the events reach the
// host's callback on its queue. Also: how long the "Recording" property holds that lock.

#include <benchmark/benchmark.h>

#include <malloc.h>

#include <algorithm>
#include <cstring>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "Platform/DeviceRegistry.h"
#include "Platform/DispatchQueue.h"
#include "Platform/GestureScript.h"
#include "Platform/HIDDevice.h"
#include "Platform/MonotonicClock.h"
#include "Platform/RunLoop.h"
#include "Platform/Semaphore.h"
#include "Platform/SensorReportGenerator.h"
#include "Platform/StderrLogSink.h"
#include "Service/ZeltoTouchHIDService.h"
#include "Shared/Pipeline/InputReport.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/HostClock.h"

namespace ZeltoTouch {
namespace {

using Bytes = std::vector<uint8_t>;

// Delivers each report on the device's run loop and waits until the service has handled it.
class BenchDevice final : public Platform::HIDDevice {
public:
    ZeltoReturn open(uint32_t) override { return kZeltoSuccess; }
    void close(uint32_t) override {}
    ZeltoReturn getReport(Platform::HIDReportType, uint32_t, uint8_t*, uint64_t&) override { return kZeltoUnsupported; }
    PropertyValue copyProperty(std::string_view) const override { return {}; }
    bool setProperty(std::string_view, const PropertyValue&) override { return false; }
    void registerInputReportCallback(uint8_t* buffer, uint64_t, Platform::HIDInputReportCallback callback,
                                     void* context) override {
        std::lock_guard lock(_lock);
        _buffer = buffer;
        _callback = callback;
        _context = context;
    }
    void scheduleWithRunLoop(const std::shared_ptr<Platform::RunLoop>& runLoop, const std::string& mode) override {
        std::lock_guard lock(_lock);
        _runLoop = runLoop;
        _mode = mode;
    }
    void unscheduleFromRunLoop(const std::shared_ptr<Platform::RunLoop>&, const std::string&) override {
        std::lock_guard lock(_lock);
        _runLoop = nullptr;
    }

    bool ready() {
        std::lock_guard lock(_lock);
        return _runLoop && _callback;
    }
    void deliver(const Bytes& report) {
        std::shared_ptr<Platform::RunLoop> runLoop;
        std::string mode;
        {
            std::lock_guard lock(_lock);
            runLoop = _runLoop;
            mode = _mode;
        }
        Platform::Semaphore handled;
        runLoop->perform(mode, [&] {
            std::memcpy(_buffer, report.data(), report.size());
            _callback(_context, kZeltoSuccess, this, Platform::kHIDReportTypeInput, report[0], _buffer, report.size(),
                      Util::hostClock().machTimeNow());
            handled.signal();
        });
        handled.wait();
    }

private:
    std::mutex _lock;
    uint8_t* _buffer = nullptr;
    Platform::HIDInputReportCallback _callback = nullptr;
    void* _context = nullptr;
    std::shared_ptr<Platform::RunLoop> _runLoop;
    std::string _mode;
};

// Sixty seconds of taps, holds and slides on every region.
std::vector<Bytes> sessionReports() {
    std::string script;
    for (int round = 0; round < 12; ++round) {
        script +=
            "tap volume-up 120ms\nidle 400ms\ntap play-pause 120ms\nidle 400ms\n"
            "hold volume-down 1200ms\nidle 400ms\nslide play-pause volume-up 1800ms\nidle 560ms\n";
    }
    Platform::SensorReportGenerator generator(Platform::GestureScriptParser::parse(script));
    std::vector<Bytes> reports;
    for (auto& report : generator.generateAll()) reports.push_back(std::move(report.bytes));
    return reports;
}

struct ServiceRelease {
    void operator()(ZeltoHIDService* service) const noexcept { service->release(); }
};

// A service scheduled on a host queue, fed by a BenchDevice.
class LiveService {
public:
    using Callback = ZeltoHIDEventCallback;

    LiveService(Callback callback, void* target) {
        // Errors only: the service's per-frame lines would measure the terminal.
        static Platform::StderrLogSink quietLog(Platform::LogThreshold::Error);
        Log::setSink(&quietLog);
        Platform::installMonotonicClock();
        _service->startWithService(_registration.handle(), PropertyValue());
        _service->openWithOptions(0);
        _service->setEventCallback(callback, target, nullptr);
        _service->scheduleWithDispatchQueue(_queue);
        while (!_device->ready()) std::this_thread::yield();
    }
    ~LiveService() {
        _service->unscheduleWithDispatchQueue(_queue);
        _queue->barrier();
    }

    BenchDevice& device() { return *_device; }
    ZeltoTouchHIDService& service() { return *_service; }
    Platform::DispatchQueue& queue() { return *_queue; }

private:
    std::shared_ptr<BenchDevice> _device = std::make_shared<BenchDevice>();
    Platform::ScopedDeviceService _registration{[device = _device] { return device; }};
    std::unique_ptr<ZeltoTouchHIDService, ServiceRelease> _service{ZeltoTouchHIDService::create()};
    std::shared_ptr<Platform::DispatchQueue> _queue = Platform::DispatchQueue::create("bench host queue");
};

// Callback times of the digitizer events, by the frame number they carry.
struct Arrivals {
    static void callback(void* target, void*, void*, HIDEvent* event, uint32_t) {
        auto& arrivals = *static_cast<Arrivals*>(target);
        if (event->type() != kHIDEventTypeDigitizer) return;
        arrivals.byFrame.emplace_back(event->integerValue(kHIDEventFieldDigitizerFrameNumber),
                                      Util::hostClock().machTimeNow());
    }
    std::vector<std::pair<int64_t, uint64_t>> byFrame;  // the host queue only, read after a barrier
};

double percentile(std::vector<double>& sorted, double fraction) {
    if (sorted.empty()) return 0;
    const auto rank = static_cast<size_t>(fraction * static_cast<double>(sorted.size()));
    const size_t index = std::min(sorted.size() - 1, rank);
    return sorted[index];
}

// Each iteration delivers one report; latency runs from the moment the report is handed to the
// device's run loop to the host callback of each event it produced.
void BM_LiveReportToCallback(benchmark::State& state) {
    const std::vector<Bytes> reports = sessionReports();
    Arrivals arrivals;
    std::map<int64_t, uint64_t> deliveredAt;  // frame number → mach time the report was handed over
    {
        LiveService live(Arrivals::callback, &arrivals);
        size_t next = 0;
        for (auto _ : state) {
            const Bytes& report = reports[next++ % reports.size()];
            deliveredAt[InputReport::Image::parse(report.data(), report.size())->frameNumber] =
                Util::hostClock().machTimeNow();
            live.device().deliver(report);
        }
        live.queue().barrier();
    }
    std::vector<double> latenciesUs;
    for (const auto& [frame, arrival] : arrivals.byFrame) {
        if (auto sent = deliveredAt.find(frame); sent != deliveredAt.end() && arrival >= sent->second) {
            latenciesUs.push_back(static_cast<double>(arrival - sent->second) / 1000.0);  // mach time is ns here
        }
    }
    std::sort(latenciesUs.begin(), latenciesUs.end());
    state.counters["events"] = static_cast<double>(latenciesUs.size());
    state.counters["p50_us"] = percentile(latenciesUs, 0.50);
    state.counters["p99_us"] = percentile(latenciesUs, 0.99);
    state.counters["max_us"] = latenciesUs.empty() ? 0 : latenciesUs.back();
}
BENCHMARK(BM_LiveReportToCallback)->Iterations(6000)->Unit(benchmark::kMicrosecond)->UseRealTime();

// A recording at its fullest: twice the frame limit, the moment before trimming.
PipelineRecording fullRecording() {
    PipelineRecording recording;
    recording.setMaxFrameCount(ZeltoTouchHIDService::kMaxRecordedFrames);
    const std::vector<Bytes> reports = sessionReports();
    uint64_t now = 1;
    for (size_t i = 0; i + 1 < 2 * ZeltoTouchHIDService::kMaxRecordedFrames; ++i) {
        const Bytes& report = reports[i % reports.size()];
        recording.handleInputReport(now += 10'000'000, report.data(), report.size());
    }
    return recording;
}

// How long the "Recording" property holds the pipeline lock: it makes room for the copy
// first, then copies the recording under the lock. Serialising and freeing the copy happen
// outside the lock and are not timed.
void BM_RecordingCopyUnderLock(benchmark::State& state) {
    const PipelineRecording recording = fullRecording();
    std::mutex pipelineLock;
    for (auto _ : state) {
        state.PauseTiming();
        std::optional<PipelineRecording> copy(std::in_place);
        copy->reserveFrames(recording.frames().size() + ZeltoTouchHIDService::kFramesArrivingDuringRecordingRead);
        state.ResumeTiming();
        std::unique_lock lock(pipelineLock);
        *copy = recording;
        lock.unlock();
        state.PauseTiming();
        benchmark::DoNotOptimize(copy->json());
        copy.reset();
        malloc_trim(0);  // the next read starts from pages fresh from the system
        state.ResumeTiming();
    }
    state.counters["frames"] = static_cast<double>(recording.frames().size());
}
BENCHMARK(BM_RecordingCopyUnderLock)->Unit(benchmark::kMicrosecond);

// The whole "Recording" property of a live service whose recording is full.
void BM_RecordingProperty(benchmark::State& state) {
    Arrivals arrivals;
    LiveService live(Arrivals::callback, &arrivals);
    const std::vector<Bytes> reports = sessionReports();
    for (size_t i = 0; i < 2 * ZeltoTouchHIDService::kMaxRecordedFrames; ++i) {
        live.device().deliver(reports[i % reports.size()]);
    }
    const PropertyValue key = PropertyValue::string("Recording");
    size_t bytes = 0;
    for (auto _ : state) bytes = live.service().getPropertyForKey(key).length();
    state.counters["json_bytes"] = static_cast<double>(bytes);
}
BENCHMARK(BM_RecordingProperty)->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace ZeltoTouch

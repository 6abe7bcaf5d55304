// Arbitrary keys and values into the property interface of a live service: the service is
// scheduled on a simulated sensor that plays gestures in real time, so every write races the
// input report thread. Beyond surviving: a Pipeline-domain write is accepted, a written
// parameter reads back as the documented conversion of what was written, and the recording
// always reads back as a container.

#include <atomic>
#include <chrono>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include <fuzzer/FuzzedDataProvider.h>

#include "Fuzz/FuzzedValues.h"
#include "Platform/DeviceRegistry.h"
#include "Platform/DispatchQueue.h"
#include "Platform/GestureScript.h"
#include "Platform/MonotonicClock.h"
#include "Platform/SimulatedSensor.h"
#include "Service/ZeltoTouchHIDService.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Log.h"

using namespace ZeltoTouch;

namespace {

[[noreturn]] void fail(const char* what, std::string_view key = {}) {
    fprintf(stderr, "invariant broken: %s %.*s\n", what, static_cast<int>(key.size()), key.data());
    abort();
}

// Formats every line of the property caller's thread (the service logs each property call
// with its value) and the errors of every thread, and keeps none. The report thread's debug
// lines would only slow the run down.
class DiscardingLogSink final : public LogSink {
public:
    bool isEnabled(std::string_view, LogLevel level) const noexcept override {
        return level != LogLevel::Debug || std::this_thread::get_id() == _caller;
    }
    void write(std::string_view, LogLevel, std::string_view) override {}

private:
    const std::thread::id _caller = std::this_thread::get_id();
};

// A service lives for tens of milliseconds and sees only the start of its script, so services
// take turns starting with each gesture, and the reset and the slide come early. Faster
// frames would not race the property calls more, only grow the recording that every
// "Recording" read serialises.
constexpr std::string_view kGestures[] = {
    "tap volume-up 120ms\n",
    "hold play-pause 700ms reset-after 10ms\n",
    "slide volume-down volume-up 40ms\n",
    "brush play-pause 250ms\n",
    "palm 300ms\n",
};
constexpr uint32_t kFramePeriodMs = 5;

const Platform::GestureScript& nextScript() {
    static const auto scripts = [] {
        std::vector<Platform::GestureScript> rotations;
        for (size_t first = 0; first < std::size(kGestures); ++first) {
            std::string text;
            for (size_t i = 0; i < std::size(kGestures); ++i) {
                text += kGestures[(first + i) % std::size(kGestures)];
                text += "idle 20ms\n";
            }
            rotations.push_back(Platform::GestureScriptParser::parse(text));
        }
        return rotations;
    }();
    static size_t services = 0;
    return scripts[services++ % scripts.size()];
}

std::atomic<uint64_t> deliveredEvents{0};

void countEvent(void*, void*, void*, HIDEvent*, uint32_t) { deliveredEvents.fetch_add(1, std::memory_order_relaxed); }

// A fresh service every so many inputs or once it is this old, whichever comes first: bounds
// what the device's property store and the recording accumulate (slow inputs would otherwise
// let report frames pile up and slow every read further), and runs the lifecycle again and
// again under load.
constexpr uint64_t kInputsPerService = 10;
constexpr auto kServiceLifetime = std::chrono::milliseconds(100);

// A service started, opened and scheduled on a fresh simulated sensor; torn down in the host's order.
class LiveService {
public:
    LiveService()
        : _device(std::make_shared<Platform::SimulatedSensor>(
              nextScript(), Platform::SensorReportGenerator::Options{kFramePeriodMs, 0, 0x5EED})),
          _registration([device = _device] { return device; }),
          _service(ZeltoTouchHIDService::create()),
          _queue(Platform::DispatchQueue::create("fuzz host queue")) {
        if (_service->startWithService(_registration.handle(), PropertyValue()) != kZeltoSuccess) fail("start");
        if (!_service->openWithOptions(0)) fail("open");
        _service->setEventCallback(countEvent, nullptr, nullptr);
        _service->scheduleWithDispatchQueue(_queue);
    }
    ~LiveService() {
        _service->unscheduleWithDispatchQueue(_queue);
        _queue->barrier();
        _service->closeWithOptions(0);
        _service->stop();
        _service->release();
    }
    LiveService(const LiveService&) = delete;
    LiveService& operator=(const LiveService&) = delete;

    ZeltoTouchHIDService& service() { return *_service; }
    // Counts this input; true once the service has served its share.
    bool spentAfterThisInput() {
        return ++_inputs >= kInputsPerService || std::chrono::steady_clock::now() - _started >= kServiceLifetime;
    }

private:
    std::shared_ptr<Platform::SimulatedSensor> _device;
    Platform::ScopedDeviceService _registration;
    ZeltoTouchHIDService* _service;
    std::shared_ptr<Platform::DispatchQueue> _queue;
    const std::chrono::steady_clock::time_point _started = std::chrono::steady_clock::now();
    uint64_t _inputs = 0;
};

std::unique_ptr<LiveService>& liveService() {
    static std::unique_ptr<LiveService> live;
    return live;
}

constexpr std::string_view kPipelineAlgs = "Pipeline.Algs.";
const std::string_view kServiceKeys[] = {
    "Version", "FirmwareDebugReports", "FactoryResetHoldDuration", "Recording", "ServicePluginDebug",
    "Pipeline", "Pipeline.DebugInfo", "Product", "SerialNumber", "pipeline.DebugInfo",
};

PropertyValue fuzzedKey(FuzzedDataProvider& input, Fuzz::FuzzedValues& values) {
    switch (input.ConsumeIntegralInRange<int>(0, 5)) {
        case 0:
        case 1: return PropertyValue::string(std::string(kPipelineAlgs) + values.algsKey());
        case 2: return PropertyValue::string("Pipeline." + values.text());
        case 3: return PropertyValue::string(input.PickValueInArray(kServiceKeys));
        case 4: return PropertyValue::string(values.text());
        default: return values.value();  // not a string at all, or no key
    }
}

bool sameFloat(float a, float b) { return (std::isnan(a) && std::isnan(b)) || a == b; }

// A written parameter reads back as the documented conversion of the value (non-numbers as 0).
void checkReadBack(ZeltoTouchHIDService& service, std::string_view key, const PropertyValue& value) {
    const std::string_view name = key.substr(kPipelineAlgs.size());
    const PropertyValue number = value.isNumber() ? value : PropertyValue::fromUInt64(0);
    const PropertyValue read = service.getPropertyForKey(PropertyValue::string(key));
    if (name == "HoldTimeoutMilliseconds") {
        if (read.toUInt64() != static_cast<uint32_t>(number.toUInt64())) fail("read back differs:", key);
    } else if (name == "ActivationThreshold") {
        if (!sameFloat(read.toFloat(), number.toFloat())) fail("read back differs:", key);
    } else if (name == "EnableHoldSuppression" || name == "EnableTapSuppression") {
        if (read.toBool() != number.toBool()) fail("read back differs:", key);
    }
}

void checkRecording(LiveService& live) {
    const PropertyValue text = live.service().getPropertyForKey(PropertyValue::string("Recording"));
    if (!text.isString()) fail("the recording is not readable");
    try {
        PipelineRecording reread(text);
    } catch (const std::exception& error) {
        fail("the recording does not read back:", error.what());
    }
}

void setAndCheck(LiveService& live, const PropertyValue& key, const PropertyValue& value) {
    const bool accepted = live.service().setProperty(value, key);
    if (!key.isString()) {
        if (accepted) fail("a write without a string key was accepted");
        return;
    }
    const std::string_view name = key.stringView();
    if (!name.starts_with("Pipeline.")) return;
    if (!accepted) fail("a Pipeline write was refused:", name);
    if (name.starts_with(kPipelineAlgs)) checkReadBack(live.service(), name, value);
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    static DiscardingLogSink sink;
    Log::setSink(&sink);
    Platform::installMonotonicClock();
    // Constructed before the live service, so destroyed after it when the process exits.
    Platform::DeviceRegistry::shared();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::unique_ptr<LiveService>& live = liveService();
    if (!live) live = std::make_unique<LiveService>();

    FuzzedDataProvider input(data, size);
    Fuzz::FuzzedValues values(input);
    while (input.remaining_bytes() > 0) {
        const PropertyValue key = fuzzedKey(input, values);
        if (input.ConsumeBool()) {
            setAndCheck(*live, key, values.value());
        } else if (key.stringView() == "Recording") {
            checkRecording(*live);
        } else {
            (void)live->service().getPropertyForKey(key).description();
        }
    }
    if (live->spentAfterThisInput()) live.reset();
    return 0;
}

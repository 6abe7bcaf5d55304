#pragma once

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <ostream>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "Host/HIDEvent.h"
#include "Platform/CaptureLogSink.h"
#include "Platform/DeviceRegistry.h"
#include "Platform/DispatchQueue.h"
#include "Platform/EventSystemService.h"
#include "Platform/GestureScript.h"
#include "Platform/MonotonicClock.h"
#include "Platform/Semaphore.h"
#include "Platform/SensorReportGenerator.h"
#include "Service/ZeltoTouchHIDService.h"
#include "Shared/Pipeline/Pipeline.h"

namespace ZeltoTouch {

// What the tests look at inside a service.
class ZeltoTouchHIDServiceInspector {
public:
    explicit ZeltoTouchHIDServiceInspector(ZeltoTouchHIDService& service) : _service(service) {}

    // How many of the pipeline's nine hooks are set.
    int installedProbeCount() const {
        std::lock_guard lock(_service._pipelineLock);
        const Pipeline& p = *_service._pipeline;
        return !!p.setStateProbe + !!p.inputReportProbe + !!p.metadataProbe + !!p.invalidInputReportProbe +
               !!p.firmwareEventProbe + !!p.imageProbe + !!p.disjointImageProbe + !!p.hidEventsProbe +
               !!p.getStateProbe;
    }
    AccelBookkeeping accel() const {
        std::lock_guard lock(_service._pipelineLock);
        return _service._accel;
    }

private:
    ZeltoTouchHIDService& _service;
};

namespace ServiceTest {

using Bytes = std::vector<uint8_t>;

// Every test binary logs into one capture sink and runs on the monotonic clock.
inline Platform::CaptureLogSink& logCapture() {
    static Platform::CaptureLogSink sink(Platform::LogThreshold::Debug);
    return sink;
}
// Before any test and before any service: the service keeps a host's own sink and clock.
[[maybe_unused]] inline const bool kHostFacilitiesInstalled = [] {
    Log::setSink(&logCapture());
    Platform::installMonotonicClock();
    return true;
}();

// Owns the creation reference of a service.
using ServicePointer = std::unique_ptr<ZeltoTouchHIDService, decltype([](ZeltoHIDService* s) { s->release(); })>;
inline ServicePointer makeService() { return ServicePointer(ZeltoTouchHIDService::create()); }

// A device the test feeds with input reports, each delivered on the run loop the service
// scheduled the device on (and registered for reports on). The public members are the device's
// answers and what it was asked, set and read on the thread that drives the service.
class InjectingDevice final : public Platform::HIDDevice, public std::enable_shared_from_this<InjectingDevice> {
public:
    static constexpr uint64_t kDeviceTimestamp = 7;  // what the device claims; the service must not use it

    ZeltoReturn openStatus = kZeltoSuccess;
    // A feature report in neither table reads 8 bytes: its ID, ID+1, ID+2, ...
    std::map<uint32_t, Bytes> featureReports;
    std::map<uint32_t, ZeltoReturn> featureFailures;
    std::map<std::string, PropertyValue, std::less<>> properties;
    bool acceptsProperties = true;
    std::vector<uint32_t> openOptions, closeOptions;  // of each call, in order

    // Waits until the service has registered for reports and scheduled the device.
    bool waitUntilScheduled() {
        std::unique_lock lock(_lock);
        return _scheduled.wait_for(lock, std::chrono::seconds(5), [this] { return _runLoop && _callback; });
    }
    // Queues one report, signalling handled once the service has taken it; false when the
    // device is not scheduled.
    bool post(Bytes report, std::shared_ptr<Platform::Semaphore> handled = nullptr) {
        std::unique_lock lock(_lock);
        if (!_runLoop) return false;
        _runLoop->perform(_mode, [self = shared_from_this(), report = std::move(report), handled] {
            if (!self->_callback) return;
            const uint64_t length = std::min<uint64_t>(report.size(), self->_bufferLength);
            if (length) std::memcpy(self->_buffer, report.data(), length);
            self->_callback(self->_context, kZeltoSuccess, self.get(), Platform::kHIDReportTypeInput,
                            report.empty() ? 0 : report[0], self->_buffer, length, kDeviceTimestamp);
            if (handled) handled->signal();
        });
        return true;
    }
    bool deliver(Bytes report) {
        auto handled = std::make_shared<Platform::Semaphore>(0);
        return post(std::move(report), handled) && handled->waitFor(std::chrono::seconds(5));
    }

    ZeltoReturn open(uint32_t options) override {
        openOptions.push_back(options);
        return openStatus;
    }
    void close(uint32_t options) override { closeOptions.push_back(options); }
    ZeltoReturn getReport(Platform::HIDReportType type, uint32_t reportID, uint8_t* buffer, uint64_t& length) override {
        if (type != Platform::kHIDReportTypeFeature) return kZeltoUnsupported;
        if (featureFailures.contains(reportID)) return featureFailures.at(reportID);
        Bytes bytes(8);
        for (size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<uint8_t>(reportID + i);
        if (featureReports.contains(reportID)) bytes = featureReports.at(reportID);
        length = std::min<uint64_t>(length, bytes.size());
        std::memcpy(buffer, bytes.data(), length);
        return kZeltoSuccess;
    }
    PropertyValue copyProperty(std::string_view key) const override {
        const auto found = properties.find(key);
        return found != properties.end() ? found->second : PropertyValue();
    }
    bool setProperty(std::string_view key, const PropertyValue& value) override {
        if (acceptsProperties) properties[std::string(key)] = value;
        return acceptsProperties;
    }
    void registerInputReportCallback(uint8_t* buffer, uint64_t length, Platform::HIDInputReportCallback callback,
                                     void* context) override {
        std::lock_guard lock(_lock);
        std::tie(_buffer, _bufferLength, _callback, _context) = std::tuple(buffer, length, callback, context);
        _scheduled.notify_all();
    }
    void scheduleWithRunLoop(const std::shared_ptr<Platform::RunLoop>& runLoop, const std::string& mode) override {
        std::lock_guard lock(_lock);
        std::tie(_runLoop, _mode) = std::tie(runLoop, mode);
        _scheduled.notify_all();
    }
    void unscheduleFromRunLoop(const std::shared_ptr<Platform::RunLoop>&, const std::string&) override {
        std::lock_guard lock(_lock);
        _runLoop = nullptr;
    }

private:
    std::mutex _lock;
    std::condition_variable _scheduled;
    uint8_t* _buffer = nullptr;
    uint64_t _bufferLength = 0;
    Platform::HIDInputReportCallback _callback = nullptr;
    void* _context = nullptr;
    std::shared_ptr<Platform::RunLoop> _runLoop;
    std::string _mode;
};

// An InjectingDevice registered with the host's device registry for the test's lifetime.
struct RegisteredDevice {
    std::shared_ptr<InjectingDevice> device = std::make_shared<InjectingDevice>();
    Platform::ScopedDeviceService service{[device = device] { return device; }};
};

// The event system offers no services for the lifetime of this object.
class ScopedNoEventServices {
public:
    ScopedNoEventServices() { for (const auto& service : _original) registry().remove(service); }
    ScopedNoEventServices(const ScopedNoEventServices&) = delete;
    ~ScopedNoEventServices() { for (const auto& service : _original) registry().add(service); }

private:
    static Platform::EventServiceRegistry& registry() { return Platform::EventServiceRegistry::shared(); }
    const std::vector<std::shared_ptr<Platform::EventSystemService>> _original = registry().services();
};

// What a gesture event says, for comparing event streams.
struct EventSummary {
    uint32_t type = 0;
    uint32_t phase = 0;
    uint32_t eventMask = 0;
    double region = 0;
    int64_t frameNumber = 0;

    static EventSummary of(const HIDEvent& event) {
        return {event.type(), event.phase(), event.eventMask(), event.y(),
                event.integerValue(kHIDEventFieldDigitizerFrameNumber)};
    }
    friend bool operator==(const EventSummary&, const EventSummary&) = default;
    friend std::ostream& operator<<(std::ostream& out, const EventSummary& e) {
        return out << "{type " << e.type << ", phase " << e.phase << ", mask " << e.eventMask << ", region "
                   << e.region << ", frame " << e.frameNumber << "}";
    }
};

// Collects the events the service's callback receives, checking that each comes on the host's
// queue with the expected refcon and sender and no options.
class EventCollector {
public:
    EventCollector(std::shared_ptr<Platform::DispatchQueue> queue, void* refcon, void* sender)
        : _queue(std::move(queue)), _refcon(refcon), _sender(sender) {}

    static void callback(void* target, void* refcon, void* sender, HIDEvent* event, uint32_t options) {
        auto& self = *static_cast<EventCollector*>(target);
        EXPECT_TRUE(self._queue->isCurrent());
        EXPECT_EQ(refcon, self._refcon);
        EXPECT_EQ(sender, self._sender);
        EXPECT_EQ(options, 0u);
        std::lock_guard lock(self._lock);
        self._events.push_back(EventSummary::of(*event));
    }
    std::vector<EventSummary> events() const {
        std::lock_guard lock(_lock);
        return _events;
    }
    void clear() {
        std::lock_guard lock(_lock);
        _events.clear();
    }

private:
    const std::shared_ptr<Platform::DispatchQueue> _queue;
    void* const _refcon;
    void* const _sender;
    mutable std::mutex _lock;
    std::vector<EventSummary> _events;
};

// A fresh pipeline that keeps the events it makes.
struct EventTrace {
    EventTrace() {
        pipeline->hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
            [this](uint64_t, const HIDEventList& list) {
                for (const HIDEventRef& event : list) events.push_back(EventSummary::of(*event));
            });
    }
    EventTrace(const EventTrace&) = delete;
    // Feeds the reports 10 ms apart.
    void play(const std::vector<Bytes>& reports) {
        uint64_t t = 0;
        for (const Bytes& report : reports) pipeline->handleInputReport(t += 10'000'000, report.data(), report.size());
    }

    std::shared_ptr<Pipeline> pipeline = std::make_shared<Pipeline>();
    std::vector<EventSummary> events;
};

// Input reports of a gesture script, as the simulated sensor would send them.
inline std::vector<Bytes> reportsOfScript(std::string_view scriptText, uint32_t startTimeMs = 0) {
    Platform::SensorReportGenerator generator(Platform::GestureScriptParser::parse(scriptText),
                                              {.startTimeMs = startTimeMs});
    std::vector<Bytes> reports;
    for (Platform::SimulatedReport& report : generator.generateAll()) reports.push_back(std::move(report.bytes));
    return reports;
}

// Little-endian 32-bit fields of a report.
constexpr uint32_t get32(const uint8_t* p) { return p[0] | p[1] << 8 | p[2] << 16 | static_cast<uint32_t>(p[3]) << 24; }
inline void put32(uint8_t* p, uint32_t v) {
    for (int i = 0; i < 4; ++i) p[i] = static_cast<uint8_t>(v >> (8 * i));
}

// Threads of this process right now.
inline size_t threadCount() {
    const std::filesystem::directory_iterator tasks("/proc/self/task");
    return static_cast<size_t>(std::distance(begin(tasks), end(tasks)));
}

}  // namespace ServiceTest
}  // namespace ZeltoTouch

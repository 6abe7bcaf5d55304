#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <filesystem>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"
#include "Platform/CaptureLogSink.h"
#include "Platform/DeviceRegistry.h"
#include "Platform/DispatchQueue.h"
#include "Platform/EventSystemService.h"
#include "Platform/GestureScript.h"
#include "Platform/HIDDevice.h"
#include "Platform/MonotonicClock.h"
#include "Platform/RunLoop.h"
#include "Platform/SensorReportGenerator.h"

namespace ZeltoTouch {

namespace ServiceTest {

using Bytes = std::vector<uint8_t>;

// Every test binary logs into one capture sink and runs on the monotonic clock.
Platform::CaptureLogSink& logCapture();

// A device that the test feeds with input reports: each report is queued on the run loop the
// device is scheduled on and delivered there into the registered buffer. Feature reports and
// properties are answered from tables the test sets.
class InjectingDevice final : public Platform::HIDDevice, public std::enable_shared_from_this<InjectingDevice> {
public:
    static constexpr uint64_t kDeviceTimestamp = 7;  // what the device claims; the service must not use it

    // Feature reports answer bytes (report ID, then ID+1, ID+2, ... for the given length).
    static Bytes featureReportBytes(uint32_t reportID, size_t length);

    void setOpenStatus(ZeltoReturn status);
    void failFeatureReport(uint32_t reportID, ZeltoReturn status);
    void setFeatureReport(uint32_t reportID, Bytes bytes);
    void setPropertyAnswer(bool accepted);
    std::vector<uint32_t> openOptions() const;
    std::vector<uint32_t> closeOptions() const;

    // Waits until the service has registered for reports and scheduled the device.
    bool waitUntilScheduled(std::chrono::milliseconds timeout = std::chrono::seconds(5));
    bool isScheduled() const;
    // Queues one report; false when the device is not scheduled.
    bool post(Bytes report);
    // Queues one report and waits until the service has handled it.
    bool deliver(Bytes report, std::chrono::milliseconds timeout = std::chrono::seconds(5));

    ZeltoReturn open(uint32_t options) override;
    void close(uint32_t options) override;
    ZeltoReturn getReport(Platform::HIDReportType type, uint32_t reportID, uint8_t* buffer, uint64_t& length) override;
    PropertyValue copyProperty(std::string_view key) const override;
    bool setProperty(std::string_view key, const PropertyValue& value) override;
    void registerInputReportCallback(uint8_t* buffer, uint64_t length, Platform::HIDInputReportCallback callback,
                                     void* context) override;
    void scheduleWithRunLoop(const std::shared_ptr<Platform::RunLoop>& runLoop, const std::string& mode) override;
    void unscheduleFromRunLoop(const std::shared_ptr<Platform::RunLoop>& runLoop, const std::string& mode) override;

private:
    void deliverNow(const Bytes& report);

    mutable std::mutex _lock;
    std::condition_variable _scheduled;
    uint8_t* _buffer = nullptr;
    uint64_t _bufferLength = 0;
    Platform::HIDInputReportCallback _callback = nullptr;
    void* _context = nullptr;
    std::shared_ptr<Platform::RunLoop> _runLoop;
    std::string _mode;
    ZeltoReturn _openStatus = kZeltoSuccess;
    std::vector<uint32_t> _openOptions;
    std::vector<uint32_t> _closeOptions;
    std::map<uint32_t, ZeltoReturn> _featureFailures;
    std::map<uint32_t, Bytes> _featureReports;
    std::map<std::string, PropertyValue, std::less<>> _properties;
    bool _propertyAnswer = true;
};

// An InjectingDevice registered with the host's device registry for the test's lifetime.
struct RegisteredDevice {
    std::shared_ptr<InjectingDevice> device = std::make_shared<InjectingDevice>();
    Platform::ScopedDeviceService service{[device = device] { return device; }};
};

// The event system offers only these services for the lifetime of this object.
class ScopedEventServices {
public:
    explicit ScopedEventServices(const std::vector<std::shared_ptr<Platform::EventSystemService>>& services);
    ~ScopedEventServices();
    ScopedEventServices(const ScopedEventServices&) = delete;
    ScopedEventServices& operator=(const ScopedEventServices&) = delete;

private:
    static void replace(const std::vector<std::shared_ptr<Platform::EventSystemService>>& services);
    const std::vector<std::shared_ptr<Platform::EventSystemService>> _original;
};

// What a gesture event says, for comparing event streams.
struct EventSummary {
    uint32_t type = 0;
    uint32_t phase = 0;
    uint32_t eventMask = 0;
    uint32_t region = 0;
    int64_t frameNumber = 0;

    static EventSummary of(const HIDEvent& event);
    friend bool operator==(const EventSummary&, const EventSummary&) = default;
};
std::ostream& operator<<(std::ostream& out, const EventSummary& summary);

// Collects what the service's callback receives, with the thread it ran on.
class EventCollector {
public:
    struct Delivery {
        EventSummary event;
        void* target;
        void* refcon;
        void* sender;
        uint32_t options;
        bool onQueue;
    };

    explicit EventCollector(std::shared_ptr<Platform::DispatchQueue> queue) : _queue(std::move(queue)) {}

    static void callback(void* target, void* refcon, void* sender, HIDEvent* event, uint32_t options);
    std::vector<Delivery> deliveries() const;
    std::vector<EventSummary> events() const;

private:
    std::shared_ptr<Platform::DispatchQueue> _queue;
    mutable std::mutex _lock;
    std::vector<Delivery> _deliveries;
};

// Input reports of a gesture script, as the simulated sensor would send them.
std::vector<Bytes> reportsOfScript(std::string_view scriptText, uint32_t startTimeMs = 0);

// The events a fresh pipeline makes of the frames of a recording (JSON container text).
std::vector<EventSummary> replayEvents(const PropertyValue& recordingJSON);
// The events a fresh pipeline makes of these reports.
std::vector<EventSummary> pipelineEvents(const std::vector<Bytes>& reports);

// Threads of this process right now.
size_t threadCount();

}  // namespace ServiceTest
}  // namespace ZeltoTouch

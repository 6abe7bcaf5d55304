#include "Tests/Service/ServiceTestSupport.h"

#include <algorithm>
#include <cstring>
#include <ostream>

#include "Platform/Semaphore.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/HostClock.h"
#include "Shared/Util/MachTime.h"

namespace ZeltoTouch::ServiceTest {

Platform::CaptureLogSink& logCapture() {
    static Platform::CaptureLogSink sink(Platform::LogThreshold::Debug);
    return sink;
}

namespace {
// Before any test and before any service: the service keeps a host's own sink and clock.
[[maybe_unused]] const bool kHostFacilitiesInstalled = [] {
    Log::setSink(&logCapture());
    Platform::installMonotonicClock();
    return true;
}();
}  // namespace

Bytes InjectingDevice::featureReportBytes(uint32_t reportID, size_t length) {
    Bytes bytes(length);
    for (size_t i = 0; i < length; ++i) bytes[i] = static_cast<uint8_t>(reportID + i);
    return bytes;
}

void InjectingDevice::setOpenStatus(ZeltoReturn status) {
    std::lock_guard lock(_lock);
    _openStatus = status;
}

void InjectingDevice::failFeatureReport(uint32_t reportID, ZeltoReturn status) {
    std::lock_guard lock(_lock);
    _featureFailures[reportID] = status;
}

void InjectingDevice::setFeatureReport(uint32_t reportID, Bytes bytes) {
    std::lock_guard lock(_lock);
    _featureReports[reportID] = std::move(bytes);
}

void InjectingDevice::setPropertyAnswer(bool accepted) {
    std::lock_guard lock(_lock);
    _propertyAnswer = accepted;
}

std::vector<uint32_t> InjectingDevice::openOptions() const {
    std::lock_guard lock(_lock);
    return _openOptions;
}

std::vector<uint32_t> InjectingDevice::closeOptions() const {
    std::lock_guard lock(_lock);
    return _closeOptions;
}

bool InjectingDevice::waitUntilScheduled(std::chrono::milliseconds timeout) {
    std::unique_lock lock(_lock);
    return _scheduled.wait_for(lock, timeout, [this] { return _runLoop && _callback; });
}

bool InjectingDevice::isScheduled() const {
    std::lock_guard lock(_lock);
    return _runLoop && _callback;
}

bool InjectingDevice::post(Bytes report) {
    std::shared_ptr<Platform::RunLoop> runLoop;
    std::string mode;
    {
        std::lock_guard lock(_lock);
        runLoop = _runLoop;
        mode = _mode;
    }
    if (!runLoop) return false;
    runLoop->perform(mode, [self = shared_from_this(), report = std::move(report)] { self->deliverNow(report); });
    return true;
}

bool InjectingDevice::deliver(Bytes report, std::chrono::milliseconds timeout) {
    std::shared_ptr<Platform::RunLoop> runLoop;
    std::string mode;
    {
        std::lock_guard lock(_lock);
        runLoop = _runLoop;
        mode = _mode;
    }
    if (!runLoop) return false;
    auto handled = std::make_shared<Platform::Semaphore>(0);
    runLoop->perform(mode, [self = shared_from_this(), report = std::move(report), handled] {
        self->deliverNow(report);
        handled->signal();
    });
    return handled->waitFor(timeout);
}

// On the run loop's thread, like a real device's delivery.
void InjectingDevice::deliverNow(const Bytes& report) {
    uint8_t* buffer;
    uint64_t bufferLength;
    Platform::HIDInputReportCallback callback;
    void* context;
    {
        std::lock_guard lock(_lock);
        buffer = _buffer;
        bufferLength = _bufferLength;
        callback = _callback;
        context = _context;
    }
    if (!callback) return;
    const uint64_t length = std::min<uint64_t>(report.size(), bufferLength);
    if (length) std::memcpy(buffer, report.data(), length);
    const uint32_t reportID = report.empty() ? 0 : report[0];
    callback(context, kZeltoSuccess, this, Platform::kHIDReportTypeInput, reportID, buffer, length, kDeviceTimestamp);
}

ZeltoReturn InjectingDevice::open(uint32_t options) {
    std::lock_guard lock(_lock);
    _openOptions.push_back(options);
    return _openStatus;
}

void InjectingDevice::close(uint32_t options) {
    std::lock_guard lock(_lock);
    _closeOptions.push_back(options);
}

ZeltoReturn InjectingDevice::getReport(Platform::HIDReportType type, uint32_t reportID, uint8_t* buffer,
                                       uint64_t& length) {
    std::lock_guard lock(_lock);
    if (type != Platform::kHIDReportTypeFeature) return kZeltoUnsupported;
    if (auto failure = _featureFailures.find(reportID); failure != _featureFailures.end()) return failure->second;
    auto found = _featureReports.find(reportID);
    const Bytes bytes = found != _featureReports.end() ? found->second : featureReportBytes(reportID, 8);
    length = std::min<uint64_t>(length, bytes.size());
    std::memcpy(buffer, bytes.data(), length);
    return kZeltoSuccess;
}

PropertyValue InjectingDevice::copyProperty(std::string_view key) const {
    std::lock_guard lock(_lock);
    auto found = _properties.find(key);
    return found != _properties.end() ? found->second : PropertyValue();
}

bool InjectingDevice::setProperty(std::string_view key, const PropertyValue& value) {
    std::lock_guard lock(_lock);
    if (_propertyAnswer) _properties[std::string(key)] = value;
    return _propertyAnswer;
}

void InjectingDevice::registerInputReportCallback(uint8_t* buffer, uint64_t length,
                                                  Platform::HIDInputReportCallback callback, void* context) {
    std::lock_guard lock(_lock);
    _buffer = buffer;
    _bufferLength = length;
    _callback = callback;
    _context = context;
    _scheduled.notify_all();
}

void InjectingDevice::scheduleWithRunLoop(const std::shared_ptr<Platform::RunLoop>& runLoop, const std::string& mode) {
    std::lock_guard lock(_lock);
    _runLoop = runLoop;
    _mode = mode;
    _scheduled.notify_all();
}

void InjectingDevice::unscheduleFromRunLoop(const std::shared_ptr<Platform::RunLoop>&, const std::string&) {
    std::lock_guard lock(_lock);
    _runLoop = nullptr;
    _mode.clear();
}

ScopedEventServices::ScopedEventServices(const std::vector<std::shared_ptr<Platform::EventSystemService>>& services)
    : _original(Platform::EventServiceRegistry::shared().services()) {
    replace(services);
}

ScopedEventServices::~ScopedEventServices() { replace(_original); }

void ScopedEventServices::replace(const std::vector<std::shared_ptr<Platform::EventSystemService>>& services) {
    auto& registry = Platform::EventServiceRegistry::shared();
    for (const auto& service : registry.services()) registry.remove(service);
    for (const auto& service : services) registry.add(service);
}

EventSummary EventSummary::of(const HIDEvent& event) {
    return {event.type(), event.phase(), event.eventMask(), static_cast<uint32_t>(event.y()),
            event.integerValue(kHIDEventFieldDigitizerFrameNumber)};
}

std::ostream& operator<<(std::ostream& out, const EventSummary& summary) {
    return out << "{type " << summary.type << ", phase " << summary.phase << ", mask " << summary.eventMask
               << ", region " << summary.region << ", frame " << summary.frameNumber << "}";
}

void EventCollector::callback(void* target, void* refcon, void* sender, HIDEvent* event, uint32_t options) {
    auto& collector = *static_cast<EventCollector*>(target);
    std::lock_guard lock(collector._lock);
    collector._deliveries.push_back(
        {EventSummary::of(*event), target, refcon, sender, options, collector._queue->isCurrent()});
}

std::vector<EventCollector::Delivery> EventCollector::deliveries() const {
    std::lock_guard lock(_lock);
    return _deliveries;
}

std::vector<EventSummary> EventCollector::events() const {
    std::vector<EventSummary> events;
    for (const Delivery& delivery : deliveries()) events.push_back(delivery.event);
    return events;
}

std::vector<Bytes> reportsOfScript(std::string_view scriptText, uint32_t startTimeMs) {
    Platform::SensorReportGenerator::Options options;
    options.startTimeMs = startTimeMs;
    Platform::SensorReportGenerator generator(Platform::GestureScriptParser::parse(scriptText), options);
    std::vector<Bytes> reports;
    for (Platform::SimulatedReport& report : generator.generateAll()) reports.push_back(std::move(report.bytes));
    return reports;
}

namespace {

std::shared_ptr<Pipeline> collectingPipeline(std::vector<EventSummary>& events) {
    auto pipeline = std::make_shared<Pipeline>();
    pipeline->hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
        [&events](uint64_t, const HIDEventList& list) {
            for (const HIDEventRef& event : list) events.push_back(EventSummary::of(*event));
        });
    return pipeline;
}

}  // namespace

std::vector<EventSummary> replayEvents(const PropertyValue& recordingJSON) {
    const PipelineRecording recording(PropertyValue::data(
        std::span(reinterpret_cast<const uint8_t*>(recordingJSON.stringView().data()), recordingJSON.length())));
    std::vector<EventSummary> events;
    auto pipeline = collectingPipeline(events);
    for (const PipelineRecording::Frame& frame : recording.frames()) {
        const uint64_t timestamp = Util::machTimeFromNanoseconds(frame.timestamp);
        switch (frame.type) {
            case PipelineRecording::Frame::Type::State: pipeline->setState(timestamp, frame.key, frame.value); break;
            case PipelineRecording::Frame::Type::InputReport:
                pipeline->handleInputReport(timestamp, frame.data.data(), frame.data.size());
                break;
            case PipelineRecording::Frame::Type::Metadata:
                pipeline->handleMetadata(timestamp, frame.key, frame.value);
                break;
        }
    }
    return events;
}

std::vector<EventSummary> pipelineEvents(const std::vector<Bytes>& reports) {
    std::vector<EventSummary> events;
    auto pipeline = collectingPipeline(events);
    uint64_t timestamp = 0;
    for (const Bytes& report : reports) pipeline->handleInputReport(++timestamp, report.data(), report.size());
    return events;
}

size_t threadCount() {
    size_t count = 0;
    for ([[maybe_unused]] const auto& entry : std::filesystem::directory_iterator("/proc/self/task")) ++count;
    return count;
}

}  // namespace ZeltoTouch::ServiceTest

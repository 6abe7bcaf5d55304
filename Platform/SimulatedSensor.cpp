#include "Platform/SimulatedSensor.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <vector>

#include "Shared/Util/HostClock.h"

namespace ZeltoTouch::Platform {

namespace {

struct FeatureReport {
    uint8_t reportID;
    std::vector<uint8_t> payload;  // after the report ID
};

// Firmware version, configuration, calibration and diagnostic blocks: fixed plausible contents.
const std::array<FeatureReport, 11> kFeatureReports = {{
    {0x04, {0x03, 0x0E, 0x02, 0x9A, 0x01, 0x00, 0x00}},                    // firmware 3.14.2 build 410
    {0x10, {0x0F, 0x0A, 0x00, 0xC8, 0x00, 0x4B, 0x00}},                    // 15 channels, 10 ms, 200, 75
    {0x11, {0xE0, 0x2E, 0xE5, 0x2E, 0xEA, 0x2E, 0xEF, 0x2E, 0xF4, 0x2E}},  // channel baselines
    {0x12, {0x00, 0x00, 0x00, 0x00, 0x01, 0x00}},                          // error counters
    {0x13, {0x5A, 0x54, 0x00, 0x01}},                                      // board id
    {0x1D, {0x02, 0x00, 0x00, 0x00}},                                      // last reset reason
    {0x1F, {0x10, 0x27, 0x00, 0x00}},                                      // factory-reset hold: 10000 ms
    {0x32, {0x01, 0x02, 0x03, 0x04, 0x05, 0x06, 0x07, 0x08}},              // self-test pattern
    {0x3B, {0x00, 0x64}},                                                  // scan rate 100 Hz
    {0x3C, {0x2A, 0x00, 0x00, 0x00}},                                      // uptime counter
    {0x3F, {0xFF}},                                                        // debug flags
}};

const std::array<std::string_view, 4> kReadOnlyProperties = {"Product", "VendorID", "ProductID", "SerialNumber"};

}  // namespace

SimulatedSensor::SimulatedSensor(GestureScript script, SensorReportGenerator::Options options)
    : _framePeriodMs(std::max(options.framePeriodMs, 1u)), _generator(std::move(script), options) {
    static_assert(kFactoryResetHoldDurationMs == 0x2710);
    _properties.emplace("Product", PropertyValue::string("ZeltoTouch Simulated Sensor"));
    _properties.emplace("VendorID", PropertyValue::fromUInt32(0x5A54));
    _properties.emplace("ProductID", PropertyValue::fromUInt32(0x0001));
    _properties.emplace("SerialNumber", PropertyValue::string("SIM-0001"));
    _playbackFinished = _generator.finished();
}

SimulatedSensor::~SimulatedSensor() = default;

void SimulatedSensor::failFeatureReport(uint32_t reportID, ZeltoReturn status) {
    std::lock_guard lock(_lock);
    _featureReportFailures[reportID] = status;
}

void SimulatedSensor::clearFeatureReportFailures() {
    std::lock_guard lock(_lock);
    _featureReportFailures.clear();
}

void SimulatedSensor::setOpenStatus(ZeltoReturn status) {
    std::lock_guard lock(_lock);
    _openStatus = status;
}

ZeltoReturn SimulatedSensor::open(uint32_t) {
    std::lock_guard lock(_lock);
    if (_openStatus == kZeltoSuccess) _open = true;
    return _openStatus;
}

void SimulatedSensor::close(uint32_t) { _open = false; }

ZeltoReturn SimulatedSensor::getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, uint64_t& length) {
    if (type != kHIDReportTypeFeature) return kZeltoUnsupported;
    {
        std::lock_guard lock(_lock);
        if (auto failure = _featureReportFailures.find(reportID); failure != _featureReportFailures.end()) {
            length = 0;
            return failure->second;
        }
    }
    const auto report = std::find_if(kFeatureReports.begin(), kFeatureReports.end(),
                                     [&](const FeatureReport& candidate) { return candidate.reportID == reportID; });
    if (report == kFeatureReports.end()) return kStatusNotFound;
    const uint64_t size = 1 + report->payload.size();
    if (buffer == nullptr || length < size) return kStatusBadArgument;
    buffer[0] = report->reportID;
    std::memcpy(buffer + 1, report->payload.data(), report->payload.size());
    length = size;
    return kZeltoSuccess;
}

PropertyValue SimulatedSensor::copyProperty(std::string_view key) const {
    std::lock_guard lock(_lock);
    auto found = _properties.find(key);
    return found == _properties.end() ? PropertyValue() : found->second;
}

bool SimulatedSensor::setProperty(std::string_view key, const PropertyValue& value) {
    if (std::find(kReadOnlyProperties.begin(), kReadOnlyProperties.end(), key) != kReadOnlyProperties.end()) return false;
    std::lock_guard lock(_lock);
    if (value.hasValue()) {
        _properties.insert_or_assign(std::string(key), value);
    } else {
        _properties.erase(std::string(key));
    }
    return true;
}

void SimulatedSensor::registerInputReportCallback(uint8_t* buffer, uint64_t length, HIDInputReportCallback callback,
                                                  void* context) {
    std::lock_guard lock(_lock);
    _registration = callback ? Registration{buffer, length, callback, context} : Registration{};
}

void SimulatedSensor::scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) {
    _timer = std::make_unique<TimerSource>(std::chrono::milliseconds(_framePeriodMs), [this] { deliverFrame(); });
    _timer->attach(runLoop, mode);
    _runLoop = runLoop;
    _runLoopMode = mode;
}

void SimulatedSensor::unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop, const std::string& mode) {
    if (runLoop != _runLoop || mode != _runLoopMode) return;
    _timer.reset();
    _runLoop.reset();
    _runLoopMode.clear();
}

// One timer tick: the reports due by the new playback time, when someone is listening.
void SimulatedSensor::deliverFrame() {
    Registration registration;
    {
        std::lock_guard lock(_lock);
        registration = _registration;
    }
    if (!_open || registration.callback == nullptr) return;
    while (auto due = _generator.nextReportTimeMs()) {
        if (*due > _playbackTimeMs) break;
        deliver(*_generator.next(), registration);
    }
    _playbackTimeMs += _framePeriodMs;
    _playbackFinished = _generator.finished();
}

void SimulatedSensor::deliver(const SimulatedReport& report, const Registration& registration) {
    const uint64_t length = std::min<uint64_t>(report.bytes.size(), registration.length);
    std::memcpy(registration.buffer, report.bytes.data(), length);
    const ZeltoReturn result = length < report.bytes.size() ? kStatusOverrun : kZeltoSuccess;
    ++_deliveredReports;
    registration.callback(registration.context, result, this, kHIDReportTypeInput, report.bytes[0], registration.buffer,
                          length, Util::hostClock().machTimeNow());
}

}  // namespace ZeltoTouch::Platform

// The properties of ZeltoTouchHIDService.

#include <algorithm>
#include <array>
#include <optional>
#include <stdexcept>
#include <string>

#include "Platform/HIDDevice.h"
#include "Service/ZeltoTouchHIDService.h"
#include "Shared/Pipeline/InputReport.h"
#include "Shared/Util/HostClock.h"
#include "Shared/Util/Hex.h"
#include "Shared/Util/StateKey.h"

namespace ZeltoTouch {

namespace {

constexpr const char* kPipelineDomain = "Pipeline";
constexpr int32_t kVersion[] = {17, 0, 0};

// The firmware's feature reports that "FirmwareDebugReports" shows, in this order.
constexpr uint32_t kFirmwareDebugReportIDs[] = {0x04, 0x10, 0x11, 0x12, 0x13, 0x1D, 0x32, 0x3B, 0x3C, 0x3F};
constexpr uint64_t kFirmwareDebugReportSize = 128;
constexpr uint64_t kFactoryResetHoldDurationReportSize = 32;

// A key the host gave, as UTF-8 text; nothing for "no value" and for anything but a string.
std::optional<std::string> keyText(const PropertyValue& key) {
    if (!key.isString()) return std::nullopt;
    return std::string(key.stringView());
}

PropertyValue versionArray() {
    std::vector<PropertyValue> numbers;
    for (int32_t part : kVersion) numbers.push_back(PropertyValue::fromInt32(part));
    return PropertyValue::array(std::move(numbers));
}

// Reads a feature report; on success length is what the device returned, never beyond the buffer.
template <size_t Size>
ZeltoReturn readFeatureReport(Platform::HIDDevice& device, uint32_t reportID, std::array<uint8_t, Size>& buffer,
                              uint64_t& length) {
    length = Size;
    const ZeltoReturn status = device.getReport(Platform::kHIDReportTypeFeature, reportID, buffer.data(), length);
    length = std::min<uint64_t>(length, Size);
    return status;
}

}  // namespace

PropertyValue ZeltoTouchHIDService::getPropertyForKey(const PropertyValue& key) {
    _log.debug("getPropertyForKey:%@", key);
    std::optional<std::string> k = keyText(key);
    if (!k) return {};

    if (Util::stripDomainFromKey(*k, kPipelineDomain)) {
        std::lock_guard lock(_pipelineLock);
        return _pipeline->getState(*k);
    }
    if (*k == "Version") return versionArray();
    if (*k == "FirmwareDebugReports") return firmwareDebugReports();
    if (*k == "FactoryResetHoldDuration") return factoryResetHoldDuration();
    if (*k == "Recording") return recordingJSON();
    if (*k == "ServicePluginDebug") return servicePluginDebug();
    return _zeltoDevice ? _zeltoDevice->copyProperty(key.stringView()) : PropertyValue();
}

bool ZeltoTouchHIDService::setProperty(const PropertyValue& value, const PropertyValue& key) {
    _log.debug("setProperty:%@ forKey:%@", value, key);
    std::optional<std::string> k = keyText(key);
    if (!k) return false;

    if (Util::stripDomainFromKey(*k, kPipelineDomain)) {
        std::lock_guard lock(_pipelineLock);
        const uint64_t now = Util::hostClock().machTimeNow();
        _recording.setState(now, *k, value);
        return true;  // whether the pipeline knows the key or not
    }
    return _zeltoDevice && _zeltoDevice->setProperty(key.stringView(), value);
}

// Always ten entries: a report the device refuses is entered as its failure text. No lock.
PropertyValue ZeltoTouchHIDService::firmwareDebugReports() const {
    if (!_zeltoDevice) return {};
    PropertyValue reports = PropertyValue::mutableDictionary();
    for (uint32_t reportID : kFirmwareDebugReportIDs) {
        std::array<uint8_t, kFirmwareDebugReportSize> buffer{};
        uint64_t length = 0;
        const ZeltoReturn status = readFeatureReport(*_zeltoDevice, reportID, buffer, length);
        const std::string key = format("0x%02jx", reportID);
        if (status != kZeltoSuccess) {
            const auto code = static_cast<uint32_t>(status);
            reports.set(key, formatString("Failed to get report ID 0x%jx: 0x%jx", reportID, code));
        } else {
            reports.set(key, Util::hexStringFromBytes(std::span(buffer.data(), length)));
        }
    }
    return reports;
}

PropertyValue ZeltoTouchHIDService::factoryResetHoldDuration() const {
    if (!_zeltoDevice) return {};
    std::array<uint8_t, kFactoryResetHoldDurationReportSize> buffer{};
    uint64_t length = 0;
    using Report = FeatureReport::FactoryResetHoldDuration;
    if (readFeatureReport(*_zeltoDevice, Report::kReportID, buffer, length) != kZeltoSuccess) return {};
    const std::optional<uint32_t> duration = Report::parse(buffer.data(), length);
    return duration ? PropertyValue::fromUInt32(*duration) : PropertyValue();
}

// Copied under the lock, serialised outside it: report processing waits only for the copy.
// A write of a value JSON cannot hold (data, NaN, a key that is not UTF-8) still reaches the
// pipeline and the recording; leaving just that frame out keeps the rest of the recording
// readable.
PropertyValue ZeltoTouchHIDService::recordingJSON() {
    // Room for what the recording holds now and what may arrive meanwhile, so the copy made
    // under the lock writes only to resident memory.
    std::unique_lock lock(_pipelineLock);
    const size_t framesNow = _recording.frames().size();
    lock.unlock();
    PipelineRecording copy;
    copy.reserveFrames(framesNow + kFramesArrivingDuringRecordingRead);
    lock.lock();
    copy = _recording;
    lock.unlock();
    size_t leftOut = 0;
    PropertyValue text = PropertyValue::stringFromData(copy.jsonLeavingOutUnwritable(leftOut));
    if (leftOut > 0) _log.error("Recording: left out %zu frames that JSON cannot represent", leftOut);
    return text;
}

// Each sub-key is read on its own, so the lock is taken separately for each.
PropertyValue ZeltoTouchHIDService::servicePluginDebug() {
    const std::string keys[] = {
        "Version",
        "FirmwareDebugReports",
        "Recording",
        format("%s.%s", kPipelineDomain, "DebugInfo"),
        format("%s.%s.%s", kPipelineDomain, "Algs", "DebugInfo"),
    };
    PropertyValue debug = PropertyValue::mutableDictionary();
    for (const std::string& key : keys) {
        if (PropertyValue value = getPropertyForKey(PropertyValue::string(key))) debug.set(key, std::move(value));
    }
    return debug;
}

}  // namespace ZeltoTouch

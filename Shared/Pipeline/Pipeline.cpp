#include "Shared/Pipeline/Pipeline.h"

#include "Shared/Util/StateKey.h"

namespace ZeltoTouch {

namespace {

// The vendor-defined event that tells the host the firmware was reset.
constexpr uint16_t kResetEventUsagePage = 0xFF60;
constexpr uint16_t kResetEventUsage = 2;

template <typename Probe, typename... Args>
void call(const Probe& probe, Args&&... args) {
    if (probe && *probe) (*probe)(std::forward<Args>(args)...);
}

}  // namespace

void Pipeline::setState(uint64_t timestampMach, const std::string& key, const PropertyValue& value) {
    call(setStateProbe, timestampMach, key, value);
    std::string algsKey = key;
    if (Util::stripDomainFromKey(algsKey, "Algs")) _algs.setState(algsKey, value);
}

PropertyValue Pipeline::getState(const std::string& key) {
    call(getStateProbe, key);
    std::string algsKey = key;
    if (Util::stripDomainFromKey(algsKey, "Algs")) return _algs.getState(algsKey);
    if (key == "DebugInfo") {
        return PropertyValue::dictionary({
            {"ResetCount", PropertyValue::fromUInt32(_resetCount)},
            {"DisjointImageCount", PropertyValue::fromUInt32(_disjointImageCount)},
        });
    }
    return {};
}

void Pipeline::handleMetadata(uint64_t timestampMach, const std::string& key, const PropertyValue& value) {
    call(metadataProbe, timestampMach, key, value);
}

void Pipeline::handleInputReport(uint64_t timestampMach, const uint8_t* bytes, uint64_t length) {
    call(inputReportProbe, timestampMach, bytes, length);
    if (const auto event = InputReport::FirmwareEvent::parse(bytes, length)) {
        handleFirmwareEvent(timestampMach, *event);
    } else if (const auto image = InputReport::Image::parse(bytes, length)) {
        handleImage(timestampMach, *image);
    } else {
        call(invalidInputReportProbe, timestampMach, bytes, length);
    }
}

void Pipeline::handleFirmwareEvent(uint64_t timestampMach, const InputReport::FirmwareEvent& event) {
    call(firmwareEventProbe, timestampMach, event);
    if (event.event != InputReport::FirmwareEvent::kReset) return;

    ++_resetCount;
    HIDEventList events = _algs.handleReset();
    if (HIDEventRef reset = HIDEvent::createVendorDefinedEvent(0, kResetEventUsagePage, kResetEventUsage, 0,
                                                               nullptr, 0, 0)) {
        events.push_back(std::move(reset));
    }
    handleHIDEvents(timestampMach, events);
}

void Pipeline::handleImage(uint64_t timestampMach, const InputReport::Image& image) {
    call(imageProbe, timestampMach, image);
    if (_lastFrameNumber && image.frameNumber != static_cast<uint32_t>(*_lastFrameNumber + 1u)) {
        ++_disjointImageCount;
        call(disjointImageProbe, timestampMach, *_lastFrameNumber, image);
    }
    _lastFrameNumber = image.frameNumber;
    handleHIDEvents(timestampMach, _algs.handleImage(image));
}

void Pipeline::handleHIDEvents(uint64_t timestampMach, const HIDEventList& events) {
    for (const HIDEventRef& event : events) event->setTimestamp(timestampMach);
    if (!events.empty()) call(hidEventsProbe, timestampMach, events);
}

}  // namespace ZeltoTouch

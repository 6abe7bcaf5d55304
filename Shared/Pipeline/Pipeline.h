#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"
#include "Shared/Algs/Algs.h"
#include "Shared/Pipeline/InputReport.h"
#include "Shared/Pipeline/PipelineInput.h"

namespace ZeltoTouch {

// The main stage: parses input reports, routes images and firmware resets to the touch
// algorithm, counts resets and frame-number gaps, stamps the resulting events with the
// report's timestamp and hands them out through hidEventsProbe. It never reads a clock.
//
// Not thread-safe: its owner serialises every call and every probe change under one lock,
// and probes run under that lock, so a probe must not call back into the pipeline.
class Pipeline final : public PipelineInput, public PipelineOutput {
public:
    // Probes are optional hooks; an empty one is skipped.
    template <typename Signature>
    using Probe = std::shared_ptr<std::function<Signature>>;

    Probe<void(uint64_t timestampMach, const std::string& key, const PropertyValue& value)> setStateProbe;
    Probe<void(uint64_t timestampMach, const uint8_t* bytes, uint64_t length)> inputReportProbe;
    Probe<void(uint64_t timestampMach, const std::string& key, const PropertyValue& value)> metadataProbe;
    Probe<void(uint64_t timestampMach, const uint8_t* bytes, uint64_t length)> invalidInputReportProbe;
    Probe<void(uint64_t timestampMach, const InputReport::FirmwareEvent& event)> firmwareEventProbe;
    Probe<void(uint64_t timestampMach, const InputReport::Image& image)> imageProbe;
    Probe<void(uint64_t timestampMach, uint32_t previousFrameNumber, const InputReport::Image& image)>
        disjointImageProbe;
    Probe<void(uint64_t timestampMach, const HIDEventList& events)> hidEventsProbe;
    Probe<void(const std::string& key)> getStateProbe;

    void setState(uint64_t timestampMach, const std::string& key, const PropertyValue& value) override;
    void handleInputReport(uint64_t timestampMach, const uint8_t* bytes, uint64_t length) override;
    void handleMetadata(uint64_t timestampMach, const std::string& key, const PropertyValue& value) override;
    PropertyValue getState(const std::string& key) override;

    const Algs& algs() const noexcept { return _algs; }

private:
    void handleFirmwareEvent(uint64_t timestampMach, const InputReport::FirmwareEvent& event);
    void handleImage(uint64_t timestampMach, const InputReport::Image& image);
    void handleHIDEvents(uint64_t timestampMach, const HIDEventList& events);

    std::optional<uint32_t> _lastFrameNumber;
    uint32_t _resetCount = 0;
    uint32_t _disjointImageCount = 0;
    Algs _algs;
};

}  // namespace ZeltoTouch

#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "Host/PropertyValue.h"
#include "Shared/Recording/PipelineRecording.h"

namespace ZeltoTouch::Tools {

// What a recording holds, frame by frame in timestamp order: the figures `info` prints and the
// inspect report's summary shows.
class RecordingSummary {
public:
    struct Gap {  // an image whose frame number does not follow the previous image's
        uint64_t timestampNs;
        uint32_t previousFrameNumber;
        uint32_t frameNumber;
    };
    struct StateWrite {
        uint64_t timestampNs;
        std::string key;
        PropertyValue value;  // may be no value
    };
    struct FirmwareEvent {
        uint64_t timestampNs;
        uint8_t event;  // 0 is a reset
    };

    // Frames in the order playback delivers them (timestamp order).
    explicit RecordingSummary(uint64_t containerVersion);
    void add(const PipelineRecording::Frame& frame);
    // Sorts a copy of the frame order (stable, by timestamp) and adds every frame.
    static RecordingSummary of(const PipelineRecording::FrameList& frames, uint64_t containerVersion);

    uint64_t containerVersion() const noexcept { return _containerVersion; }
    uint64_t frameCount() const noexcept { return _stateFrames + _inputReportFrames + _metadataFrames; }
    uint64_t imageCount() const noexcept { return _imageFrames; }
    uint64_t resetCount() const noexcept;
    std::optional<uint64_t> firstTimestampNs() const noexcept { return _firstTimestampNs; }
    uint64_t durationNs() const noexcept { return _firstTimestampNs ? _lastTimestampNs - *_firstTimestampNs : 0; }
    const std::vector<Gap>& gaps() const noexcept { return _gaps; }
    const std::vector<StateWrite>& stateWrites() const noexcept { return _stateWrites; }
    const std::vector<FirmwareEvent>& firmwareEvents() const noexcept { return _firmwareEvents; }
    const std::map<std::string, uint64_t>& metadataKeys() const noexcept { return _metadataKeys; }

    // The readable summary of `info`, lines ending in "\n".
    std::string text() const;
    // The same figures as one JSON object (compact), with every gap, state write and firmware event.
    std::string json() const;

private:
    void addInputReport(const PipelineRecording::Frame& frame);

    uint64_t _containerVersion;
    uint64_t _stateFrames = 0;
    uint64_t _inputReportFrames = 0;
    uint64_t _imageFrames = 0;
    uint64_t _firmwareEventFrames = 0;
    uint64_t _metadataFrames = 0;
    std::map<std::string, uint64_t> _metadataKeys;
    std::optional<uint64_t> _firstTimestampNs;
    uint64_t _lastTimestampNs = 0;
    std::optional<uint32_t> _firstFrameNumber;
    uint32_t _lastFrameNumber = 0;
    std::vector<Gap> _gaps;
    std::vector<StateWrite> _stateWrites;
    std::vector<FirmwareEvent> _firmwareEvents;
};

}  // namespace ZeltoTouch::Tools

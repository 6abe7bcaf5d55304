#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"
#include "Shared/Algs/Algs.h"
#include "Shared/Pipeline/InputReport.h"
#include "Tools/RecordingSummary.h"

namespace ZeltoTouch::Tools {

// What the inspect report shows of a replay, collected frame by frame as the pipeline handles
// them: each image with the algorithm's state after it, the gesture events, and accelerometer
// samples. Its JSON form is the data the report page draws.
class InspectTrace {
public:
    // The algorithm's state after one image frame.
    struct ImageFrame {
        uint64_t timestampNs = 0;  // recorded
        uint32_t frameNumber = 0;
        uint32_t timeMs = 0;  // device time
        std::array<int16_t, kPixelCount> raw{};
        std::array<int32_t, kPixelCount> scaled{};
        uint16_t activeChannels = 0;  // bit i: channel i is active
        float touchScore = 0;
        float frameScore = 0;  // the frame classifier's score
        float tapScore = 0;
        float sd = 0;
        float tsd = 0;
        float timeDurationRatio = 0;
        int32_t nonActivePixels = 0;
        uint32_t region = 0;
        std::string label;  // the gesture state, as the touch state description ends
    };
    struct Event {
        uint64_t timestampNs = 0;
        std::string kind;  // as in replay's jsonl lines
        int64_t region = 0;
        int64_t frameNumber = 0;
        bool digitizer = false;  // only digitizer events carry a region and frame number
    };
    struct AccelSample {
        uint64_t timestampNs = 0;
        float x = 0, y = 0, z = 0;  // in g
    };

    void addImage(uint64_t timestampNs, const InputReport::Image& image, const Algs& algs);
    void addEvents(uint64_t timestampNs, const HIDEventList& events);
    // Keeps "Accel" samples (a dictionary of "X", "Y", "Z"); other metadata is ignored.
    void addMetadata(uint64_t timestampNs, std::string_view key, const PropertyValue& value);

    const std::vector<ImageFrame>& images() const noexcept { return _images; }
    const std::vector<Event>& events() const noexcept { return _events; }
    const std::vector<AccelSample>& accelSamples() const noexcept { return _accel; }

    // The page's data: times in milliseconds since the recording's first frame, the summary,
    // the final statistics ({"EventStats": ..., "DebugInfo": ...}) and the sensor's layout.
    std::string json(std::string_view source, const RecordingSummary& summary, const PropertyValue& finalStats) const;

private:
    std::vector<ImageFrame> _images;
    std::vector<Event> _events;
    std::vector<AccelSample> _accel;
};

// The gesture state label at the end of a touch state description ("TAP 180ms ActiveRegion=1
// ABOVENOISE"; empty when idle).
std::string_view stateLabelOfDescription(std::string_view description);

}  // namespace ZeltoTouch::Tools

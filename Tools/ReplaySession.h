#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"
#include "Shared/Pipeline/InputReport.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"

namespace ZeltoTouch::Tools {

// A state write given on the command line as KEY=VALUE, e.g. "Algs.EnableTapSuppression=0".
struct StateWrite {
    std::string key;
    PropertyValue value;

    // VALUE is taken as JSON when it parses as JSON, otherwise as a string. Throws
    // std::invalid_argument when there is no "=" or the key is empty.
    static StateWrite parse(std::string_view assignment);
};

struct ReplayOptions {
    float speed = 1.0f;                  // pacing factor for real-time playback
    bool fast = false;                   // deliver every frame without waiting
    std::vector<StateWrite> stateWrites;  // written before the first frame
};

// One frame as the pipeline has just handled it.
struct DeliveredFrame {
    const PipelineRecording::Frame& frame;
    size_t index;                               // position in timestamp order, from 0
    std::optional<InputReport::Image> image;   // for an image report
    const HIDEventList& events;                 // what the frame produced, in order; often empty
};

// Plays a recording through a fresh Pipeline, as the service would have processed it, and
// reports every frame after the pipeline has handled it. The frames are played in timestamp
// order (stable), each delivered with its recorded spacing.
class ReplaySession {
public:
    ReplaySession(PipelineRecording recording, ReplayOptions options);

    // Writes the options' state keys, then plays every frame; calls onFrame after each.
    // Not reentrant. With options.fast the host clock is replaced for the duration by one that
    // does not sleep.
    void run(const std::function<void(const DeliveredFrame&)>& onFrame);

    size_t frameCount() const noexcept { return _recording.frames().size(); }
    Pipeline& pipeline() noexcept { return *_pipeline; }

private:
    std::shared_ptr<Pipeline> _pipeline;
    PipelineRecording _recording;
    ReplayOptions _options;
};

}  // namespace ZeltoTouch::Tools

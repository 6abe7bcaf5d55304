#pragma once

#include <cstdint>
#include <list>

#include "Host/PropertyValue.h"
#include "Shared/Pipeline/PipelineInput.h"

namespace ZeltoTouch {

// One accelerometer sample as the service received it.
struct AccelSample {
    uint64_t timestamp = 0;  // mach time of arrival
    float x = 0;
    float y = 0;
    float z = 0;
};

// The metadata key under which accelerometer samples are recorded.
inline constexpr const char* kAccelMetadataKey = "Accel";

// Keeps the motion around each gesture: while nothing is needed the latest samples are
// buffered; once a digitizer event arms it, the buffered history and the samples that follow
// go to the recording as "Accel" metadata. The service sets the fields under its pipeline lock.
struct AccelBookkeeping {
    static constexpr size_t kHistoryLimit = 100;
    static constexpr uint64_t kSamplesPerGesture = 100;

    uint64_t samplesNeededCount = 0;  // still to forward; 0 means only buffer
    std::list<AccelSample> samples;   // oldest first, at most kHistoryLimit

    // A digitizer event went out: forward the history and the next samples. Replaces the count.
    void arm() noexcept { samplesNeededCount = kSamplesPerGesture; }
    // Buffers the sample, or flushes the history and forwards the sample into recording.
    void handleSample(const AccelSample& sample, PipelineInput& recording);

    // The metadata value of a sample: {"X", "Y", "Z"} as 32-bit float numbers.
    static PropertyValue metadataValue(const AccelSample& sample);
};

}  // namespace ZeltoTouch

#include "Service/AccelBookkeeping.h"

namespace ZeltoTouch {

void AccelBookkeeping::handleSample(const AccelSample& sample, PipelineInput& recording) {
    if (samplesNeededCount == 0) {
        samples.push_back(sample);
        while (samples.size() > kHistoryLimit) samples.pop_front();
        return;
    }
    while (!samples.empty()) {
        const AccelSample& buffered = samples.front();
        recording.handleMetadata(buffered.timestamp, kAccelMetadataKey, metadataValue(buffered));
        samples.pop_front();
    }
    recording.handleMetadata(sample.timestamp, kAccelMetadataKey, metadataValue(sample));
    --samplesNeededCount;
}

PropertyValue AccelBookkeeping::metadataValue(const AccelSample& sample) {
    return PropertyValue::dictionary({
        {"X", PropertyValue::fromFloat(sample.x)},
        {"Y", PropertyValue::fromFloat(sample.y)},
        {"Z", PropertyValue::fromFloat(sample.z)},
    });
}

}  // namespace ZeltoTouch

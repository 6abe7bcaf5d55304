#pragma once

#include <cstdint>
#include <string>

#include "Host/PropertyValue.h"

namespace ZeltoTouch {

// What flows into a stage: timestamped state writes, input reports and metadata.
// Timestamps are mach time. Stages can be chained (a recorder in front of the pipeline)
// without knowing about each other beyond this interface.
class PipelineInput {
public:
    virtual void setState(uint64_t timestampMach, const std::string& key, const PropertyValue& value) = 0;
    virtual void handleInputReport(uint64_t timestampMach, const uint8_t* bytes, uint64_t length) = 0;
    virtual void handleMetadata(uint64_t timestampMach, const std::string& key, const PropertyValue& value) = 0;

protected:
    ~PipelineInput() = default;  // stages are owned through their concrete types
};

// What a stage answers: state reads by key.
class PipelineOutput {
public:
    virtual PropertyValue getState(const std::string& key) = 0;

protected:
    ~PipelineOutput() = default;
};

}  // namespace ZeltoTouch

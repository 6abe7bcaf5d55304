#pragma once

#include <array>
#include <cstdint>
#include <string>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"
#include "Shared/Pipeline/InputReport.h"

namespace ZeltoTouch {

// The touch algorithm as the pipeline sees it: one call per image frame or firmware reset,
// each returning the gesture events of that frame. (Being filled in: for now no frame
// produces an event and no key is known.)
class Algs {
public:
    Algs() = default;

    HIDEventList handleImage(const InputReport::Image& image);
    HIDEventList handleReset();

    PropertyValue getState(const std::string& key) const;
    void setState(const std::string& key, const PropertyValue& value);
};

}  // namespace ZeltoTouch

#pragma once

#include <cstdint>
#include <ostream>
#include <string>
#include <vector>

#include "Host/HIDEvent.h"

namespace ZeltoTouch::Reliability {

// One outgoing event, as far as a comparison or a grammar check needs it.
struct StreamEvent {
    uint32_t type = 0;
    uint32_t phase = 0;
    uint32_t eventMask = 0;
    double region = 0;
    int64_t frameNumber = 0;

    static StreamEvent of(const HIDEvent& event);
    friend bool operator==(const StreamEvent&, const StreamEvent&) = default;
};
std::ostream& operator<<(std::ostream& out, const StreamEvent& event);

// Checks that a stream of outgoing events is one the gesture machine can say: each event is one
// of the six gesture events or the reset event, with its documented mask, phase and region, and
// hold events nest (a change or an end only inside a hold, a start only outside one). Returns
// the first violation, or an empty string.
std::string gestureGrammarViolation(const std::vector<StreamEvent>& events);

}  // namespace ZeltoTouch::Reliability

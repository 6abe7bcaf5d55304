#pragma once

#include <cstdint>
#include <vector>

#include "Host/HIDEvent.h"

namespace ZeltoTouch::Fuzz {

// What an outgoing event says, for comparing a live run with its replay.
struct EventTraceEntry {
    uint32_t type = 0;
    uint32_t phase = 0;
    uint32_t eventMask = 0;
    double x = 0, y = 0;
    int64_t frameNumber = 0;
    uint64_t timestamp = 0;

    static EventTraceEntry of(const HIDEvent& event);
    friend bool operator==(const EventTraceEntry&, const EventTraceEntry&) = default;
};

using EventTrace = std::vector<EventTraceEntry>;

}  // namespace ZeltoTouch::Fuzz

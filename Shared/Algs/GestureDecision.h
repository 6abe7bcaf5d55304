#pragma once

#include <cstdint>

#include "Shared/Algs/HandStats.h"

namespace ZeltoTouch {

enum class GestureEvent : uint8_t { None, MayBegin, HoldStart, HoldChange, HoldEnd, Tap, Cancel };

// What one frame does: at most one event, and whether the gesture state is reset after it.
struct GestureDecision {
    GestureEvent event;
    bool reset;

    friend bool operator==(const GestureDecision&, const GestureDecision&) = default;
};

// The gesture state machine's step, from the hand's flags after the frame's update and the
// phase of the last event produced.
GestureDecision decideGesture(const HandStats& hand, uint16_t lastEventPhase) noexcept;

}  // namespace ZeltoTouch

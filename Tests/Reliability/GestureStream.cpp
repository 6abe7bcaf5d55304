#include "Tests/Reliability/GestureStream.h"

#include <sstream>

namespace ZeltoTouch::Reliability {

namespace {

constexpr uint32_t kHoldMask = 2;
constexpr uint32_t kTapMask = 0x20000;

bool carriesRegion(const StreamEvent& event) { return event.region == 1.0 || event.region == 2.0 || event.region == 3.0; }

std::string describe(const StreamEvent& event, size_t index) {
    std::ostringstream text;
    text << "event " << index << " " << event;
    return text.str();
}

}  // namespace

StreamEvent StreamEvent::of(const HIDEvent& event) {
    return {event.type(), event.phase(), event.eventMask(), event.y(),
            event.integerValue(kHIDEventFieldDigitizerFrameNumber)};
}

std::ostream& operator<<(std::ostream& out, const StreamEvent& event) {
    return out << "{type " << event.type << ", phase " << event.phase << ", mask " << event.eventMask << ", region "
               << event.region << ", frame " << event.frameNumber << "}";
}

std::string gestureGrammarViolation(const std::vector<StreamEvent>& events) {
    bool holdOpen = false;
    for (size_t i = 0; i < events.size(); ++i) {
        const StreamEvent& e = events[i];
        if (e.type == kHIDEventTypeVendorDefined) {  // a firmware reset has ended whatever was going on
            holdOpen = false;
            continue;
        }
        if (e.type != kHIDEventTypeDigitizer) return describe(e, i) + ": not a digitizer event";
        const bool regionOK = e.phase == kHIDEventPhaseCancelled ? e.region == 0.0 : carriesRegion(e);
        if (!regionOK) return describe(e, i) + ": region out of place";
        if (e.eventMask == kHoldMask) {
            if (e.phase == kHIDEventPhaseBegan) {
                if (holdOpen) return describe(e, i) + ": hold start inside a hold";
                holdOpen = true;
            } else if (e.phase == kHIDEventPhaseChanged || e.phase == kHIDEventPhaseEnded) {
                if (!holdOpen) return describe(e, i) + ": hold change or end outside a hold";
                holdOpen = e.phase == kHIDEventPhaseChanged;
            } else {
                return describe(e, i) + ": hold event with an unknown phase";
            }
        } else if (e.eventMask == kTapMask) {
            if (e.phase != 0) return describe(e, i) + ": tap with a phase";
        } else if (e.eventMask != 0 || (e.phase != kHIDEventPhaseMayBegin && e.phase != kHIDEventPhaseCancelled)) {
            return describe(e, i) + ": unknown event";
        } else if (e.phase == kHIDEventPhaseCancelled) {
            holdOpen = false;
        }
    }
    return {};
}

}  // namespace ZeltoTouch::Reliability

#include "Fuzz/EventTrace.h"

namespace ZeltoTouch::Fuzz {

EventTraceEntry EventTraceEntry::of(const HIDEvent& event) {
    return {event.type(), event.phase(), event.eventMask(), event.x(), event.y(),
            event.integerValue(kHIDEventFieldDigitizerFrameNumber), event.timestamp()};
}

}  // namespace ZeltoTouch::Fuzz

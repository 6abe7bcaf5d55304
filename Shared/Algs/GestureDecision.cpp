#include "Shared/Algs/GestureDecision.h"

#include "Host/HIDEvent.h"

namespace ZeltoTouch {

GestureDecision decideGesture(const HandStats& h, uint16_t lastEventPhase) noexcept {
    using enum GestureEvent;
    const bool holdGoesOn = h.holding && h.wasHolding;
    // The first rule that applies decides.
    if (h.touching && !h.wasTouching)                 return {MayBegin, false};    // 1 touch starts
    if (h.holding && !h.wasHolding)                   return {HoldStart, false};   // 2 hold starts
    if (holdGoesOn && h.previousRegion != h.activeRegion) return {HoldChange, false};  // 3 hold moves
    if (holdGoesOn) { /* same region: go on at rule 6 */ }                        // 4 hold goes on
    else if (!h.holding && h.wasHolding)              return {HoldEnd, true};      // 5 hold ends
    if (h.tap)                                        return {Tap, true};          // 6 tap
    if (h.touching)                                   return {None, false};        // 7 still touching
    if (!h.wasTouching)                               return {None, false};        // 8 idle
    if (lastEventPhase == kHIDEventPhaseMayBegin)     return {Cancel, true};       // 9 neither tap nor hold
    return {None, true};                                                           // 10 silent end
}

}  // namespace ZeltoTouch

#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "Host/HIDEvent.h"

namespace ZeltoTouch::Tools {

// The gesture an event stands for: "may-begin", "hold-start", "hold-change", "hold-end", "tap",
// "cancel", "firmware-reset"; "digitizer", "vendor-defined" or "other" for an event the pipeline
// does not produce.
std::string_view eventKind(const HIDEvent& event);

// One line (without its newline) per event, the contract for scripts:
//   {"event": E, "region": R, "phase": P, "eventMask": M, "frameNumber": F, "t": T}  (digitizer)
//   {"event": E, "usagePage": U, "usage": V, "t": T}                                 (vendor-defined)
// T is timestampNs: the recorded time of the frame that produced the event.
std::string eventJSONLine(const HIDEvent& event, uint64_t timestampNs);

// One line (without its newline) for a person: seconds with millisecond precision, the kind,
// the region's name and the frame number, e.g. "    12.345 s  tap          volume up     frame 1234".
std::string eventTextLine(const HIDEvent& event, uint64_t timeNs);

}  // namespace ZeltoTouch::Tools

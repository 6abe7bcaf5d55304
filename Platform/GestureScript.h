#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Shared/Algs/Pixel.h"

namespace ZeltoTouch::Platform {

// A scripted session on the simulated sensor: gesture steps played one after another. Contact
// steps include the finger's landing and lifting within their duration and are not separated
// by themselves: put an idle step between gestures that must stay apart.
//
// Text form (GestureScriptParser), one step per line; "#" starts a comment; blank lines are
// ignored; durations are whole milliseconds ("120ms") or seconds ("2s"); regions are
// play-pause, volume-up and volume-down:
//
//   tap REGION DURATION                       a short firm touch
//   hold REGION DURATION [reset-after TIME]   a long firm touch; optionally a firmware reset
//                                             TIME after the finger landed
//   slide FROM TO DURATION                    a firm touch that lands on FROM, moves quickly
//                                             to TO at half time, and lifts there
//   brush REGION DURATION                     a light finger hovering above noise that grazes
//                                             the region briefly near the end (a touch the
//                                             algorithm should reject); 200ms or more
//   palm DURATION                             a broad contact over the whole surface
//   idle DURATION                             no contact
//   reset                                     a firmware reset report (takes no time)
struct GestureStep {
    enum class Kind { Tap, Hold, Slide, Brush, Palm, Idle, Reset };

    Kind kind = Kind::Idle;
    PixelRegion region = PixelRegion::None;    // tap, hold, brush; slide: where it starts
    PixelRegion toRegion = PixelRegion::None;  // slide: where it ends
    uint32_t durationMs = 0;                   // 0 for reset
    std::optional<uint32_t> resetAfterMs;      // hold only
    int line = 0;                              // source line, 0 when built in code

    friend bool operator==(const GestureStep&, const GestureStep&) = default;
};

struct GestureScript {
    std::vector<GestureStep> steps;

    uint32_t durationMs() const noexcept;
};

// The step keyword and the region names of the text form.
std::string_view gestureStepKeyword(GestureStep::Kind kind) noexcept;
std::string_view regionScriptName(PixelRegion region) noexcept;

// Reads the text form. Throws std::invalid_argument with a message that names the line, e.g.
// "line 3: unknown region \"volume-middle\" (expected play-pause, volume-up or volume-down)".
class GestureScriptParser {
public:
    static GestureScript parse(std::string_view text);

private:
    static GestureStep parseLine(const std::vector<std::string_view>& words, int line);
};

}  // namespace ZeltoTouch::Platform

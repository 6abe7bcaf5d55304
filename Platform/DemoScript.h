#pragma once

#include <string_view>

namespace ZeltoTouch::Platform {

// The built-in demo session (about twelve seconds): a tap on each region, a volume hold, a
// hold that slides from play/pause to volume up, a light brush the algorithm cancels, and a
// firmware reset during a volume-down hold. The reset ends the hold; the finger still resting
// there starts a new touch that becomes a hold again before it lifts.
inline constexpr std::string_view kDemoScript = R"(# ZeltoTouch demo session
idle 500ms
tap play-pause 120ms
idle 700ms
tap volume-up 120ms
idle 700ms
tap volume-down 120ms
idle 1200ms
hold volume-up 1200ms
idle 1000ms
slide play-pause volume-up 1800ms
idle 1000ms
brush volume-down 250ms
idle 1000ms
hold volume-down 1600ms reset-after 700ms
idle 500ms
)";

}  // namespace ZeltoTouch::Platform

#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"

namespace ZeltoTouch::Bench {

// A realistic stretch of use: rest, a tap, a long hold, a slide, a rejected brush and a palm.
// About 4.4 s of reports at 100 Hz per cycle.
inline constexpr const char* kSessionCycle = R"(
idle 400ms
tap play-pause 120ms
idle 300ms
hold volume-up 1500ms
idle 300ms
slide volume-down volume-up 600ms
idle 300ms
brush play-pause 400ms
palm 500ms
)";

// The sensor's reports for `cycles` cycles in a row, with frame numbers counting on throughout.
inline std::vector<Platform::SimulatedReport> sessionReports(int cycles) {
    std::string text;
    for (int i = 0; i < cycles; ++i) text += kSessionCycle;
    return Platform::SensorReportGenerator(Platform::GestureScriptParser::parse(text)).generateAll();
}

inline constexpr uint64_t kNanosecondsPerMillisecond = 1000000;

}  // namespace ZeltoTouch::Bench

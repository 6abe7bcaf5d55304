// The simulated sensor's gestures, judged by the touch algorithm itself: a scripted tap must
// come out as a tap, a hold as a hold, a brush as a cancel.
#include <gtest/gtest.h>

#include <string>

#include "Platform/DemoScript.h"
#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Algs/Algs.h"

namespace ZeltoTouch::Platform {
namespace {

std::string gestureName(const HIDEvent& event) {
    switch (event.phase()) {
        case kHIDEventPhaseMayBegin: return "may-begin";
        case kHIDEventPhaseBegan: return "hold-start";
        case kHIDEventPhaseChanged: return "hold-change";
        case kHIDEventPhaseEnded: return "hold-end";
        case kHIDEventPhaseCancelled: return "cancel";
        default: return event.eventMask() == 0x20000 ? "tap" : "unknown";
    }
}

// The algorithm's events for a script, as "name/region" words ("cancel" has no region).
std::string gesturesOf(std::string_view scriptText, uint64_t noiseSeed = 0x5EED) {
    Algs algs;
    std::string gestures;
    SensorReportGenerator generator(GestureScriptParser::parse(scriptText), {.noiseSeed = noiseSeed});
    for (const SimulatedReport& report : generator.generateAll()) {
        HIDEventList events;
        if (auto image = InputReport::Image::parse(report.bytes.data(), report.bytes.size())) {
            events = algs.handleImage(*image);
        } else if (InputReport::FirmwareEvent::parse(report.bytes.data(), report.bytes.size())) {
            events = algs.handleReset();
        }
        for (const HIDEventRef& event : events) {
            if (!gestures.empty()) gestures += " ";
            gestures += gestureName(*event);
            if (event->phase() != kHIDEventPhaseCancelled) gestures += "/" + std::to_string(static_cast<int>(event->y()));
        }
    }
    return gestures;
}

struct GestureCase {
    const char* script;
    const char* expected;
};

class ScriptedGesture : public testing::TestWithParam<GestureCase> {};

TEST_P(ScriptedGesture, IsRecognisedByTheTouchAlgorithm) {
    EXPECT_EQ(gesturesOf(GetParam().script), GetParam().expected) << GetParam().script;
}

INSTANTIATE_TEST_SUITE_P(
    FingerModel, ScriptedGesture,
    testing::Values(GestureCase{"idle 200ms\ntap play-pause 120ms\nidle 300ms", "may-begin/1 tap/1"},
                    GestureCase{"idle 200ms\ntap volume-down 120ms\nidle 300ms", "may-begin/2 tap/2"},
                    GestureCase{"idle 200ms\ntap volume-up 120ms\nidle 300ms", "may-begin/3 tap/3"},
                    GestureCase{"idle 200ms\ntap volume-up 60ms\nidle 300ms", "may-begin/3 tap/3"},
                    GestureCase{"idle 200ms\nhold play-pause 900ms\nidle 300ms", "may-begin/1 hold-start/1 hold-end/1"},
                    GestureCase{"idle 200ms\nhold volume-down 900ms\nidle 300ms", "may-begin/2 hold-start/2 hold-end/2"},
                    GestureCase{"idle 200ms\nhold volume-up 2s\nidle 300ms", "may-begin/3 hold-start/3 hold-end/3"},
                    GestureCase{"idle 200ms\nslide play-pause volume-up 1800ms\nidle 300ms",
                                "may-begin/1 hold-start/1 hold-change/3 hold-end/3"},
                    GestureCase{"idle 200ms\nslide volume-down play-pause 1800ms\nidle 300ms",
                                "may-begin/2 hold-start/2 hold-change/1 hold-end/1"},
                    GestureCase{"idle 200ms\nbrush volume-down 250ms\nidle 300ms", "may-begin/2 cancel"},
                    GestureCase{"idle 200ms\nbrush play-pause 400ms\nidle 300ms", "may-begin/1 cancel"},
                    GestureCase{"idle 200ms\nbrush volume-up 250ms\nidle 300ms", "may-begin/3 cancel"},
                    GestureCase{"idle 200ms\nhold volume-up 1600ms reset-after 700ms\nidle 300ms",
                                "may-begin/3 hold-start/3 hold-end/3 may-begin/3 hold-start/3 hold-end/3"},
                    GestureCase{"idle 200ms\npalm 400ms\nidle 300ms", "may-begin/1 cancel"},
                    GestureCase{"idle 200ms\npalm 1500ms\nidle 300ms", "may-begin/1 cancel"},
                    GestureCase{"idle 500ms\nreset\nidle 500ms", ""}));

// The noise must not decide a gesture: the demo comes out the same whatever the seed.
TEST(DemoScript, PlaysEveryGestureItPromises) {
    for (uint64_t seed : {0x5EEDu, 1u, 2u, 3u, 0xDEADBEEFu}) {
        EXPECT_EQ(gesturesOf(kDemoScript, seed),
                  "may-begin/1 tap/1 "
                  "may-begin/3 tap/3 "
                  "may-begin/2 tap/2 "
                  "may-begin/3 hold-start/3 hold-end/3 "
                  "may-begin/1 hold-start/1 hold-change/3 hold-end/3 "
                  "may-begin/2 cancel "
                  "may-begin/2 hold-start/2 hold-end/2 may-begin/2 hold-start/2 hold-end/2")
            << "noise seed " << seed;
    }
}

}  // namespace
}  // namespace ZeltoTouch::Platform

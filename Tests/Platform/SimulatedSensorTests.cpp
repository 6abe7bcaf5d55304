// The simulated sensor: its gesture scripts, the reports it makes of them (judged by the touch
// algorithm itself) and its answers as a device.
#include <gtest/gtest.h>

#include <stdexcept>

#include "Platform/DemoScript.h"
#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Platform/SimulatedSensor.h"
#include "Shared/Algs/Algs.h"
#include "Tools/EventLines.h"

namespace ZeltoTouch::Platform {
namespace {

using Kind = GestureStep::Kind;

TEST(GestureScriptParser, ReadsEveryStepKindWithCommentsAndBlankLines) {
    const GestureScript script = GestureScriptParser::parse(
        "# a session\n"
        "\n"
        "tap volume-up 120ms   # firm\n"
        "hold play-pause 2s reset-after 700ms\n"
        "slide play-pause volume-down 1500ms\n"
        "brush volume-down 250ms\n"
        "palm 400ms\n"
        "\tidle 300ms\r\n"
        "reset\n");
    const std::vector<GestureStep> expected = {
        {Kind::Tap, PixelRegion::VolumeUp, PixelRegion::None, 120, std::nullopt, 3},
        {Kind::Hold, PixelRegion::PlayPause, PixelRegion::None, 2000, 700u, 4},
        {Kind::Slide, PixelRegion::PlayPause, PixelRegion::VolumeDown, 1500, std::nullopt, 5},
        {Kind::Brush, PixelRegion::VolumeDown, PixelRegion::None, 250, std::nullopt, 6},
        {Kind::Palm, PixelRegion::None, PixelRegion::None, 400, std::nullopt, 7},
        {Kind::Idle, PixelRegion::None, PixelRegion::None, 300, std::nullopt, 8},
        {Kind::Reset, PixelRegion::None, PixelRegion::None, 0, std::nullopt, 9},
    };
    EXPECT_EQ(script.steps, expected);
    EXPECT_EQ(script.durationMs(), 120u + 2000 + 1500 + 250 + 400 + 300);
}

TEST(GestureScriptParser, ErrorsNameTheLineAndTheProblem) {
    const std::string duration = " (expected a positive whole number with ms or s, e.g. 120ms or 2s)";
    const struct {
        const char* line;
        std::string message;
    } cases[] = {
        {"tapp volume-up 120ms", R"(unknown step "tapp" (expected tap, hold, slide, brush, palm, idle or reset))"},
        {"tap volume-middle 120ms", R"(unknown region "volume-middle" (expected play-pause, volume-up or volume-down))"},
        {"tap volume-up 120", R"(bad duration "120")" + duration},
        {"idle 0ms", R"(bad duration "0ms")" + duration},
        {"idle -5ms", R"(bad duration "-5ms")" + duration},
        {"idle 1.5s", R"(bad duration "1.5s")" + duration},
        {"idle 5000000s", R"(bad duration "5000000s")" + duration},
        {"tap volume-up", R"(wrong arguments for tap (expected "tap REGION DURATION"))"},
        {"reset now", R"(wrong arguments for reset (expected "reset"))"},
        {"tap volume-up 120ms reset-after 50ms", R"(wrong arguments for tap (expected "tap REGION DURATION"))"},
        {"hold volume-up 800ms reset-before 50ms",
         R"(wrong arguments for hold (expected "hold REGION DURATION [reset-after TIME]"))"},
        {"hold volume-up 800ms reset-after 800ms", "reset-after 800ms is not within the hold of 800ms"},
        {"slide volume-up volume-up 800ms", "slide needs two different regions"},
    };
    for (const auto& c : cases) {
        try {
            GestureScriptParser::parse(std::string("idle 10ms\n# comment\n") + c.line + "\nidle 10ms\n");
            ADD_FAILURE() << "no error for " << c.line;
        } catch (const std::invalid_argument& error) {
            EXPECT_EQ(error.what(), "line 3: " + c.message);
        }
    }
}

std::vector<SimulatedReport> reportsOf(const char* script, SensorReportGenerator::Options options = {}) {
    return SensorReportGenerator(GestureScriptParser::parse(script), options).generateAll();
}

TEST(SensorReportGenerator, SendsOneWellFormedImagePerFramePeriodWithTheSeedsNoise) {
    const auto reports = reportsOf("idle 100ms\ntap volume-up 120ms\nidle 80ms", {.framePeriodMs = 10, .startTimeMs = 5000});
    ASSERT_EQ(reports.size(), 30u);
    for (size_t i = 0; i < reports.size(); ++i) {
        ASSERT_EQ(reports[i].bytes.size(), 73u);
        const auto image = InputReport::Image::parse(reports[i].bytes.data(), reports[i].bytes.size());
        ASSERT_TRUE(image);
        EXPECT_EQ(image->frameNumber, i);
        EXPECT_EQ(image->timestampMs, 5000 + 10 * i);
        EXPECT_EQ(reports[i].scriptTimeMs, 10 * i);
        for (size_t channel = 0; channel < kPixelCount; ++channel) {
            EXPECT_EQ(image->unsignedPixels[channel], SensorReportGenerator::kBaselineCounts + image->signedPixels[channel]);
        }
    }
    // The noise comes from the seed alone.
    const auto fourthReport = [](uint64_t seed) { return reportsOf("tap volume-up 100ms", {.noiseSeed = seed})[3].bytes; };
    EXPECT_EQ(fourthReport(7), fourthReport(7));
    EXPECT_NE(fourthReport(7), fourthReport(8));
}

TEST(SensorReportGenerator, AResetIsAFirmwareEventAndRestartsTheFrameCounter) {
    const auto reports = reportsOf("idle 30ms\nreset\nidle 20ms\nreset");
    ASSERT_EQ(reports.size(), 7u);
    const std::vector<uint8_t> expectedIDs = {1, 1, 1, 2, 1, 1, 2};
    const std::vector<uint32_t> expectedFrames = {0, 1, 2, 0, 0, 1, 0};
    for (size_t i = 0; i < reports.size(); ++i) {
        EXPECT_EQ(reports[i].bytes[0], expectedIDs[i]) << i;
        if (auto image = InputReport::Image::parse(reports[i].bytes.data(), reports[i].bytes.size())) {
            EXPECT_EQ(image->frameNumber, expectedFrames[i]) << i;
        } else {
            auto event = InputReport::FirmwareEvent::parse(reports[i].bytes.data(), reports[i].bytes.size());
            ASSERT_TRUE(event) << i;
            EXPECT_EQ(reports[i].bytes.size(), 10u);
            EXPECT_EQ(event->event, InputReport::FirmwareEvent::kReset);
        }
    }
    EXPECT_EQ(reports[3].scriptTimeMs, 30u);
    EXPECT_EQ(reports[6].scriptTimeMs, 50u);
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
            gestures += Tools::eventKind(*event);
            if (event->phase() != kHIDEventPhaseCancelled) gestures += "/" + std::to_string(static_cast<int>(event->y()));
        }
    }
    return gestures;
}

// The demo below covers the 120 ms taps, a slide onto volume up, a brush and a hold cut by a reset.
TEST(SimulatedSensor, ScriptedGesturesAreRecognisedByTheTouchAlgorithm) {
    const std::pair<const char*, const char*> cases[] = {
        {"tap volume-up 60ms", "may-begin/3 tap/3"},
        {"hold play-pause 900ms", "may-begin/1 hold-start/1 hold-end/1"},
        {"hold volume-down 900ms", "may-begin/2 hold-start/2 hold-end/2"},
        {"hold volume-up 2s", "may-begin/3 hold-start/3 hold-end/3"},
        {"slide volume-down play-pause 1800ms", "may-begin/2 hold-start/2 hold-change/1 hold-end/1"},
        {"brush play-pause 400ms", "may-begin/1 cancel"},
        {"brush volume-up 250ms", "may-begin/3 cancel"},
        {"palm 400ms", "may-begin/1 cancel"},
        {"palm 1500ms", "may-begin/1 cancel"},
        {"idle 300ms\nreset\nidle 300ms", ""},
    };
    for (const auto& [step, expected] : cases) {
        EXPECT_EQ(gesturesOf("idle 200ms\n" + std::string(step) + "\nidle 300ms"), expected) << step;
    }
}

// The noise must not decide a gesture: the demo comes out the same whatever the seed.
TEST(SimulatedSensor, DemoPlaysEveryGestureItPromises) {
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

TEST(SimulatedSensor, AnswersFeatureReportsRefusesWhatItCannotAnswerAndFailsWhenTold) {
    SimulatedSensor sensor;
    uint8_t buffer[128];
    uint64_t length = sizeof buffer;
    ASSERT_EQ(sensor.getReport(kHIDReportTypeFeature, 0x1F, buffer, length), kZeltoSuccess);
    EXPECT_EQ(FeatureReport::FactoryResetHoldDuration::parse(buffer, length), SimulatedSensor::kFactoryResetHoldDurationMs);
    const auto status = [&](HIDReportType type, uint32_t reportID, uint64_t length) {
        return sensor.getReport(type, reportID, buffer, length);
    };
    EXPECT_EQ(status(kHIDReportTypeFeature, 0x77, sizeof buffer), SimulatedSensor::kStatusNotFound);
    // Report 0x04 needs 8 bytes: never cut silently.
    EXPECT_EQ(status(kHIDReportTypeFeature, 0x04, 3), SimulatedSensor::kStatusBadArgument);
    EXPECT_EQ(status(kHIDReportTypeInput, 0x04, sizeof buffer), kZeltoUnsupported);
    sensor.failFeatureReport(0x04, static_cast<ZeltoReturn>(0xE00002D8u));
    EXPECT_EQ(status(kHIDReportTypeFeature, 0x04, sizeof buffer), static_cast<ZeltoReturn>(0xE00002D8u));
    EXPECT_EQ(status(kHIDReportTypeFeature, 0x10, sizeof buffer), kZeltoSuccess);
    sensor.clearFeatureReportFailures();
    EXPECT_EQ(status(kHIDReportTypeFeature, 0x04, sizeof buffer), kZeltoSuccess);
}

}  // namespace
}  // namespace ZeltoTouch::Platform

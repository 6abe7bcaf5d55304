#include <gtest/gtest.h>

#include <stdexcept>

#include "Platform/DemoScript.h"
#include "Platform/GestureScript.h"

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

TEST(GestureScriptParser, ReadsTheDemoScript) {
    const GestureScript demo = GestureScriptParser::parse(kDemoScript);
    EXPECT_EQ(demo.steps.size(), 15u);
    EXPECT_GE(demo.durationMs(), 10000u);
}

struct BadLine {
    const char* text;
    const char* message;
};

class GestureScriptErrors : public testing::TestWithParam<BadLine> {};

TEST_P(GestureScriptErrors, NameTheLineAndTheProblem) {
    try {
        GestureScriptParser::parse(std::string("idle 10ms\n# comment\n") + GetParam().text + "\nidle 10ms\n");
        FAIL() << "no error for " << GetParam().text;
    } catch (const std::invalid_argument& error) {
        EXPECT_STREQ(error.what(), GetParam().message);
    }
}

INSTANTIATE_TEST_SUITE_P(
    BadLines, GestureScriptErrors,
    testing::Values(
        BadLine{"tapp volume-up 120ms",
                "line 3: unknown step \"tapp\" (expected tap, hold, slide, brush, palm, idle or reset)"},
        BadLine{"tap volume-middle 120ms",
                "line 3: unknown region \"volume-middle\" (expected play-pause, volume-up or volume-down)"},
        BadLine{"tap volume-up 120", "line 3: bad duration \"120\" (expected a positive whole number with ms or s, e.g. 120ms or 2s)"},
        BadLine{"idle 0ms", "line 3: bad duration \"0ms\" (expected a positive whole number with ms or s, e.g. 120ms or 2s)"},
        BadLine{"idle -5ms", "line 3: bad duration \"-5ms\" (expected a positive whole number with ms or s, e.g. 120ms or 2s)"},
        BadLine{"idle 1.5s", "line 3: bad duration \"1.5s\" (expected a positive whole number with ms or s, e.g. 120ms or 2s)"},
        BadLine{"idle 5000000s",
                "line 3: bad duration \"5000000s\" (expected a positive whole number with ms or s, e.g. 120ms or 2s)"},
        BadLine{"tap volume-up", "line 3: wrong arguments for tap (expected \"tap REGION DURATION\")"},
        BadLine{"reset now", "line 3: wrong arguments for reset (expected \"reset\")"},
        BadLine{"tap volume-up 120ms reset-after 50ms", "line 3: wrong arguments for tap (expected \"tap REGION DURATION\")"},
        BadLine{"hold volume-up 800ms reset-before 50ms",
                "line 3: wrong arguments for hold (expected \"hold REGION DURATION [reset-after TIME]\")"},
        BadLine{"hold volume-up 800ms reset-after 800ms", "line 3: reset-after 800ms is not within the hold of 800ms"},
        BadLine{"slide volume-up volume-up 800ms", "line 3: slide needs two different regions"}));

}  // namespace
}  // namespace ZeltoTouch::Platform

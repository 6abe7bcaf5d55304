#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <regex>

#include "Shared/Algs/Algs.h"
#include "Shared/Util/HostClock.h"
#include "Tests/Tools/ToolsTestSupport.h"
#include "Tools/EventLines.h"
#include "Tools/ReplaySession.h"

namespace ZeltoTouch::Tools {
namespace {

using namespace Testing;
using ::testing::ElementsAreArray;
using ::testing::StartsWith;

HIDEventRef withFrameNumber(HIDEventRef event, int64_t frameNumber) {
    event->setIntegerValue(kHIDEventFieldDigitizerFrameNumber, frameNumber);
    return event;
}

// The jsonl lines are a contract for scripts: key order and spacing included.
TEST(EventLines, EachKindHasItsContractLineAtAnyTime) {
    const struct {
        HIDEventRef event;
        std::string json, text;  // without the time: ', "t": 1500000000}' and '     1.500 s  '
    } cases[] = {
        {withFrameNumber(Algs::createMayBeginEvent(PixelRegion::PlayPause), 12),
         R"("may-begin", "region": 1, "phase": 128, "eventMask": 0, "frameNumber": 12)", "may-begin    play/pause    frame 12"},
        {withFrameNumber(Algs::createHoldStartEvent(PixelRegion::VolumeUp), 60),
         R"("hold-start", "region": 3, "phase": 1, "eventMask": 2, "frameNumber": 60)", "hold-start   volume up     frame 60"},
        {withFrameNumber(Algs::createHoldChangeEvent(PixelRegion::VolumeDown), 61),
         R"("hold-change", "region": 2, "phase": 2, "eventMask": 2, "frameNumber": 61)", "hold-change  volume down   frame 61"},
        {withFrameNumber(Algs::createHoldEndEvent(PixelRegion::VolumeDown), 4294967295),
         R"("hold-end", "region": 2, "phase": 4, "eventMask": 2, "frameNumber": 4294967295)",
         "hold-end     volume down   frame 4294967295"},
        {withFrameNumber(Algs::createTapEvent(PixelRegion::VolumeUp), 0),
         R"("tap", "region": 3, "phase": 0, "eventMask": 131072, "frameNumber": 0)", "tap          volume up     frame 0"},
        {withFrameNumber(Algs::createCancelEvent(), 7),
         R"("cancel", "region": 0, "phase": 8, "eventMask": 0, "frameNumber": 7)", "cancel       no region     frame 7"},
        {HIDEvent::createVendorDefinedEvent(0, 0xFF60, 2, 0, nullptr, 0, 0),
         R"("firmware-reset", "usagePage": 65376, "usage": 2)", "firmware-reset"},
        {HIDEvent::createVendorDefinedEvent(0, 0xFF00, 9, 0, nullptr, 0, 0),
         R"("vendor-defined", "usagePage": 65280, "usage": 9)", "vendor-defined"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.json);
        EXPECT_EQ(eventJSONLine(*c.event, 1'500'000'000), "{\"event\": " + c.json + ", \"t\": 1500000000}");
        EXPECT_EQ(eventTextLine(*c.event, 1'500'000'000), "     1.500 s  " + c.text);
    }
    // Time keeps all 64 bits; a digitizer phase outside the gesture table is named generically.
    const HIDEventRef event = Algs::createHoldStartEvent(PixelRegion::PlayPause);
    EXPECT_NE(eventJSONLine(*event, UINT64_MAX).find("\"t\": 18446744073709551615}"), std::string::npos);
    event->setPhase(kHIDEventPhaseChanged | kHIDEventPhaseEnded);
    EXPECT_EQ(eventKind(*event), "digitizer");
}

TEST(StateWrite, SplitsAtTheFirstEqualsSignAndTakesTheValueAsJsonWhenItParsesOtherwiseAsText) {
    const std::pair<const char*, PropertyValue> cases[] = {
        {"K=180.5", PropertyValue::fromDouble(180.5)}, {"K=volume up", PropertyValue::string("volume up")},
        {"K=\"quoted\"", PropertyValue::string("quoted")}, {"K=a=b", PropertyValue::string("a=b")},
        {"K=", PropertyValue::string("")}, {"K={\"A\": 1}", PropertyValue::dictionary({{"A", PropertyValue::fromInt32(1)}})}};
    for (const auto& [assignment, value] : cases) {
        const StateWrite write = StateWrite::parse(assignment);
        EXPECT_EQ(write.key, "K") << assignment;
        EXPECT_EQ(write.value, value) << assignment;
    }
    EXPECT_THROW(StateWrite::parse("no-equals-sign"), std::invalid_argument);
    EXPECT_THROW(StateWrite::parse("=1"), std::invalid_argument);
}

// A clock that adds up the sleeps asked of it and never waits.
class CountingClock final : public Util::HostClock {
public:
    Util::Timebase timebase() const noexcept override { return {1, 1}; }
    uint64_t machTimeNow() const noexcept override { return 1'000; }
    void sleepMicroseconds(uint64_t microseconds) const noexcept override { slept += microseconds; }
    mutable uint64_t slept = 0;
};

TEST(ReplaySession, WaitsTheRecordedSpacingAtTheGivenSpeedUnlessFast) {
    CountingClock clock;
    Util::setHostClock(&clock);
    const std::string container = recordScript("tap volume-up 120ms\nidle 300ms\n");
    const auto sleptDuring = [&](ReplayOptions options) {
        ReplaySession session(recordingOf(container), std::move(options));
        clock.slept = 0;
        size_t frames = 0;
        session.run([&](const DeliveredFrame& delivered) { frames = delivered.index + 1; });
        EXPECT_EQ(frames, session.frameCount());
        return clock.slept;
    };
    // 42 frames 10 ms apart: 410 ms of waiting at speed 1.
    EXPECT_EQ(sleptDuring({1.0f, false, {}}), 410'000u);
    EXPECT_EQ(sleptDuring({2.0f, false, {}}), 205'000u);
    EXPECT_EQ(sleptDuring({1.0f, true, {}}), 0u);
    EXPECT_EQ(&Util::hostClock(), &clock);  // the fast clock is gone again
    Util::setHostClock(nullptr);
}

// A tap, a hold, a brush the algorithm rejects, and a hold cut by a firmware reset.
constexpr std::string_view kScript =
    "idle 200ms\ntap play-pause 120ms\nidle 600ms\nhold volume-up 900ms\nidle 600ms\nbrush volume-down 250ms\n"
    "idle 600ms\nhold volume-down 1200ms reset-after 600ms\nidle 400ms\n";

// The jsonl lines of the events a pipeline makes of the script's reports, each stamped with the
// recorded time of the report that produced it.
std::vector<std::string> directPipelineLines(const std::string& key = "", const PropertyValue& value = {}) {
    const auto reports = reportsOf(kScript);
    std::vector<std::string> produced;
    for (const auto& [index, event] : pipelineEvents(reports, key, value)) {
        produced.push_back(eventJSONLine(*event, recordedTimeOf(reports[index].scriptTimeMs)));
    }
    return produced;
}

class ReplayCommand : public ::testing::Test {
protected:
    TemporaryDirectory folder;
    std::string recordingPath = folder.write("session.json", recordScript(kScript));
};

TEST_F(ReplayCommand, JsonLinesAreTheEventsThePipelineProducesStampedWithRecordedTimes) {
    const ToolRun run = runTool({"replay", recordingPath, "--fast", "--format", "jsonl"});
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.err, "");
    EXPECT_THAT(lines(run.out), ElementsAreArray(directPipelineLines()));

    // State writes apply before the first frame: the brush now ends as a tap, not a cancel.
    const ToolRun set =
        runTool({"replay", recordingPath, "--fast", "--format", "jsonl", "--set", "Algs.EnableTapSuppression=0"});
    const auto expected = directPipelineLines("Algs.EnableTapSuppression", PropertyValue::fromInt32(0));
    EXPECT_THAT(lines(set.out), ElementsAreArray(expected));
    EXPECT_NE(expected, directPipelineLines());
}

TEST_F(ReplayCommand, DescribeFollowsTheEventsOfEachImageFrame) {
    const std::vector<std::string> output =
        lines(runTool({"replay", recordingPath, "--fast", "--format", "jsonl", "--describe"}).out);
    const std::regex describe(
        R"re(^\{"describe": \{"frame": (\d+), "timeMs": (\d+), "touch": "ts=[^"]*\] ([^"]*)", "virtual": "ts=[^"]*"\}\}$)re");
    std::vector<std::string> labels;
    for (const std::string& line : output) {
        std::smatch match;
        if (std::regex_match(line, match, describe)) labels.push_back(match[3]);
    }
    // One description per image frame, after that frame's events; every other line is an event.
    const auto reports = reportsOf(kScript);
    const auto images = std::count_if(reports.begin(), reports.end(), [](const auto& r) { return r.bytes[0] == 1; });
    EXPECT_EQ(labels.size(), static_cast<size_t>(images));
    EXPECT_EQ(output.size() - labels.size(), directPipelineLines().size());
    EXPECT_THAT(output.back(), StartsWith("{\"describe\": "));
    EXPECT_THAT(labels, ::testing::Contains(StartsWith("TAP ")));
    EXPECT_THAT(labels, ::testing::Contains(StartsWith("HOLDING ")));
}

TEST_F(ReplayCommand, StatsEndTheOutputWithTheFinalCounters) {
    const auto json = lines(runTool({"replay", recordingPath, "--fast", "--format", "jsonl", "--stats"}).out);
    ASSERT_FALSE(json.empty());
    ASSERT_THAT(json.back(), StartsWith("{\"stats\": {\"EventStats\": {"));
    const PropertyValue stats = PropertyValue::fromJSON(json.back()).get("stats");
    const auto count = [&](std::string_view kind) {
        return static_cast<uint64_t>(std::count_if(json.begin(), json.end(), [&](const std::string& line) {
            return PropertyValue::fromJSON(line).get("event").stringView() == kind;
        }));
    };
    EXPECT_EQ(stats.get("EventStats").get("Dispatched").get("numTaps").toUInt64(), count("tap"));
    EXPECT_EQ(stats.get("DebugInfo").get("ResetCount").toUInt64(), count("firmware-reset"));
    EXPECT_TRUE(stats.get("DebugInfo").get("DisjointImageCount").isNumber());

    // Text: one readable line per event, then the two counter lines.
    const auto text = lines(runTool({"replay", recordingPath, "--fast", "--stats"}).out);
    ASSERT_EQ(text.size(), directPipelineLines().size() + 2);
    EXPECT_THAT(text[text.size() - 2], StartsWith("Event statistics: Dispatched: {num"));
    EXPECT_THAT(text.back(), ::testing::HasSubstr("ResetCount 1"));
    // The tap: at its recorded time since the first frame, with the region's name and frame number.
    EXPECT_THAT(text[1], ::testing::MatchesRegex(R"( +0\.[0-9]{3} s  tap +play/pause +frame [0-9]+)"));
}

TEST_F(ReplayCommand, RefusesBadOptions) {
    for (const std::vector<std::string>& options : std::vector<std::vector<std::string>>{
             {"--fast", "--speed", "2"}, {"--format", "xml"}, {"--set", "novalue"}, {"--speed", "0"}}) {
        std::vector<std::string> arguments{"replay", recordingPath};
        arguments.insert(arguments.end(), options.begin(), options.end());
        const ToolRun run = runTool(arguments);
        EXPECT_NE(run.status, 0) << options.back();
        EXPECT_EQ(run.out, "");
        EXPECT_NE(run.err, "");
    }
}

}  // namespace
}  // namespace ZeltoTouch::Tools

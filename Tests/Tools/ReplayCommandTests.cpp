#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <regex>

#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Tests/Tools/ToolsTestSupport.h"
#include "Tools/EventLines.h"
#include "Tools/ReplaySession.h"

namespace ZeltoTouch::Tools {
namespace {

using namespace Testing;
using ::testing::ElementsAreArray;
using ::testing::HasSubstr;
using ::testing::StartsWith;

// A tap, a hold, a brush the algorithm rejects, and a hold cut by a firmware reset.
constexpr std::string_view kScript = R"(idle 200ms
tap play-pause 120ms
idle 600ms
hold volume-up 900ms
idle 600ms
brush volume-down 250ms
idle 600ms
hold volume-down 1200ms reset-after 600ms
idle 400ms
)";

// The events of the script's reports fed straight into a pipeline (no recording, no playback),
// each as its jsonl line with the recorded time of the report that produced it.
std::vector<std::string> directPipelineLines(std::string_view script, const std::vector<StateWrite>& writes = {}) {
    Pipeline pipeline;
    for (const StateWrite& write : writes) pipeline.setState(0, write.key, write.value);
    std::vector<std::string> produced;
    uint64_t recordedTime = 0;
    pipeline.hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
        [&](uint64_t, const HIDEventList& events) {
            for (const HIDEventRef& event : events) produced.push_back(eventJSONLine(*event, recordedTime));
        });
    for (const auto& report :
         Platform::SensorReportGenerator(Platform::GestureScriptParser::parse(script)).generateAll()) {
        recordedTime = recordedTimeOf(report.scriptTimeMs);
        pipeline.handleInputReport(0, report.bytes.data(), report.bytes.size());
    }
    return produced;
}

std::vector<std::string> kinds(const std::vector<std::string>& jsonLines) {
    std::vector<std::string> result;
    const std::regex kind(R"re(^\{"event": "([a-z-]+)")re");
    for (const std::string& line : jsonLines) {
        std::smatch match;
        if (std::regex_search(line, match, kind)) result.push_back(match[1]);
    }
    return result;
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
    const std::vector<std::string> expected = directPipelineLines(kScript);
    EXPECT_THAT(lines(run.out), ElementsAreArray(expected));

    // The script's gestures as the algorithm reports them: a tap, a hold, a rejected brush and a
    // hold that a firmware reset ends.
    const std::vector<std::string> seen = kinds(expected);
    EXPECT_THAT(std::vector(seen.begin(), seen.begin() + 2), ElementsAreArray({"may-begin", "tap"}));
    EXPECT_THAT(std::vector(seen.begin() + 2, seen.begin() + 5),
                ElementsAreArray({"may-begin", "hold-start", "hold-end"}));
    EXPECT_THAT(std::vector(seen.begin() + 5, seen.begin() + 7), ElementsAreArray({"may-begin", "cancel"}));
    EXPECT_THAT(seen, ::testing::Contains("firmware-reset"));
}

TEST_F(ReplayCommand, StateWritesApplyBeforeTheFirstFrame) {
    const ToolRun run =
        runTool({"replay", recordingPath, "--fast", "--format", "jsonl", "--set", "Algs.EnableTapSuppression=0"});
    ASSERT_EQ(run.status, 0) << run.err;
    const std::vector<std::string> expected =
        directPipelineLines(kScript, {{"Algs.EnableTapSuppression", PropertyValue::fromInt32(0)}});
    EXPECT_THAT(lines(run.out), ElementsAreArray(expected));
    EXPECT_NE(expected, directPipelineLines(kScript));  // the brush now ends as a tap, not a cancel
}

TEST_F(ReplayCommand, DescribeFollowsTheEventsOfEachImageFrame) {
    const ToolRun run = runTool({"replay", recordingPath, "--fast", "--format", "jsonl", "--describe"});
    ASSERT_EQ(run.status, 0) << run.err;
    const std::regex describe(
        R"re(^\{"describe": \{"frame": (\d+), "timeMs": (\d+), "touch": "ts=[^"]*\] ([^"]*)", "virtual": "ts=[^"]*"\}\}$)re");
    size_t describeLines = 0;
    std::string previous;
    std::vector<std::string> labels;
    for (const std::string& line : lines(run.out)) {
        std::smatch match;
        if (std::regex_match(line, match, describe)) {
            ++describeLines;
            labels.push_back(match[3]);
        } else {
            // An event line always comes before its frame's description, never after it.
            EXPECT_THAT(line, StartsWith("{\"event\": "));
        }
        previous = line;
    }
    const auto reports = Platform::SensorReportGenerator(Platform::GestureScriptParser::parse(kScript)).generateAll();
    const size_t images = std::count_if(reports.begin(), reports.end(), [](const auto& r) { return r.bytes[0] == 1; });
    EXPECT_EQ(describeLines, images);
    EXPECT_THAT(previous, StartsWith("{\"describe\": "));
    EXPECT_THAT(labels, ::testing::Contains(::testing::StartsWith("TAP ")));
    EXPECT_THAT(labels, ::testing::Contains(::testing::StartsWith("HOLDING ")));
}

TEST_F(ReplayCommand, StatsLineCarriesTheFinalCounters) {
    const ToolRun run = runTool({"replay", recordingPath, "--fast", "--format", "jsonl", "--stats"});
    ASSERT_EQ(run.status, 0) << run.err;
    const std::vector<std::string> output = lines(run.out);
    ASSERT_FALSE(output.empty());
    ASSERT_THAT(output.back(), StartsWith("{\"stats\": {\"EventStats\": {"));
    const PropertyValue stats = PropertyValue::fromJSON(output.back()).get("stats");
    ASSERT_TRUE(stats.isDictionary()) << output.back();
    const std::vector<std::string> seen = kinds(output);
    EXPECT_EQ(stats.get("EventStats").get("Dispatched").get("numTaps").toUInt64(),
              static_cast<uint64_t>(std::count(seen.begin(), seen.end(), "tap")));
    EXPECT_EQ(stats.get("DebugInfo").get("ResetCount").toUInt64(),
              static_cast<uint64_t>(std::count(seen.begin(), seen.end(), "firmware-reset")));
    EXPECT_TRUE(stats.get("DebugInfo").get("DisjointImageCount").isNumber());
}

TEST_F(ReplayCommand, TextFormatIsOneReadableLinePerEvent) {
    const ToolRun run = runTool({"replay", recordingPath, "--fast", "--stats"});
    ASSERT_EQ(run.status, 0) << run.err;
    std::vector<std::string> output = lines(run.out);
    ASSERT_GE(output.size(), 2u);
    EXPECT_THAT(output[output.size() - 2], StartsWith("Event statistics: Dispatched: {num"));
    EXPECT_THAT(output.back(), HasSubstr("ResetCount 1"));
    output.resize(output.size() - 2);
    EXPECT_EQ(output.size(), directPipelineLines(kScript).size());
    // The tap: at its recorded time since the first frame, with the region's name and frame number.
    EXPECT_THAT(output[1], ::testing::MatchesRegex(R"( +0\.[0-9]{3} s  tap +play/pause +frame [0-9]+)"));
}

TEST_F(ReplayCommand, PlaysInRealTimeUnlessFast) {
    const std::string shortRecording = folder.write("short.json", recordScript("tap volume-up 120ms\nidle 300ms\n"));
    const auto elapsed = [&](std::vector<std::string> arguments) {
        const auto start = std::chrono::steady_clock::now();
        EXPECT_EQ(runTool(arguments).status, 0);
        return std::chrono::steady_clock::now() - start;
    };
    // The recording spans about 410 ms.
    EXPECT_GE(elapsed({"replay", shortRecording}), std::chrono::milliseconds(380));
    EXPECT_GE(elapsed({"replay", shortRecording, "--speed", "2"}), std::chrono::milliseconds(190));
    EXPECT_LT(elapsed({"replay", shortRecording, "--fast"}), std::chrono::milliseconds(380));
}

TEST_F(ReplayCommand, RefusesBadOptions) {
    for (const std::vector<std::string>& arguments : std::vector<std::vector<std::string>>{
             {"replay", recordingPath, "--fast", "--speed", "2"},
             {"replay", recordingPath, "--format", "xml"},
             {"replay", recordingPath, "--set", "novalue"},
             {"replay", recordingPath, "--speed", "0"},
         }) {
        const ToolRun run = runTool(arguments);
        EXPECT_NE(run.status, 0) << arguments.back();
        EXPECT_EQ(run.out, "");
        EXPECT_NE(run.err, "");
    }
}

}  // namespace
}  // namespace ZeltoTouch::Tools

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <optional>

#include "Shared/Util/Hex.h"
#include "Shared/Util/ImageText.h"
#include "Tests/Tools/ToolsTestSupport.h"

namespace ZeltoTouch::Tools {
namespace {

using namespace Testing;
using ::testing::HasSubstr;

constexpr std::string_view kScript = "idle 100ms\ntap volume-down 120ms\nidle 100ms\nreset\nidle 100ms\n";

class RecordingCommands : public ::testing::Test {
protected:
    TemporaryDirectory folder;
    std::string recordingPath = folder.write("session.json", recordScript(kScript));
    std::vector<Platform::SimulatedReport> reports = reportsOf(kScript);
};

// Frame numbers start again at 0 after the reset, so frame 3 is drawn twice.
TEST_F(RecordingCommands, RenderDrawsTheChosenImagesSeparatedByOneEmptyLine) {
    const struct {
        std::vector<std::string> options;
        std::optional<uint32_t> frameNumber;
        bool useUnsigned;
    } cases[] = {{{}, std::nullopt, false}, {{"--unsigned"}, std::nullopt, true}, {{"--frame", "3"}, 3, false}};
    for (const auto& c : cases) {
        std::vector<std::string> arguments{"render", recordingPath};
        arguments.insert(arguments.end(), c.options.begin(), c.options.end());
        const ToolRun run = runTool(arguments);
        ASSERT_EQ(run.status, 0) << run.err;
        std::string expected;
        for (const auto& report : reports) {
            const auto image = InputReport::Image::parse(report.bytes.data(), report.bytes.size());
            if (!image || (c.frameNumber && image->frameNumber != *c.frameNumber)) continue;
            if (!expected.empty()) expected += "\n";
            expected += Util::stringFromImage(*image, c.useUnsigned).stringView();
        }
        EXPECT_EQ(run.out, expected);
    }

    const ToolRun missing = runTool({"render", recordingPath, "--frame", "999999"});
    EXPECT_NE(missing.status, 0);
    EXPECT_EQ(missing.out, "");
    EXPECT_EQ(missing.err, recordingPath + " has no image with frame number 999999\n");
}

TEST_F(RecordingCommands, InfoSummarisesTheRecordingAsJsonAndAsText) {
    const size_t images = reports.size() - 1;  // and one firmware event
    const ToolRun json = runTool({"info", recordingPath, "--format", "json"});
    ASSERT_EQ(json.status, 0) << json.err;
    const PropertyValue summary = PropertyValue::fromJSON(json.out);
    ASSERT_TRUE(summary.isDictionary()) << json.out;
    EXPECT_EQ(summary.get("containerVersion").toUInt64(), 2u);
    EXPECT_EQ(summary.get("frames").toUInt64(), reports.size());
    EXPECT_EQ(summary.get("imageFrames").toUInt64(), images);
    EXPECT_EQ(summary.get("firmwareEventFrames").toUInt64(), 1u);
    EXPECT_EQ(summary.get("resets").toUInt64(), 1u);
    EXPECT_EQ(summary.get("durationNs").toUInt64(), recordedTimeOf(reports.back().scriptTimeMs) - kRecordingStartNs);
    // The reset restarts the frame numbers: one gap, from the last image before it to 0.
    ASSERT_EQ(summary.get("gaps").count(), 1u);
    EXPECT_EQ(summary.get("gaps").at(0).get("frameNumber").toUInt64(), 0u);

    const ToolRun text = runTool({"info", recordingPath});
    ASSERT_EQ(text.status, 0) << text.err;
    EXPECT_THAT(text.out, HasSubstr("Container version: 2\n"));
    EXPECT_THAT(text.out, HasSubstr("Frames: " + std::to_string(reports.size()) + "\n"));
    EXPECT_THAT(text.out, HasSubstr("(" + std::to_string(images) + " images, 1 firmware event, 0 other)"));
    EXPECT_THAT(text.out, HasSubstr(", 1 gap\n"));
    EXPECT_THAT(text.out, HasSubstr("Firmware events: 1 (1 reset)\n"));

    // State writes and metadata keys are listed.
    RecordingExtras extras;
    extras.stateWrites = {{50, "Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(300)},
                          {150, "Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(400)},
                          {150, "Algs.ResetEventStats", PropertyValue()}};
    extras.accelerometer = true;
    const ToolRun run = runTool({"info", folder.write("extras.json", recordScript(kScript, extras))});
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out, HasSubstr("  state:        3\n"));
    EXPECT_THAT(run.out, HasSubstr("(Accel "));
    EXPECT_THAT(run.out, HasSubstr("State keys written: 2\n"));
    EXPECT_THAT(run.out, HasSubstr("  Algs.HoldTimeoutMilliseconds: 2 writes, last 400\n"));
    EXPECT_THAT(run.out, HasSubstr("  Algs.ResetEventStats: 1 write, last (no value)\n"));
}

TEST_F(RecordingCommands, MigrateWritesVersionTwoThatReplaysTheSameButReplacesOnlyWithForce) {
    // The same reports as a version 0 container.
    std::string version0 = R"({"Version": 0, "Reports": [)";
    for (const auto& report : reports) {
        version0 += std::string(version0.ends_with("[") ? "" : ",") + R"({"Timestamp": )" +
                    std::to_string(recordedTimeOf(report.scriptTimeMs)) + R"(, "ReportData": ")" +
                    std::string(Util::hexStringFromBytes(report.bytes).stringView()) + "\"}";
    }
    const std::string input = folder.write("v0.json", version0 + "]}");
    std::string output = folder.path("v2.json");

    const ToolRun run = runTool({"migrate", input, output});
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(readText(output), readText(recordingPath));
    const ToolRun replayed = runTool({"replay", output, "--fast", "--format", "jsonl"});
    EXPECT_EQ(replayed.out, runTool({"replay", input, "--fast", "--format", "jsonl"}).out);
    EXPECT_NE(replayed.out, "");

    // An existing file is replaced only with --force.
    output = folder.write("existing.json", "keep me");
    const ToolRun refused = runTool({"migrate", recordingPath, output});
    EXPECT_NE(refused.status, 0);
    EXPECT_EQ(refused.err, output + " already exists; use --force to replace it\n");
    EXPECT_EQ(readText(output), "keep me");

    ASSERT_EQ(runTool({"migrate", recordingPath, output, "--force"}).status, 0);
    EXPECT_EQ(readText(output), readText(recordingPath));
}

// Every command that reads a recording reports why it cannot exactly, prints nothing and writes
// nothing.
TEST_F(RecordingCommands, ReaderErrorsReachStderrExactly) {
    const std::string bad = folder.path("bad.json");
    const struct {
        const char* text;  // written to bad.json; none: the path is read as it is
        std::string path, message;
    } cases[] = {
        {"not json", bad, "migrateSerializedContainer failed: invalid container"},
        {"[1, 2]", bad, "migrateSerializedContainer failed: invalid container"},
        {R"({"Version": 3})", bad, "migrateSerializedContainer failed: invalid container version: 3"},
        {R"({"Version": 1, "Frames": [{"Timestamp": 1}]})", bad, "migrateSerializedContainer failed: frame lacks Type"},
        {R"({"Version": 2})", bad, "invalid frames"},
        {R"({"Version": 2, "Frames": {}})", bad, "invalid frames"},
        {R"({"Version": 2, "Frames": [{"Type": "InputReport", "Timestamp": 1, "Data": "100"}]})", bad, "invalid hex string"},
        {R"({"Version": 2, "Frames": [{"Type": "State", "Timestamp": 1}]})", bad, "invalid state key"},
        {R"({"Version": 2, "Frames": [{"Type": "Metadata", "Timestamp": 3}]})", bad, "invalid metadata key"},
        {nullptr, folder.path("missing.json"), "cannot read " + folder.path("missing.json") + ": No such file or directory"},
        {nullptr, folder.path(), "cannot read " + folder.path() + ": Is a directory"},
    };
    const std::vector<std::vector<std::string>> commands = {{"replay", "--fast"}, {"replay", "--format", "jsonl"},
                                                            {"render"},           {"info"},
                                                            {"inspect"},          {"migrate", folder.path("out.json")}};
    for (const auto& c : cases) {
        if (c.text) folder.write("bad.json", c.text);
        for (std::vector<std::string> arguments : commands) {
            arguments.insert(arguments.begin() + 1, c.path);
            SCOPED_TRACE(c.path + " " + (c.text ? c.text : "") + " / " + arguments[0]);
            const ToolRun run = runTool(arguments);
            EXPECT_NE(run.status, 0);
            EXPECT_EQ(run.out, "");
            EXPECT_EQ(run.err, c.message + "\n");
        }
    }
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder.path()), {}), 2);  // session.json, bad.json
}

TEST(ToolCommands, EverySubcommandHasHelp) {
    for (const char* command : {"replay", "render", "info", "migrate", "inspect"}) {
        const ToolRun run = runTool({command, "--help"});
        EXPECT_EQ(run.status, 0);
        EXPECT_THAT(run.out, HasSubstr(std::string("Usage: ")));
        EXPECT_THAT(run.out, HasSubstr(command));
    }
}

}  // namespace
}  // namespace ZeltoTouch::Tools

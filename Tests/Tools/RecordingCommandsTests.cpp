#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Util/Hex.h"
#include "Shared/Util/ImageText.h"
#include "Tests/Tools/ToolsTestSupport.h"

namespace ZeltoTouch::Tools {
namespace {

using namespace Testing;
using ::testing::HasSubstr;

constexpr std::string_view kScript = "idle 100ms\ntap volume-down 120ms\nidle 100ms\nreset\nidle 100ms\n";

std::vector<Platform::SimulatedReport> reportsOf(std::string_view script) {
    return Platform::SensorReportGenerator(Platform::GestureScriptParser::parse(script)).generateAll();
}

std::vector<InputReport::Image> imagesOf(std::string_view script) {
    std::vector<InputReport::Image> images;
    for (const auto& report : reportsOf(script)) {
        if (auto image = InputReport::Image::parse(report.bytes.data(), report.bytes.size())) images.push_back(*image);
    }
    return images;
}

std::string picture(const InputReport::Image& image, bool useUnsigned) {
    return std::string(Util::stringFromImage(image, useUnsigned).stringView());
}

class RecordingCommands : public ::testing::Test {
protected:
    TemporaryDirectory folder;
    std::string recordingPath = folder.write("session.json", recordScript(kScript));
};

TEST_F(RecordingCommands, RenderDrawsEveryImageSeparatedByOneEmptyLine) {
    for (const bool useUnsigned : {false, true}) {
        std::vector<std::string> arguments{"render", recordingPath};
        if (useUnsigned) arguments.push_back("--unsigned");
        const ToolRun run = runTool(arguments);
        ASSERT_EQ(run.status, 0) << run.err;
        std::string expected;
        for (const InputReport::Image& image : imagesOf(kScript)) {
            if (!expected.empty()) expected += "\n";
            expected += picture(image, useUnsigned);
        }
        EXPECT_EQ(run.out, expected);
    }
}

TEST_F(RecordingCommands, RenderOneFrameNumberDrawsEveryImageCarryingIt) {
    // Frame numbers start again at 0 after the reset, so low numbers occur twice.
    const std::vector<InputReport::Image> images = imagesOf(kScript);
    const ToolRun run = runTool({"render", recordingPath, "--frame", "3"});
    ASSERT_EQ(run.status, 0) << run.err;
    std::string expected;
    for (const InputReport::Image& image : images) {
        if (image.frameNumber != 3) continue;
        if (!expected.empty()) expected += "\n";
        expected += picture(image, false);
    }
    EXPECT_THAT(expected, HasSubstr("\n\n# Image frame 3 "));  // two pictures
    EXPECT_EQ(run.out, expected);

    const ToolRun missing = runTool({"render", recordingPath, "--frame", "999999"});
    EXPECT_NE(missing.status, 0);
    EXPECT_EQ(missing.out, "");
    EXPECT_EQ(missing.err, recordingPath + " has no image with frame number 999999\n");
}

TEST_F(RecordingCommands, InfoSummarisesTheRecording) {
    const auto reports = reportsOf(kScript);
    const size_t images = imagesOf(kScript).size();
    const ToolRun json = runTool({"info", recordingPath, "--format", "json"});
    ASSERT_EQ(json.status, 0) << json.err;
    const PropertyValue summary = PropertyValue::fromJSON(json.out);
    ASSERT_TRUE(summary.isDictionary()) << json.out;
    EXPECT_EQ(summary.get("containerVersion").toUInt64(), 2u);
    EXPECT_EQ(summary.get("frames").toUInt64(), reports.size());
    EXPECT_EQ(summary.get("imageFrames").toUInt64(), images);
    EXPECT_EQ(summary.get("firmwareEventFrames").toUInt64(), reports.size() - images);
    EXPECT_EQ(summary.get("resets").toUInt64(), 1u);
    EXPECT_EQ(summary.get("durationNs").toUInt64(), recordedTimeOf(reports.back().scriptTimeMs) - recordedTimeOf(0));
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
}

TEST_F(RecordingCommands, InfoListsStateWritesAndMetadataKeys) {
    RecordingExtras extras;
    extras.stateWrites = {{50, "Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(300)},
                          {150, "Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(400)},
                          {150, "Algs.ResetEventStats", PropertyValue()}};
    extras.accelerometer = true;
    const std::string path = folder.write("extras.json", recordScript(kScript, extras));
    const ToolRun run = runTool({"info", path});
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out, HasSubstr("  state:        3\n"));
    EXPECT_THAT(run.out, HasSubstr("(Accel "));
    EXPECT_THAT(run.out, HasSubstr("State keys written: 2\n"));
    EXPECT_THAT(run.out, HasSubstr("  Algs.HoldTimeoutMilliseconds: 2 writes, last 400\n"));
    EXPECT_THAT(run.out, HasSubstr("  Algs.ResetEventStats: 1 write, last (no value)\n"));
}

TEST_F(RecordingCommands, MigrateWritesVersionTwoThatReplaysTheSame) {
    // The same reports as a version 0 container.
    std::string version0 = R"({"Version": 0, "Reports": [)";
    bool first = true;
    for (const auto& report : reportsOf(kScript)) {
        version0 += std::string(first ? "" : ",") + R"({"Timestamp": )" +
                    std::to_string(recordedTimeOf(report.scriptTimeMs)) + R"(, "ReportData": ")" +
                    std::string(Util::hexStringFromBytes(report.bytes).stringView()) + "\"}";
        first = false;
    }
    version0 += "]}";
    const std::string input = folder.write("v0.json", version0);
    const std::string output = folder.path("v2.json");

    const ToolRun run = runTool({"migrate", input, output});
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(PropertyValue::fromJSON(readText(output)).get("Version").toUInt64(), 2u);
    EXPECT_EQ(readText(output), readText(recordingPath));
    const ToolRun replayed = runTool({"replay", output, "--fast", "--format", "jsonl"});
    EXPECT_EQ(replayed.out, runTool({"replay", input, "--fast", "--format", "jsonl"}).out);
    EXPECT_NE(replayed.out, "");
}

TEST_F(RecordingCommands, MigrateReplacesAnExistingFileOnlyWithForce) {
    const std::string output = folder.write("existing.json", "keep me");
    const ToolRun refused = runTool({"migrate", recordingPath, output});
    EXPECT_NE(refused.status, 0);
    EXPECT_EQ(refused.err, output + " already exists; use --force to replace it\n");
    EXPECT_EQ(readText(output), "keep me");

    const ToolRun forced = runTool({"migrate", recordingPath, output, "--force"});
    ASSERT_EQ(forced.status, 0) << forced.err;
    EXPECT_EQ(readText(output), readText(recordingPath));
}

TEST_F(RecordingCommands, MigrateOfABadContainerLeavesNoOutput) {
    const std::string input = folder.write("bad.json", R"({"Version": 3})");
    const ToolRun run = runTool({"migrate", input, folder.path("out.json")});
    EXPECT_NE(run.status, 0);
    EXPECT_EQ(run.err, "migrateSerializedContainer failed: invalid container version: 3\n");
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder.path("")), {}), 2);  // session.json, bad.json
}

// Every command that reads a recording reports the reader's error exactly, and nothing else.
TEST_F(RecordingCommands, ReaderErrorsReachStderrExactly) {
    struct BadContainer {
        const char* text;
        const char* message;
    };
    const BadContainer containers[] = {
        {"not json", "migrateSerializedContainer failed: invalid container"},
        {"[1, 2]", "migrateSerializedContainer failed: invalid container"},
        {R"({"Version": 3})", "migrateSerializedContainer failed: invalid container version: 3"},
        {R"({"Version": 1, "Frames": [{"Timestamp": 1}]})", "migrateSerializedContainer failed: frame lacks Type"},
        {R"({"Version": 2})", "invalid frames"},
        {R"({"Version": 2, "Frames": [{"Type": "InputReport", "Timestamp": 1, "Data": "100"}]})", "invalid hex string"},
        {R"({"Version": 2, "Frames": [{"Type": "State", "Timestamp": 1}]})", "invalid state key"},
    };
    const std::vector<std::vector<std::string>> commands = {
        {"replay", "--fast"}, {"replay", "--format", "jsonl"}, {"render"}, {"info"}};
    for (const BadContainer& container : containers) {
        const std::string path = folder.write("bad.json", container.text);
        for (std::vector<std::string> arguments : commands) {
            arguments.insert(arguments.begin() + 1, path);
            SCOPED_TRACE(std::string(container.text) + " / " + arguments[0]);
            const ToolRun run = runTool(arguments);
            EXPECT_NE(run.status, 0);
            EXPECT_EQ(run.out, "");
            EXPECT_EQ(run.err, std::string(container.message) + "\n");
        }
    }
}

TEST_F(RecordingCommands, UnreadableFilesAreNamed) {
    for (const std::string& path : {folder.path("missing.json"), folder.path("")}) {
        for (const char* command : {"replay", "render", "info"}) {
            const ToolRun run = runTool({command, path});
            EXPECT_NE(run.status, 0);
            EXPECT_EQ(run.out, "");
            EXPECT_THAT(run.err, ::testing::StartsWith("cannot read " + path + ": "));
        }
    }
}

TEST_F(RecordingCommands, EverySubcommandHasHelp) {
    for (const char* command : {"replay", "render", "info", "migrate"}) {
        const ToolRun run = runTool({command, "--help"});
        EXPECT_EQ(run.status, 0);
        EXPECT_THAT(run.out, HasSubstr(std::string("Usage: ")));
        EXPECT_THAT(run.out, HasSubstr(command));
    }
}

}  // namespace
}  // namespace ZeltoTouch::Tools

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <regex>

#include "Tests/Tools/ToolsTestSupport.h"

namespace ZeltoTouch::Tools {
namespace {

using namespace Testing;
using ::testing::HasSubstr;

constexpr std::string_view kScript = R"(idle 200ms
tap play-pause 120ms
idle 600ms
hold volume-up 900ms
idle 400ms
slide play-pause volume-up 1500ms
idle 600ms
brush volume-down 250ms
idle 600ms
hold volume-down 1200ms reset-after 600ms
idle 400ms
)";

RecordingExtras serviceLikeExtras() {
    RecordingExtras extras;
    extras.stateWrites = {{100, "Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(450)}};
    extras.accelerometer = true;
    return extras;
}

bool exists(const std::string& path) { return std::filesystem::exists(path); }

TEST(InspectCommand, WritesTheReportBesideTheRecordingByDefault) {
    const TemporaryDirectory folder;
    const std::string recording = folder.write("session.json", recordScript("tap volume-up 120ms\nidle 200ms\n"));
    const ToolRun run = runTool({"inspect", recording});
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.out, "Report written to " + folder.path("session.html") + "\n");
    const std::string page = readText(folder.path("session.html"));
    EXPECT_THAT(page, HasSubstr("<title>ZeltoTouch recording session.json</title>"));
    // Self-contained: nothing is fetched from anywhere.
    EXPECT_THAT(page, ::testing::Not(HasSubstr("<script src")));
    EXPECT_THAT(page, ::testing::Not(HasSubstr("<link")));
    EXPECT_THAT(page, ::testing::Not(HasSubstr("sourceMappingURL")));

    const ToolRun named = runTool({"inspect", recording, "-o", folder.path("other.html")});
    ASSERT_EQ(named.status, 0) << named.err;
    EXPECT_TRUE(exists(folder.path("other.html")));

    // A recording named .html is never overwritten by its own report.
    const std::string oddlyNamed = folder.write("odd.html", readText(recording));
    ASSERT_EQ(runTool({"inspect", oddlyNamed}).status, 0);
    EXPECT_EQ(readText(oddlyNamed), readText(recording));
    EXPECT_TRUE(exists(folder.path("odd.html.html")));
}

TEST(InspectCommand, BadInputGivesReplaysErrorsAndWritesNothing) {
    const TemporaryDirectory folder;
    const std::pair<const char*, const char*> cases[] = {
        {"{", "migrateSerializedContainer failed: invalid container"},
        {R"({"Version": 2, "Frames": {}})", "invalid frames"},
        {R"({"Version": 2, "Frames": [{"Type": "Metadata", "Timestamp": 3}]})", "invalid metadata key"},
    };
    for (const auto& [text, message] : cases) {
        const std::string path = folder.write("bad.json", text);
        const ToolRun inspect = runTool({"inspect", path});
        const ToolRun replay = runTool({"replay", path, "--fast"});
        EXPECT_NE(inspect.status, 0);
        EXPECT_EQ(inspect.err, std::string(message) + "\n");
        EXPECT_EQ(inspect.err, replay.err);
        EXPECT_EQ(inspect.out, "");
        EXPECT_FALSE(exists(folder.path("bad.html")));
    }
    const ToolRun missing = runTool({"inspect", folder.path("missing.json")});
    EXPECT_NE(missing.status, 0);
    EXPECT_THAT(missing.err, HasSubstr(folder.path("missing.json")));
    EXPECT_FALSE(exists(folder.path("missing.html")));
}

// What the rendered page shows, read back from its DOM.
struct RenderedReport {
    struct Row {
        std::string ns, kind, region, frame;
    };
    std::vector<Row> rows;
    std::map<std::string, std::string> summary;  // data-key → text
    bool ready = false;
    std::string errors;
    int renderMs = -1;

    static RenderedReport of(const std::string& dom) {
        RenderedReport report;
        const std::regex row(R"re(<tr data-ns="(\d+)" data-kind="([a-z-]+)" data-region="(\d*)" data-frame="(\d*)">)re");
        for (std::sregex_iterator it(dom.begin(), dom.end(), row), end; it != end; ++it) {
            report.rows.push_back({(*it)[1], (*it)[2], (*it)[3], (*it)[4]});
        }
        const std::regex entry(R"re(<dd data-key="([^"]+)">([^<]*)</dd>)re");
        for (std::sregex_iterator it(dom.begin(), dom.end(), entry), end; it != end; ++it) {
            report.summary[(*it)[1]] = (*it)[2];
        }
        std::smatch match;
        report.ready = dom.find("data-ready=\"true\"") != std::string::npos;
        if (std::regex_search(dom, match, std::regex(R"re(id="errors"[^>]*>([^<]*)</pre>)re"))) report.errors = match[1];
        if (std::regex_search(dom, match, std::regex(R"re(data-render-ms="(\d+)")re"))) report.renderMs = std::stoi(match[1]);
        return report;
    }
};

class InspectInBrowser : public ::testing::Test {
protected:
    void SetUp() override {
        if (chromiumPath().empty()) GTEST_SKIP() << "chromium is not installed (Scripts/install-deps.sh installs it)";
    }
    TemporaryDirectory folder;
};

TEST_F(InspectInBrowser, PageShowsTheEventsReplayPrintsAndTheSummaryInfoGives) {
    const std::string recording = folder.write("session.json", recordScript(kScript, serviceLikeExtras()));
    const std::string page = folder.path("session.html");
    ASSERT_EQ(runTool({"inspect", recording, "-o", page}).status, 0);

    const RenderedReport report = RenderedReport::of(renderedDOM(page));
    EXPECT_TRUE(report.ready);
    EXPECT_EQ(report.errors, "");

    // The event table holds exactly the events of replay's jsonl, in order.
    const ToolRun replay = runTool({"replay", recording, "--fast", "--format", "jsonl"});
    const std::vector<std::string> expected = lines(replay.out);
    ASSERT_EQ(report.rows.size(), expected.size());
    ASSERT_FALSE(expected.empty());
    for (size_t i = 0; i < expected.size(); ++i) {
        const RenderedReport::Row& row = report.rows[i];
        const PropertyValue event = PropertyValue::fromJSON(expected[i]);
        SCOPED_TRACE(expected[i]);
        EXPECT_EQ(row.kind, event.get("event").stringView());
        EXPECT_EQ(row.ns, std::to_string(event.get("t").toUInt64()));
        if (event.get("region")) {
            EXPECT_EQ(row.region, std::to_string(event.get("region").toUInt64()));
            EXPECT_EQ(row.frame, std::to_string(event.get("frameNumber").toUInt64()));
        }
    }

    // The summary's figures are info's.
    const PropertyValue info = PropertyValue::fromJSON(runTool({"info", recording, "--format", "json"}).out);
    for (const char* key : {"containerVersion", "frames", "stateFrames", "inputReportFrames", "imageFrames",
                            "firmwareEventFrames", "metadataFrames", "resets"}) {
        EXPECT_EQ(report.summary.at(key), std::to_string(info.get(key).toUInt64())) << key;
    }
    EXPECT_EQ(report.summary.at("gaps"), std::to_string(info.get("gaps").count()));
    EXPECT_EQ(report.summary.at("metadata:Accel"), std::to_string(info.get("metadataKeys").get("Accel").toUInt64()));
    EXPECT_EQ(report.summary.at("DebugInfo:ResetCount"), "1");

    // A real picture, not a blank page: a white 1400×1300 PNG compresses to a few kilobytes.
    const std::string shot = folder.path("shot.png");
    screenshot(page, shot);
    const std::string png = readText(shot);
    EXPECT_EQ(png.substr(0, 8), "\x89PNG\r\n\x1a\n");
    EXPECT_GT(png.size(), 40'000u);
}

TEST_F(InspectInBrowser, FullServiceRecordingStaysSmallAndQuick) {
    // About 4350 image frames with an accelerometer sample each, as a full service recording.
    std::string script;
    for (int i = 0; i < 6; ++i) script += kScript;  // 6770 ms each
    script += "idle 2880ms\n";
    const std::string recording = folder.write("full.json", recordScript(script, serviceLikeExtras()));
    const std::string page = folder.path("full.html");
    const auto start = std::chrono::steady_clock::now();
    ASSERT_EQ(runTool({"inspect", recording, "-o", page}).status, 0);
    const auto inspectMs =
        std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() - start).count();

    const PropertyValue info = PropertyValue::fromJSON(runTool({"info", recording, "--format", "json"}).out);
    EXPECT_NEAR(static_cast<double>(info.get("imageFrames").toUInt64()), 4350.0, 10.0);
    const size_t pageSize = std::filesystem::file_size(page);
    EXPECT_LT(pageSize, 3'000'000u);

    const RenderedReport report = RenderedReport::of(renderedDOM(page));
    EXPECT_TRUE(report.ready);
    EXPECT_EQ(report.errors, "");
    // Drawing takes well under a second on an idle machine; the bound leaves room for a busy one
    // and still catches a page that draws every point of every series.
    EXPECT_GE(report.renderMs, 0);
    EXPECT_LT(report.renderMs, 5000);
    RecordProperty("pageBytes", static_cast<int>(pageSize));
    RecordProperty("renderMs", report.renderMs);
    RecordProperty("inspectMs", static_cast<int>(inspectMs));
    std::printf("full recording: page %zu bytes, drawn in %d ms, inspect took %lld ms\n", pageSize, report.renderMs,
                static_cast<long long>(inspectMs));
}

}  // namespace
}  // namespace ZeltoTouch::Tools

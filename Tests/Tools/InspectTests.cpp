#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <map>
#include <regex>

#include "Host/Format.h"
#include "Tests/Tools/ToolsTestSupport.h"
#include "Tools/EventLines.h"
#include "Tools/InspectPage.h"
#include "Tools/InspectTrace.h"
#include "Tools/ReplaySession.h"

namespace ZeltoTouch::Tools {
namespace {

using namespace Testing;
using ::testing::HasSubstr;
using ::testing::Not;

// A tap, a hold, a brush and a hold cut by a firmware reset: 3770 ms.
constexpr std::string_view kScript =
    "idle 100ms\ntap volume-up 120ms\nidle 300ms\nhold play-pause 800ms\nidle 300ms\nbrush volume-down 250ms\n"
    "idle 300ms\nhold volume-down 1200ms reset-after 600ms\nidle 400ms\n";

// The page's data against a pipeline fed the same reports directly: the frame columns hold what
// Algs holds after that frame; the browser test checks the events.
TEST(InspectTrace, JsonHoldsWhatAlgsHoldsAfterEachFrame) {
    const RecordingExtras extras{{{0, "Algs.ActivationThreshold", PropertyValue::fromFloat(180.5f)}}, true};
    // The trace of a replay, collected as inspect collects it.
    RecordingSummary summary(2);
    InspectTrace trace;
    ReplaySession session(recordingOf(recordScript(kScript, extras)), ReplayOptions{1.0f, true, {}});
    session.run([&](const DeliveredFrame& delivered) {
        summary.add(delivered.frame);
        if (delivered.image) trace.addImage(delivered.frame.timestamp, *delivered.image, session.pipeline().algs());
        if (delivered.frame.type == PipelineRecording::Frame::Type::Metadata) {
            trace.addMetadata(delivered.frame.timestamp, delivered.frame.key, delivered.frame.value);
        }
    });
    const PropertyValue data = PropertyValue::fromJSON(trace.json("x.json", summary, PropertyValue::dictionary({})));
    const PropertyValue frames = data.get("frames");

    Pipeline pipeline;
    pipeline.setState(0, "Algs.ActivationThreshold", PropertyValue::fromFloat(180.5f));
    size_t frame = 0;
    for (const auto& report : reportsOf(kScript)) {
        pipeline.handleInputReport(0, report.bytes.data(), report.bytes.size());
        const auto image = InputReport::Image::parse(report.bytes.data(), report.bytes.size());
        if (!image) continue;
        const Algs& algs = pipeline.algs();
        const auto at = [&](const char* column) { return frames.get(column).at(frame); };
        SCOPED_TRACE(frame);
        EXPECT_EQ(at("t").toDouble(), report.scriptTimeMs);  // milliseconds since the first frame
        EXPECT_EQ(at("frame").toUInt64(), image->frameNumber);
        for (int c = 0; c < kPixelCount; ++c) {
            EXPECT_EQ((at("active").toUInt64() >> c) & 1, algs.pixels()[c].active ? 1u : 0u);
        }
        EXPECT_EQ(at("touchScore").toFloat(), algs.handStats().touchScore);
        const std::string description = algs.touchStateDescription(image->signedPixels, image->timestampMs);
        EXPECT_TRUE(description.ends_with("] " + std::string(at("label").stringView()))) << description;
        ++frame;
    }
    EXPECT_EQ(frames.get("t").count(), frame);
    EXPECT_EQ(data.get("accel").get("z").at(0).toFloat(), -1.0f);
    ASSERT_EQ(data.get("stateWrites").count(), 1u);
    EXPECT_EQ(data.get("stateWrites").at(0).get("value").stringView(), "180.5");

    InspectTrace other;  // only "Accel" dictionaries are samples
    other.addMetadata(6, "Other", PropertyValue::dictionary({{"X", PropertyValue::fromFloat(1)}}));
    other.addMetadata(7, "Accel", PropertyValue::string("not a sample"));
    EXPECT_TRUE(other.accelSamples().empty());
}

TEST(InspectPage, LabelTemplateAndEscapingRules) {
    EXPECT_EQ(stateLabelOfDescription("ts=1.0, [A=   1    2, O=   0    0] TAP 180ms ActiveRegion=1 ABOVENOISE"),
              "TAP 180ms ActiveRegion=1 ABOVENOISE");
    EXPECT_EQ(stateLabelOfDescription("ts=0.000000, [A=   0    0] "), "");
    EXPECT_EQ(stateLabelOfDescription("no brackets"), "");

    // One pass: a value that looks like a placeholder stays as it is.
    EXPECT_EQ(fillTemplate("<t>@A@</t>@B@ a@b @A@", {{"A", "@B@"}, {"B", "x"}}), "<t>@B@</t>x a@b @B@");
    EXPECT_THROW(fillTemplate("@MISSING@", {}), std::logic_error);

    // Data cannot end its script element, and still reads as the same JSON.
    const std::string json = R"({"key": "</script><script>alert(1)</script><!--"})";
    EXPECT_EQ(scriptSafeJSON(json).find('<'), std::string::npos);
    EXPECT_EQ(PropertyValue::fromJSON(scriptSafeJSON(json)), PropertyValue::fromJSON(json));
    EXPECT_EQ(escapeHTML(R"(<a href="x">&</a>)"), "&lt;a href=&quot;x&quot;&gt;&amp;&lt;/a&gt;");

    const std::string page = inspectPage("T <1>", R"({"a": "</script>"})");
    EXPECT_THAT(page, HasSubstr("<title>T &lt;1&gt;</title>"));
    EXPECT_THAT(page, HasSubstr("Dygraph"));
    EXPECT_THAT(page, HasSubstr(R"({"a": "\u003c/script>"})"));
    EXPECT_EQ(page.find("@DATA@"), std::string::npos);
}

TEST(InspectCommand, WritesTheReportBesideTheRecordingByDefault) {
    const TemporaryDirectory folder;
    const std::string recording = folder.write("session.json", recordScript("tap volume-up 120ms\nidle 200ms\n"));
    const ToolRun run = runTool({"inspect", recording});
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.out, "Report written to " + folder.path("session.html") + "\n");
    const std::string page = readText(folder.path("session.html"));
    EXPECT_THAT(page, HasSubstr("<title>ZeltoTouch recording session.json</title>"));
    // Self-contained: nothing is fetched from anywhere.
    EXPECT_THAT(page, Not(HasSubstr("<script src")));
    EXPECT_THAT(page, Not(HasSubstr("<link")));
    EXPECT_THAT(page, Not(HasSubstr("sourceMappingURL")));

    ASSERT_EQ(runTool({"inspect", recording, "-o", folder.path("other.html")}).status, 0);
    EXPECT_TRUE(std::filesystem::exists(folder.path("other.html")));

    // A recording named .html is never overwritten by its own report.
    const std::string oddlyNamed = folder.write("odd.html", readText(recording));
    ASSERT_EQ(runTool({"inspect", oddlyNamed}).status, 0);
    EXPECT_EQ(readText(oddlyNamed), readText(recording));
    EXPECT_TRUE(std::filesystem::exists(folder.path("odd.html.html")));
}

// A full service recording (about 4350 image frames with an accelerometer sample each) drawn in a
// browser: the page stays small and quick, shows the events replay prints and the summary info
// gives, and is a real picture.
TEST(InspectInBrowser, FullServiceRecordingIsDrawnQuicklyWithEveryEventAndTheSummary) {
    if (chromiumPath().empty()) GTEST_SKIP() << "chromium is not installed (Scripts/install-deps.sh installs it)";
    const TemporaryDirectory folder;
    std::string script;
    for (int i = 0; i < 11; ++i) script += kScript;
    const RecordingExtras extras{{{100, "Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(450)}}, true};
    const std::string recording = folder.write("full.json", recordScript(script + "idle 2030ms\n", extras));
    const std::string page = folder.path("full.html");
    ASSERT_EQ(runTool({"inspect", recording, "-o", page}).status, 0);
    const PropertyValue info = PropertyValue::fromJSON(runTool({"info", recording, "--format", "json"}).out);
    EXPECT_NEAR(static_cast<double>(info.get("imageFrames").toUInt64()), 4350.0, 10.0);
    EXPECT_LT(std::filesystem::file_size(page), 3'000'000u);

    const std::string dom = runChromium("--dump-dom", page).out;
    EXPECT_NE(dom.find("data-ready=\"true\""), std::string::npos);
    std::smatch match;
    ASSERT_TRUE(std::regex_search(dom, match, std::regex(R"re(id="errors"[^>]*>([^<]*)</pre>)re")));
    EXPECT_EQ(match[1], "");
    // Drawing takes well under a second on an idle machine; the bound leaves room for a busy one
    // and still catches a page that draws every point of every series.
    ASSERT_TRUE(std::regex_search(dom, match, std::regex(R"re(data-render-ms="(\d+)")re")));
    EXPECT_LT(std::stoi(match[1]), 5000);

    // The event table holds exactly the events of replay's jsonl, in order.
    std::vector<std::string> rows, expected;
    const std::regex row(R"re(<tr data-ns="\d+" data-kind="[a-z-]+" data-region="\d*" data-frame="\d*">)re");
    for (std::sregex_iterator it(dom.begin(), dom.end(), row), end; it != end; ++it) rows.push_back(it->str());
    for (const std::string& line : lines(runTool({"replay", recording, "--fast", "--format", "jsonl"}).out)) {
        const PropertyValue event = PropertyValue::fromJSON(line);
        const bool digitizer = event.get("region").hasValue();
        expected.push_back(format("<tr data-ns=\"%ju\" data-kind=\"%s\" data-region=\"%s\" data-frame=\"%s\">",
                                  event.get("t").toUInt64(), event.get("event").stringView(),
                                  digitizer ? std::to_string(event.get("region").toUInt64()) : "",
                                  digitizer ? std::to_string(event.get("frameNumber").toUInt64()) : ""));
    }
    EXPECT_EQ(rows, expected);

    // The summary's figures are info's.
    std::map<std::string, std::string> summary;  // data-key → text
    const std::regex entry(R"re(<dd data-key="([^"]+)">([^<]*)</dd>)re");
    for (std::sregex_iterator it(dom.begin(), dom.end(), entry), end; it != end; ++it) summary[(*it)[1]] = (*it)[2];
    for (const char* key : {"containerVersion", "frames", "stateFrames", "inputReportFrames", "imageFrames",
                            "firmwareEventFrames", "metadataFrames", "resets"}) {
        EXPECT_EQ(summary[key], std::to_string(info.get(key).toUInt64())) << key;
    }
    EXPECT_EQ(summary["gaps"], std::to_string(info.get("gaps").count()));
    EXPECT_EQ(summary["metadata:Accel"], std::to_string(info.get("metadataKeys").get("Accel").toUInt64()));
    EXPECT_EQ(summary["DebugInfo:ResetCount"], "11");

    // A real picture, not a blank page: a white 1400×1300 PNG compresses to a few kilobytes.
    runChromium("--screenshot=" + folder.path("shot.png"), page);
    const std::string png = readText(folder.path("shot.png"));
    EXPECT_EQ(png.substr(0, 8), "\x89PNG\r\n\x1a\n");
    EXPECT_GT(png.size(), 40'000u);
}

}  // namespace
}  // namespace ZeltoTouch::Tools

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Tests/Tools/ToolsTestSupport.h"
#include "Tools/InspectPage.h"
#include "Tools/InspectTrace.h"
#include "Tools/RecordingFile.h"
#include "Tools/ReplaySession.h"

namespace ZeltoTouch::Tools {
namespace {

using namespace Testing;

constexpr std::string_view kScript =
    "idle 100ms\ntap volume-up 120ms\nidle 300ms\nhold play-pause 800ms\nidle 300ms\nbrush volume-down 250ms\n"
    "idle 300ms\n";

// The trace of a replay, as inspect collects it.
InspectTrace traceOfReplay(const std::string& container, RecordingSummary& summary) {
    InspectTrace trace;
    const PropertyValue data =
        PropertyValue::data(std::span(reinterpret_cast<const uint8_t*>(container.data()), container.size()));
    ReplaySession session(PipelineRecording(data), ReplayOptions{1.0f, true, {}});
    session.run([&](const DeliveredFrame& delivered) {
        summary.add(delivered.frame);
        trace.addEvents(delivered.frame.timestamp, delivered.events);
        if (delivered.image) trace.addImage(delivered.frame.timestamp, *delivered.image, session.pipeline().algs());
        if (delivered.frame.type == PipelineRecording::Frame::Type::Metadata) {
            trace.addMetadata(delivered.frame.timestamp, delivered.frame.key, delivered.frame.value);
        }
    });
    return trace;
}

TEST(InspectTrace, FrameValuesAreWhatAlgsHoldsAfterEachFrame) {
    RecordingSummary summary(2);
    const InspectTrace trace = traceOfReplay(recordScript(kScript), summary);

    // The same reports straight into a pipeline, reading Algs after each image.
    Pipeline pipeline;
    size_t index = 0;
    for (const auto& report :
         Platform::SensorReportGenerator(Platform::GestureScriptParser::parse(kScript)).generateAll()) {
        pipeline.handleInputReport(0, report.bytes.data(), report.bytes.size());
        const auto image = InputReport::Image::parse(report.bytes.data(), report.bytes.size());
        if (!image) continue;
        ASSERT_LT(index, trace.images().size());
        const InspectTrace::ImageFrame& frame = trace.images()[index++];
        const Algs& algs = pipeline.algs();
        const HandStats& hand = algs.handStats();
        SCOPED_TRACE(image->frameNumber);
        EXPECT_EQ(frame.timestampNs, recordedTimeOf(report.scriptTimeMs));
        EXPECT_EQ(frame.frameNumber, image->frameNumber);
        EXPECT_EQ(frame.timeMs, image->timestampMs);
        EXPECT_EQ(frame.raw, image->signedPixels);
        for (int i = 0; i < kPixelCount; ++i) {
            EXPECT_EQ(frame.scaled[i], algs.pixels()[i].value);
            EXPECT_EQ((frame.activeChannels >> i) & 1, algs.pixels()[i].active ? 1 : 0);
        }
        EXPECT_EQ(frame.touchScore, hand.touchScore);
        EXPECT_EQ(frame.frameScore, hand.svm.score);
        EXPECT_EQ(frame.tapScore, hand.tapSVMScore);
        EXPECT_EQ(frame.sd, hand.sd);
        EXPECT_EQ(frame.tsd, hand.tsd);
        EXPECT_EQ(frame.timeDurationRatio, hand.timeDurationRatio);
        EXPECT_EQ(frame.nonActivePixels, hand.nonActivePixels);
        EXPECT_EQ(frame.region, static_cast<uint32_t>(hand.activeRegion));
        const std::string description = algs.touchStateDescription(image->signedPixels, image->timestampMs);
        EXPECT_TRUE(description.ends_with("] " + frame.label)) << description;
    }
    EXPECT_EQ(index, trace.images().size());
}

TEST(InspectTrace, JsonCarriesEveryFrameValueExactly) {
    RecordingExtras extras;
    extras.accelerometer = true;
    extras.stateWrites = {{50, "Algs.ActivationThreshold", PropertyValue::fromFloat(180.5f)}};
    RecordingSummary summary(2);
    const InspectTrace trace = traceOfReplay(recordScript(kScript, extras), summary);
    const PropertyValue data = PropertyValue::fromJSON(trace.json("x.json", summary, PropertyValue::dictionary({})));
    ASSERT_TRUE(data.isDictionary());

    const PropertyValue frames = data.get("frames");
    ASSERT_EQ(frames.get("t").count(), trace.images().size());
    for (size_t i = 0; i < trace.images().size(); ++i) {
        const InspectTrace::ImageFrame& frame = trace.images()[i];
        EXPECT_DOUBLE_EQ(frames.get("t").at(i).toDouble(),
                         static_cast<double>(frame.timestampNs - recordedTimeOf(0)) / 1e6);
        EXPECT_EQ(frames.get("touchScore").at(i).toFloat(), frame.touchScore);
        EXPECT_EQ(frames.get("tapScore").at(i).toFloat(), frame.tapScore);
        EXPECT_EQ(frames.get("timeDurationRatio").at(i).toFloat(), frame.timeDurationRatio);
        EXPECT_EQ(frames.get("raw").at(i).at(14).toUInt64(), static_cast<uint64_t>(static_cast<int64_t>(frame.raw[14])));
        EXPECT_EQ(frames.get("label").at(i).stringView(), frame.label);
    }
    ASSERT_EQ(data.get("events").count(), trace.events().size());
    EXPECT_EQ(data.get("events").at(0).get("ns").stringView(), std::to_string(trace.events()[0].timestampNs));
    EXPECT_EQ(data.get("accel").get("z").count(), trace.accelSamples().size());
    EXPECT_GT(trace.accelSamples().size(), 0u);
    EXPECT_EQ(data.get("accel").get("z").at(0).toFloat(), -1.0f);
    ASSERT_EQ(data.get("stateWrites").count(), 1u);
    EXPECT_EQ(data.get("stateWrites").at(0).get("value").stringView(), "180.5");
    EXPECT_EQ(data.get("channels").count(), static_cast<size_t>(kPixelCount));
}

TEST(InspectTrace, EventsKeepKindRegionAndFrame) {
    InspectTrace trace;
    const HIDEventRef tap = Algs::createTapEvent(PixelRegion::VolumeDown);
    tap->setIntegerValue(kHIDEventFieldDigitizerFrameNumber, 41);
    trace.addEvents(5, {tap, HIDEvent::createVendorDefinedEvent(0, 0xFF60, 2, 0, nullptr, 0, 0)});
    ASSERT_EQ(trace.events().size(), 2u);
    EXPECT_EQ(trace.events()[0].kind, "tap");
    EXPECT_EQ(trace.events()[0].region, 2);
    EXPECT_EQ(trace.events()[0].frameNumber, 41);
    EXPECT_EQ(trace.events()[1].kind, "firmware-reset");
    EXPECT_FALSE(trace.events()[1].digitizer);

    trace.addMetadata(6, "Other", PropertyValue::dictionary({{"X", PropertyValue::fromFloat(1)}}));
    trace.addMetadata(7, "Accel", PropertyValue::string("not a sample"));
    EXPECT_TRUE(trace.accelSamples().empty());
}

TEST(InspectTrace, StateLabelIsTheEndOfTheDescription) {
    EXPECT_EQ(stateLabelOfDescription("ts=1.0, [A=   1    2, O=   0    0] TAP 180ms ActiveRegion=1 ABOVENOISE"),
              "TAP 180ms ActiveRegion=1 ABOVENOISE");
    EXPECT_EQ(stateLabelOfDescription("ts=0.000000, [A=   0    0] "), "");
    EXPECT_EQ(stateLabelOfDescription("no brackets"), "");
}

TEST(InspectPage, TemplateIsFilledInOnePass) {
    EXPECT_EQ(fillTemplate("<t>@A@</t>@B@ a@b @A@", {{"A", "@B@"}, {"B", "x"}}), "<t>@B@</t>x a@b @B@");
    EXPECT_THROW(fillTemplate("@MISSING@", {}), std::logic_error);
}

TEST(InspectPage, DataCannotEndItsScriptElement) {
    const std::string json = R"({"key": "</script><script>alert(1)</script><!--"})";
    const std::string safe = scriptSafeJSON(json);
    EXPECT_EQ(safe.find('<'), std::string::npos);
    EXPECT_EQ(PropertyValue::fromJSON(safe), PropertyValue::fromJSON(json));
    EXPECT_EQ(escapeHTML(R"(<a href="x">&</a>)"), "&lt;a href=&quot;x&quot;&gt;&amp;&lt;/a&gt;");
}

TEST(InspectPage, EmbedsTheChartLibraryAndThePageScript) {
    const std::string page = inspectPage("T <1>", R"({"a": "</script>"})");
    EXPECT_THAT(page, ::testing::HasSubstr("<title>T &lt;1&gt;</title>"));
    EXPECT_THAT(page, ::testing::HasSubstr("Dygraph"));
    EXPECT_THAT(page, ::testing::HasSubstr("recording-data"));
    EXPECT_THAT(page, ::testing::HasSubstr(R"({"a": "\u003c/script>"})"));
    EXPECT_EQ(page.find("@DATA@"), std::string::npos);
}

}  // namespace
}  // namespace ZeltoTouch::Tools

#include "Shared/Pipeline/Pipeline.h"

#include <string>
#include <tuple>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Shared/Util/StateKey.h"

namespace ZeltoTouch {
namespace {

using testing::ElementsAre;
using Bytes = std::vector<uint8_t>;

Bytes imageReport(uint32_t frameNumber) {
    Bytes bytes(73, 0);
    bytes[0] = 1;
    for (int i = 0; i < 4; ++i) bytes[1 + i] = static_cast<uint8_t>(frameNumber >> (8 * i));
    return bytes;
}

Bytes firmwareEventReport(uint8_t event) { return {2, event, 1, 2, 3, 4, 5, 6, 7, 8}; }

template <typename Signature, typename F>
void install(Pipeline::Probe<Signature>& probe, F f) {
    probe = std::make_shared<std::function<Signature>>(std::move(f));
}

// A pipeline with every probe installed, each writing one line per call so tests can read the order.
struct ProbedPipeline {
    Pipeline pipeline;
    std::vector<std::string> calls;

    ProbedPipeline() {
        const auto log = [this](std::string line) { calls.push_back(std::move(line)); };
        using Key = const std::string&;
        using Value = const PropertyValue&;
        using Image = const InputReport::Image&;
        install(pipeline.setStateProbe, [=](uint64_t, Key key, Value) { log("setState " + key); });
        install(pipeline.getStateProbe, [=](Key key) { log("getState " + key); });
        install(pipeline.metadataProbe, [=](uint64_t, Key key, Value) { log("metadata " + key); });
        install(pipeline.inputReportProbe,
                [=](uint64_t, const uint8_t*, uint64_t n) { log("input " + std::to_string(n)); });
        install(pipeline.invalidInputReportProbe, [=](uint64_t, const uint8_t*, uint64_t) { log("invalid"); });
        install(pipeline.firmwareEventProbe,
                [=](uint64_t, const InputReport::FirmwareEvent& e) { log("firmware " + std::to_string(e.event)); });
        install(pipeline.imageProbe, [=](uint64_t, Image i) { log("image " + std::to_string(i.frameNumber)); });
        install(pipeline.disjointImageProbe, [=](uint64_t, uint32_t previous, Image i) {
            log("disjoint " + std::to_string(previous) + "->" + std::to_string(i.frameNumber));
        });
        install(pipeline.hidEventsProbe, [=](uint64_t, const HIDEventList& events) {
            for (const HIDEventRef& event : events) log(event->description());
        });
    }
    void feed(std::initializer_list<Bytes> reports, uint64_t timestamp = 0) {
        for (const Bytes& report : reports) pipeline.handleInputReport(timestamp, report.data(), report.size());
    }
    uint64_t debugCounter(const char* key) { return pipeline.getState("DebugInfo").get(key).toUInt64(); }
};

// Input reports of every ID and length are run through the pipeline elsewhere; the feature
// report is read here only.
TEST(InputReport, HoldDurationFeatureReportNeedsItsIdAndFiveBytes) {
    const uint8_t hold[] = {0x1F, 0x10, 0x27, 0x00, 0x00};
    EXPECT_EQ(FeatureReport::FactoryResetHoldDuration::parse(hold, sizeof hold), 10000u);
    EXPECT_FALSE(FeatureReport::FactoryResetHoldDuration::parse(hold, 4));
    const uint8_t otherID[] = {0x1E, 0x10, 0x27, 0x00, 0x00};
    EXPECT_FALSE(FeatureReport::FactoryResetHoldDuration::parse(otherID, sizeof otherID));
    EXPECT_FALSE(FeatureReport::FactoryResetHoldDuration::parse(nullptr, 0));
}

TEST(InputReport, FieldsAreLittleEndianAndPixelsSignedOrUnsigned) {
    Bytes bytes(100, 0xAB);  // the tail after 73 bytes is ignored
    const uint8_t header[] = {1, 0xFF, 0xFF, 0xFF, 0xFF, 0xE8, 0x03, 0, 0, 9, 8, 7, 6};
    std::copy(std::begin(header), std::end(header), bytes.begin());
    std::fill(bytes.begin() + 13, bytes.begin() + 73, 0);
    bytes[13] = bytes[14] = 0xFF;                  // unsigned A
    bytes[43] = bytes[44] = 0xFF;                  // signed A
    bytes[43 + 28] = 0x34, bytes[43 + 29] = 0x12;  // signed O
    const auto image = InputReport::Image::parse(bytes.data(), bytes.size());
    ASSERT_TRUE(image);
    EXPECT_EQ(image->frameNumber, 4294967295u);
    EXPECT_EQ(image->timestampMs, 1000u);
    EXPECT_EQ(image->aux, (std::array<uint8_t, 4>{9, 8, 7, 6}));
    EXPECT_EQ(image->unsignedPixels[0], 65535);
    EXPECT_EQ(image->signedPixels[0], -1);
    EXPECT_EQ(image->signedPixels[14], 0x1234);
    EXPECT_EQ(image->unsignedPixels[14], 0);

    const Bytes event = firmwareEventReport(0);
    EXPECT_EQ(InputReport::FirmwareEvent::parse(event.data(), event.size())->context,
              (std::array<uint8_t, 8>{1, 2, 3, 4, 5, 6, 7, 8}));
}

TEST(Pipeline, ImagesCallProbesInOrderAndCountGapsWithWrap) {
    ProbedPipeline p;
    for (uint32_t frame : {5u, 6u, 8u, 4294967295u, 0u, 0u}) p.feed({imageReport(frame)});
    EXPECT_THAT(p.calls, ElementsAre("input 73", "image 5", "input 73", "image 6", "input 73", "image 8",
                                     "disjoint 6->8", "input 73", "image 4294967295", "disjoint 8->4294967295",
                                     "input 73", "image 0", "input 73", "image 0", "disjoint 0->0"));
    EXPECT_EQ(p.debugCounter("DisjointImageCount"), 3u);
    EXPECT_EQ(p.debugCounter("ResetCount"), 0u);
}

// Only a firmware reset appends the vendor event, stamped with the report's time; a reset does
// not forget the last frame number.
TEST(Pipeline, FirmwareResetAppendsVendorEventAndOtherEventsOrInvalidReportsOnlyReachTheirProbes) {
    ProbedPipeline p;
    p.feed({imageReport(10), firmwareEventReport(0)}, 777);
    p.feed({firmwareEventReport(3), {}, {1, 2, 3}, Bytes(72, 1), imageReport(11), imageReport(13)});
    EXPECT_THAT(p.calls, ElementsAre("input 73", "image 10", "input 10", "firmware 0",
                                     "HIDEvent vendor-defined ts=777 phase=0x0 options=0x0 usagePage=0xff60 usage=0x2 "
                                     "version=0 length=0",
                                     "input 10", "firmware 3", "input 0", "invalid", "input 3", "invalid", "input 72",
                                     "invalid", "input 73", "image 11", "input 73", "image 13", "disjoint 11->13"));
    EXPECT_EQ(p.debugCounter("ResetCount"), 1u);
    EXPECT_EQ(p.debugCounter("DisjointImageCount"), 1u);
}

TEST(Pipeline, StateKeysRouteByDomain) {
    ProbedPipeline p;
    p.pipeline.setState(1, "Other.Key", PropertyValue::fromUInt32(1));
    p.pipeline.handleMetadata(2, "Accel", PropertyValue::null());
    EXPECT_FALSE(p.pipeline.getState("Unknown").hasValue());
    EXPECT_FALSE(p.pipeline.getState("Algs").hasValue());
    EXPECT_TRUE(p.pipeline.getState("DebugInfo").isDictionary());
    EXPECT_THAT(p.calls, ElementsAre("setState Other.Key", "metadata Accel", "getState Unknown", "getState Algs",
                                     "getState DebugInfo"));
}

TEST(StripDomainFromKey, StripsExactlyOneLeadingDomainAndPoint) {
    const std::tuple<const char*, const char*, bool, const char*> cases[] = {
        {"Algs.ActivationThreshold", "Algs", true, "ActivationThreshold"}, {"Algs.", "Algs", true, ""},
        {"Algs", "Algs", false, "Algs"}, {"AlgsX.Key", "Algs", false, "AlgsX.Key"}, {"Alg", "Algs", false, "Alg"},
        {"Pipeline.Pipeline.DebugInfo", "Pipeline", true, "Pipeline.DebugInfo"},
        {"pipeline.DebugInfo", "Pipeline", false, "pipeline.DebugInfo"}, {"", "Algs", false, ""},
    };
    for (const auto& [original, domain, stripped, rest] : cases) {
        std::string key = original;
        EXPECT_EQ(Util::stripDomainFromKey(key, domain), stripped) << original;
        EXPECT_EQ(key, rest) << original;
    }
}

}  // namespace
}  // namespace ZeltoTouch

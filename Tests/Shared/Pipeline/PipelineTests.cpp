#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Util/StateKey.h"

using namespace ZeltoTouch;
using testing::ElementsAre;

namespace {

std::vector<uint8_t> imageReport(uint32_t frameNumber) {
    std::vector<uint8_t> bytes(73, 0);
    bytes[0] = 1;
    for (int i = 0; i < 4; ++i) bytes[1 + i] = static_cast<uint8_t>(frameNumber >> (8 * i));
    return bytes;
}

std::vector<uint8_t> firmwareEventReport(uint8_t event) { return {2, event, 1, 2, 3, 4, 5, 6, 7, 8}; }

// Installs every probe and writes one line per call, so tests can read the order.
struct ProbeLog {
    std::vector<std::string> calls;
    std::vector<HIDEventList> eventLists;

    explicit ProbeLog(Pipeline& pipeline) {
        pipeline.setStateProbe = probe<void(uint64_t, const std::string&, const PropertyValue&)>(
            [this](uint64_t, const std::string& key, const PropertyValue&) { calls.push_back("setState " + key); });
        pipeline.getStateProbe =
            probe<void(const std::string&)>([this](const std::string& key) { calls.push_back("getState " + key); });
        pipeline.metadataProbe = probe<void(uint64_t, const std::string&, const PropertyValue&)>(
            [this](uint64_t, const std::string& key, const PropertyValue&) { calls.push_back("metadata " + key); });
        pipeline.inputReportProbe = probe<void(uint64_t, const uint8_t*, uint64_t)>(
            [this](uint64_t, const uint8_t*, uint64_t length) { calls.push_back("input " + std::to_string(length)); });
        pipeline.invalidInputReportProbe = probe<void(uint64_t, const uint8_t*, uint64_t)>(
            [this](uint64_t, const uint8_t*, uint64_t) { calls.push_back("invalid"); });
        pipeline.firmwareEventProbe = probe<void(uint64_t, const InputReport::FirmwareEvent&)>(
            [this](uint64_t, const InputReport::FirmwareEvent& e) { calls.push_back("firmware " + std::to_string(e.event)); });
        pipeline.imageProbe = probe<void(uint64_t, const InputReport::Image&)>(
            [this](uint64_t, const InputReport::Image& i) { calls.push_back("image " + std::to_string(i.frameNumber)); });
        pipeline.disjointImageProbe = probe<void(uint64_t, uint32_t, const InputReport::Image&)>(
            [this](uint64_t, uint32_t previous, const InputReport::Image& i) {
                calls.push_back("disjoint " + std::to_string(previous) + "->" + std::to_string(i.frameNumber));
            });
        pipeline.hidEventsProbe = probe<void(uint64_t, const HIDEventList&)>(
            [this](uint64_t t, const HIDEventList& events) {
                calls.push_back("events " + std::to_string(events.size()) + " @" + std::to_string(t));
                eventLists.push_back(events);
            });
    }

    template <typename Signature, typename F>
    static Pipeline::Probe<Signature> probe(F f) {
        return std::make_shared<std::function<Signature>>(std::move(f));
    }
};

void feed(Pipeline& pipeline, const std::vector<uint8_t>& report, uint64_t timestamp = 0) {
    pipeline.handleInputReport(timestamp, report.data(), report.size());
}

uint32_t debugCounter(Pipeline& pipeline, const char* key) {
    return static_cast<uint32_t>(pipeline.getState("DebugInfo").get(key).toUInt64());
}

}  // namespace

TEST(Pipeline, ImagesCallProbesInOrderAndCountGapsWithWrap) {
    Pipeline pipeline;
    ProbeLog log(pipeline);
    for (uint32_t frame : {5u, 6u, 8u, 4294967295u, 0u, 0u}) feed(pipeline, imageReport(frame));

    EXPECT_THAT(log.calls, ElementsAre("input 73", "image 5", "input 73", "image 6", "input 73", "image 8",
                                       "disjoint 6->8", "input 73", "image 4294967295", "disjoint 8->4294967295",
                                       "input 73", "image 0", "input 73", "image 0", "disjoint 0->0"));
    EXPECT_EQ(debugCounter(pipeline, "DisjointImageCount"), 3u);
    EXPECT_EQ(debugCounter(pipeline, "ResetCount"), 0u);
}

TEST(Pipeline, FirmwareResetAppendsVendorEventStampedWithReportTime) {
    Pipeline pipeline;
    ProbeLog log(pipeline);
    feed(pipeline, firmwareEventReport(0), 777);

    EXPECT_THAT(log.calls, ElementsAre("input 10", "firmware 0", "events 1 @777"));
    ASSERT_EQ(log.eventLists.size(), 1u);
    const HIDEventRef& reset = log.eventLists[0].back();
    EXPECT_EQ(reset->type(), kHIDEventTypeVendorDefined);
    EXPECT_EQ(reset->usagePage(), 0xFF60);
    EXPECT_EQ(reset->usage(), 2);
    EXPECT_EQ(reset->version(), 0u);
    EXPECT_TRUE(reset->data().empty());
    EXPECT_EQ(reset->timestamp(), 777u);
    EXPECT_EQ(debugCounter(pipeline, "ResetCount"), 1u);
}

TEST(Pipeline, OtherFirmwareEventsAndInvalidReportsOnlyReachTheirProbes) {
    Pipeline pipeline;
    ProbeLog log(pipeline);
    feed(pipeline, firmwareEventReport(3));
    feed(pipeline, {});
    feed(pipeline, {1, 2, 3});
    feed(pipeline, std::vector<uint8_t>(72, 1));

    EXPECT_THAT(log.calls, ElementsAre("input 10", "firmware 3", "input 0", "invalid", "input 3", "invalid",
                                       "input 72", "invalid"));
    EXPECT_EQ(debugCounter(pipeline, "ResetCount"), 0u);
}

TEST(Pipeline, ResetDoesNotForgetTheLastFrameNumber) {
    Pipeline pipeline;
    feed(pipeline, imageReport(10));
    feed(pipeline, firmwareEventReport(0));
    feed(pipeline, firmwareEventReport(0));
    feed(pipeline, imageReport(11));
    feed(pipeline, imageReport(13));
    EXPECT_EQ(debugCounter(pipeline, "ResetCount"), 2u);
    EXPECT_EQ(debugCounter(pipeline, "DisjointImageCount"), 1u);
}

TEST(Pipeline, StateKeysRouteByDomain) {
    Pipeline pipeline;
    ProbeLog log(pipeline);
    pipeline.setState(1, "Other.Key", PropertyValue::fromUInt32(1));
    pipeline.handleMetadata(2, "Accel", PropertyValue::null());
    EXPECT_FALSE(pipeline.getState("Unknown").hasValue());
    EXPECT_FALSE(pipeline.getState("Algs").hasValue());
    EXPECT_TRUE(pipeline.getState("DebugInfo").isDictionary());
    EXPECT_THAT(log.calls,
                ElementsAre("setState Other.Key", "metadata Accel", "getState Unknown", "getState Algs", "getState DebugInfo"));
}

TEST(StripDomainFromKey, StripsExactlyOneLeadingDomainAndPoint) {
    struct Case {
        const char* key;
        const char* domain;
        bool stripped;
        const char* rest;
    };
    const Case cases[] = {
        {"Algs.ActivationThreshold", "Algs", true, "ActivationThreshold"},
        {"Algs.", "Algs", true, ""},
        {"Algs", "Algs", false, "Algs"},
        {"AlgsX.Key", "Algs", false, "AlgsX.Key"},
        {"Alg", "Algs", false, "Alg"},
        {"Pipeline.Pipeline.DebugInfo", "Pipeline", true, "Pipeline.DebugInfo"},
        {"pipeline.DebugInfo", "Pipeline", false, "pipeline.DebugInfo"},
        {"", "Algs", false, ""},
    };
    for (const Case& c : cases) {
        std::string key = c.key;
        EXPECT_EQ(Util::stripDomainFromKey(key, c.domain), c.stripped) << c.key;
        EXPECT_EQ(key, c.rest) << c.key;
    }
}

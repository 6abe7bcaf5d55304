#include <algorithm>
#include <cmath>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Shared/Recording/PipelineRecording.h"
#include "Tests/Service/ServiceInspector.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

PropertyValue key(std::string_view text) { return PropertyValue::string(text); }

class ServiceProperties : public testing::Test {
protected:
    void SetUp() override {
        logCapture().clear();
        ASSERT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
    }

    PropertyValue get(std::string_view text) { return service->getPropertyForKey(key(text)); }
    bool set(std::string_view text, PropertyValue value) { return service->setProperty(value, key(text)); }

    RegisteredDevice registered;
    ServicePointer service = makeService();
    ZeltoTouchHIDServiceInspector inspector{*service};
};

TEST_F(ServiceProperties, VersionIsThreeSignedNumbers) {
    const PropertyValue version = get("Version");
    ASSERT_TRUE(version.isArray());
    ASSERT_EQ(version.count(), 3u);
    const uint64_t expected[] = {17, 0, 0};
    for (size_t i = 0; i < 3; ++i) {
        EXPECT_EQ(version.at(i).numberKind(), PropertyValue::NumberKind::Int32);
        EXPECT_EQ(version.at(i).toUInt64(), expected[i]);
    }
}

TEST_F(ServiceProperties, FirmwareDebugReportsHasTenEntriesEvenWhenOneIsRefused) {
    registered.device->failFeatureReport(0x04, static_cast<ZeltoReturn>(0xE00002F0u));
    const PropertyValue reports = get("FirmwareDebugReports");
    ASSERT_TRUE(reports.isDictionary());
    EXPECT_EQ(reports.count(), 10u);
    EXPECT_EQ(reports.get("0x04").stringView(), "Failed to get report ID 0x4: 0xe00002f0");
    for (uint32_t id : {0x10u, 0x11u, 0x12u, 0x13u, 0x1Du, 0x32u, 0x3Bu, 0x3Cu, 0x3Fu}) {
        const std::string reportKey = format("0x%02jx", id);
        const auto bytes = InjectingDevice::featureReportBytes(id, 8);
        std::string hex;
        for (uint8_t byte : bytes) hex += format("%02x ", byte);
        EXPECT_EQ(reports.get(reportKey).stringView(), hex) << reportKey;
    }
    EXPECT_TRUE(reports.get("0x1d").isString());
}

TEST_F(ServiceProperties, FactoryResetHoldDurationParsesReport0x1F) {
    registered.device->setFeatureReport(0x1F, {0x1F, 0x10, 0x27, 0x00, 0x00});
    const PropertyValue duration = get("FactoryResetHoldDuration");
    EXPECT_EQ(duration.numberKind(), PropertyValue::NumberKind::UInt32);
    EXPECT_EQ(duration.toUInt64(), 10000u);

    registered.device->setFeatureReport(0x1F, {0x1F, 0x10});
    EXPECT_FALSE(get("FactoryResetHoldDuration").hasValue()) << "a report too short to parse";
    registered.device->failFeatureReport(0x1F, kZeltoNoResources);
    EXPECT_FALSE(get("FactoryResetHoldDuration").hasValue()) << "a refused report";
}

TEST_F(ServiceProperties, OnlyTheDottedPipelineDomainReachesThePipeline) {
    ASSERT_TRUE(registered.device->setProperty("Pipeline", PropertyValue::string("device's own")));
    ASSERT_TRUE(registered.device->setProperty("pipeline.DebugInfo", PropertyValue::string("device's too")));

    const PropertyValue debugInfo = get("Pipeline.DebugInfo");
    ASSERT_TRUE(debugInfo.isDictionary());
    EXPECT_EQ(debugInfo.get("ResetCount").toUInt64(), 0u);
    EXPECT_TRUE(get("Pipeline.Algs.DebugInfo").hasValue());
    EXPECT_EQ(get("Pipeline").stringView(), "device's own");
    EXPECT_EQ(get("pipeline.DebugInfo").stringView(), "device's too");
    EXPECT_FALSE(get("Pipeline.NoSuchKey").hasValue());
    EXPECT_FALSE(get("SomethingElse").hasValue());
}

TEST_F(ServiceProperties, PipelineWritesAreRecordedWithoutTheDomainAndReturnTrue) {
    EXPECT_TRUE(set("Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(650)));
    EXPECT_TRUE(set("Pipeline.NoSuchKey", PropertyValue::fromInt32(1)));
    EXPECT_EQ(get("Pipeline.Algs.HoldTimeoutMilliseconds").toUInt64(), 650u);

    const PipelineRecording recording = inspector.recording();
    const auto& frames = recording.frames();
    ASSERT_EQ(frames.size(), 2u);
    EXPECT_EQ(frames.front().type, PipelineRecording::Frame::Type::State);
    EXPECT_EQ(frames.front().key, "Algs.HoldTimeoutMilliseconds");
    EXPECT_EQ(frames.front().value.toUInt64(), 650u);
    EXPECT_GT(frames.front().timestamp, 0u) << "stamped with the current mach time";
    EXPECT_EQ(frames.back().key, "NoSuchKey");
}

TEST_F(ServiceProperties, OtherWritesAreTheDevicesToAnswer) {
    EXPECT_TRUE(set("Version", PropertyValue::fromInt32(3)));
    EXPECT_EQ(registered.device->copyProperty("Version").toUInt64(), 3u);
    registered.device->setPropertyAnswer(false);
    EXPECT_FALSE(set("Recording", PropertyValue::string("x")));
    EXPECT_FALSE(set("pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(1)));
    EXPECT_TRUE(inspector.recording().frames().empty());
}

TEST_F(ServiceProperties, MissingOrNonStringKeysReadNothingAndRefuseWrites) {
    EXPECT_FALSE(service->getPropertyForKey(PropertyValue()).hasValue());
    EXPECT_FALSE(service->setProperty(PropertyValue::fromInt32(1), PropertyValue()));
    EXPECT_FALSE(service->getPropertyForKey(PropertyValue::fromInt32(1)).hasValue());
    EXPECT_FALSE(service->setProperty(PropertyValue::fromInt32(1), PropertyValue::fromInt32(1)));
}

TEST_F(ServiceProperties, RecordingIsTheContainerOfEverythingRecorded) {
    ASSERT_TRUE(set("Pipeline.Algs.EnableTapSuppression", PropertyValue::fromBool(false)));
    const PropertyValue text = get("Recording");
    ASSERT_TRUE(text.isString());
    const PipelineRecording loaded(PropertyValue::data(
        std::span(reinterpret_cast<const uint8_t*>(text.stringView().data()), text.length())));
    ASSERT_EQ(loaded.frames().size(), 1u);
    EXPECT_EQ(loaded.frames().front().key, "Algs.EnableTapSuppression");
    EXPECT_EQ(logCapture().countEqual("getPropertyForKey:Recording"), 1u);
}

TEST_F(ServiceProperties, WritesJSONCannotHoldAreLeftOutOfTheRecordingWithAnError) {
    // Data and NaN have no JSON form; they still reach the pipeline, but only the frames that
    // can be written make up the container.
    ASSERT_TRUE(set("Pipeline.Algs.Blob", PropertyValue::data(std::vector<uint8_t>{1, 2})));
    ASSERT_TRUE(set("Pipeline.Algs.ActivationThreshold", PropertyValue::fromDouble(std::nan(""))));
    ASSERT_TRUE(set("Pipeline.Algs.EnableTapSuppression", PropertyValue::fromBool(false)));
    const PropertyValue text = get("Recording");
    ASSERT_TRUE(text.isString());
    const PipelineRecording loaded(PropertyValue::data(
        std::span(reinterpret_cast<const uint8_t*>(text.stringView().data()), text.length())));
    ASSERT_EQ(loaded.frames().size(), 1u);
    EXPECT_EQ(loaded.frames().front().key, "Algs.EnableTapSuppression");
    EXPECT_EQ(logCapture().countContaining("Recording: left out 2 frames that JSON cannot represent"), 1u);
}

TEST_F(ServiceProperties, ServicePluginDebugCombinesFiveKeys) {
    const PropertyValue debug = get("ServicePluginDebug");
    ASSERT_TRUE(debug.isDictionary());
    std::vector<std::string> keys = debug.keys();
    std::sort(keys.begin(), keys.end());
    EXPECT_EQ(keys, (std::vector<std::string>{"FirmwareDebugReports", "Pipeline.Algs.DebugInfo", "Pipeline.DebugInfo",
                                              "Recording", "Version"}));
    EXPECT_EQ(debug.get("Version"), get("Version"));
    EXPECT_EQ(debug.get("Pipeline.DebugInfo"), get("Pipeline.DebugInfo"));
}

TEST_F(ServiceProperties, WithoutADeviceTheDeviceKeysHaveNoValue) {
    ASSERT_EQ(service->stop(), kZeltoSuccess);
    EXPECT_FALSE(get("FirmwareDebugReports").hasValue());
    EXPECT_FALSE(get("FactoryResetHoldDuration").hasValue());
    EXPECT_FALSE(get("Product").hasValue());
    EXPECT_FALSE(set("Product", PropertyValue::string("x")));
    EXPECT_EQ(get("ServicePluginDebug").count(), 4u) << "FirmwareDebugReports is left out";
    EXPECT_TRUE(get("Version").hasValue());
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

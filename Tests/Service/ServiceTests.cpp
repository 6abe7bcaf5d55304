#include <algorithm>
#include <cmath>
#include <functional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Shared/Recording/PipelineRecording.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

// A service started on an injecting device.
class StartedService : public testing::Test {
protected:
    void SetUp() override {
        logCapture().clear();
        ASSERT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
    }

    PropertyValue get(std::string_view key) { return service->getPropertyForKey(PropertyValue::string(key)); }
    bool set(std::string_view key, const PropertyValue& value) {
        return service->setProperty(value, PropertyValue::string(key));
    }

    RegisteredDevice registered;
    ServicePointer service = makeService();
};

TEST_F(StartedService, OpenAndCloseReachTheDeviceWithTheHostsOptionsAndHostOperationsLogTheirNames) {
    EXPECT_TRUE(service->openWithOptions(0x2A));
    registered.device->openStatus = kZeltoNoResources;
    EXPECT_FALSE(service->openWithOptions(7));
    service->closeWithOptions(0x10);
    EXPECT_EQ(registered.device->openOptions, (std::vector<uint32_t>{0x2A, 7}));
    EXPECT_EQ(registered.device->closeOptions, (std::vector<uint32_t>{0x10}));
    EXPECT_EQ(logCapture().countEqual("openWithOptions:2a"), 1u);
    EXPECT_EQ(logCapture().countEqual("closeWithOptions:10"), 1u);
    const std::pair<std::function<void(ZeltoTouchHIDService&)>, const char*> cases[] = {
        {[](auto& s) { s.probeWithService(0, PropertyValue(), nullptr); }, "probeWithService:properties:outScore:"},
        {[](auto& s) { s.startWithService(0, PropertyValue()); }, "startWithService:properties:"},
        {[](auto& s) { s.stop(); }, "stop"},
        {[](auto& s) { s.setEventCallback(nullptr, nullptr, nullptr); }, "setEventCallback:target:refcon:"},
        {[](auto& s) { s.unscheduleWithDispatchQueue(nullptr); }, "unscheduleWithDispatchQueue:"},
        {[](auto& s) { s.copyEventWithType(11, nullptr, 0); }, "copyEventWithType:matching:options:"},
        {[](auto& s) { s.setOutputEvent(nullptr); }, "setOutputEvent:"},
    };
    for (const auto& [call, line] : cases) {
        logCapture().clear();
        call(*service);
        EXPECT_EQ(logCapture().countEqual(line), 1u) << line;
    }
}

TEST_F(StartedService, FirmwareDebugReportsHasTenEntriesEvenWhenOneIsRefusedAndHoldDurationParsesReport0x1F) {
    registered.device->featureFailures[0x04] = static_cast<ZeltoReturn>(0xE00002F0u);
    const PropertyValue reports = get("FirmwareDebugReports");
    EXPECT_EQ(reports.keys().size(), 10u);
    EXPECT_EQ(reports.get("0x04").stringView(), "Failed to get report ID 0x4: 0xe00002f0");
    for (uint32_t id : {0x10u, 0x11u, 0x12u, 0x13u, 0x1Du, 0x32u, 0x3Bu, 0x3Cu, 0x3Fu}) {
        std::string hex;  // the device answers ID, ID+1, ... ID+7
        for (uint32_t i = 0; i < 8; ++i) hex += format("%02x ", id + i);
        EXPECT_EQ(reports.get(format("0x%02jx", id)).stringView(), hex) << id;
    }
    registered.device->featureReports[0x1F] = {0x1F, 0x10, 0x27, 0x00, 0x00};
    EXPECT_TRUE(get("FactoryResetHoldDuration") == PropertyValue::fromUInt32(10000));
    EXPECT_EQ(get("FactoryResetHoldDuration").numberKind(), PropertyValue::NumberKind::UInt32);
    registered.device->featureReports[0x1F] = {0x1F, 0x10};
    EXPECT_FALSE(get("FactoryResetHoldDuration").hasValue()) << "a report too short to parse";
    registered.device->featureFailures[0x1F] = kZeltoNoResources;
    EXPECT_FALSE(get("FactoryResetHoldDuration").hasValue()) << "a refused report";
}

TEST_F(StartedService, OnlyStringKeysAndOnlyTheDottedPipelineDomainReachThePipelineTheRestIsTheDevices) {
    registered.device->properties = {{"Pipeline", PropertyValue::string("device's own")},
                                     {"pipeline.DebugInfo", PropertyValue::string("device's too")}};
    EXPECT_TRUE(get("Pipeline.DebugInfo").get("ResetCount") == PropertyValue::fromUInt32(0));
    EXPECT_TRUE(get("Pipeline.Algs.DebugInfo").isDictionary());
    EXPECT_EQ(get("Pipeline").stringView(), "device's own");
    EXPECT_EQ(get("pipeline.DebugInfo").stringView(), "device's too");
    EXPECT_FALSE(get("Pipeline.NoSuchKey").hasValue());
    EXPECT_FALSE(get("SomethingElse").hasValue());
    for (const PropertyValue& key : {PropertyValue(), PropertyValue::fromInt32(1)}) {
        EXPECT_FALSE(service->getPropertyForKey(key).hasValue());
        EXPECT_FALSE(service->setProperty(PropertyValue::fromInt32(1), key));
    }

    EXPECT_TRUE(set("Version", PropertyValue::fromInt32(3)));
    EXPECT_EQ(registered.device->properties["Version"].toUInt64(), 3u);
    registered.device->acceptsProperties = false;
    EXPECT_FALSE(set("Recording", PropertyValue::string("x")));
    EXPECT_FALSE(set("pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(1)));
    EXPECT_TRUE(PipelineRecording(get("Recording")).frames().empty());
}

// Pipeline writes are recorded without the domain. Data and NaN have no JSON form: they still
// reach the pipeline, but only the frames that can be written make up the container.
TEST_F(StartedService, PipelineWritesReturnTrueAndTheRecordingHoldsThoseJSONCanHold) {
    EXPECT_TRUE(set("Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(650)));
    EXPECT_TRUE(set("Pipeline.NoSuchKey", PropertyValue::fromInt32(1)));
    EXPECT_TRUE(set("Pipeline.Algs.Blob", PropertyValue::data(std::vector<uint8_t>{1, 2})));
    EXPECT_TRUE(set("Pipeline.Algs.ActivationThreshold", PropertyValue::fromDouble(std::nan(""))));
    EXPECT_TRUE(set("Pipeline.Algs.EnableTapSuppression", PropertyValue::fromBool(false)));
    EXPECT_EQ(get("Pipeline.Algs.HoldTimeoutMilliseconds").toUInt64(), 650u);

    const PropertyValue text = get("Recording");
    EXPECT_TRUE(text.isString());
    const PipelineRecording loaded(text);
    std::vector<std::string> keys;
    for (const PipelineRecording::Frame& frame : loaded.frames()) keys.push_back(frame.key);
    EXPECT_EQ(keys,
              (std::vector<std::string>{"Algs.HoldTimeoutMilliseconds", "NoSuchKey", "Algs.EnableTapSuppression"}));
    const PipelineRecording::Frame& first = loaded.frames().front();
    EXPECT_EQ(first.type, PipelineRecording::Frame::Type::State);
    EXPECT_EQ(first.value.toUInt64(), 650u);
    EXPECT_GT(first.timestamp, 0u) << "stamped with the current mach time";
    EXPECT_EQ(logCapture().countContaining("Recording: left out 2 frames that JSON cannot represent"), 1u);
    EXPECT_EQ(logCapture().countEqual("getPropertyForKey:Recording"), 1u);
}

TEST_F(StartedService, VersionIsThreeSignedNumbersAndServicePluginDebugCombinesFiveKeysWithoutADeviceFour) {
    const PropertyValue version = get("Version");
    EXPECT_EQ(version, PropertyValue::array({PropertyValue::fromInt32(17), PropertyValue::fromInt32(0),
                                             PropertyValue::fromInt32(0)}));
    for (const PropertyValue& n : version.elements()) EXPECT_EQ(n.numberKind(), PropertyValue::NumberKind::Int32);
    const PropertyValue debug = get("ServicePluginDebug");
    std::vector<std::string> keys = debug.keys();
    std::sort(keys.begin(), keys.end());
    EXPECT_EQ(keys, (std::vector<std::string>{"FirmwareDebugReports", "Pipeline.Algs.DebugInfo", "Pipeline.DebugInfo",
                                              "Recording", "Version"}));
    EXPECT_EQ(debug.get("Version"), version);
    EXPECT_EQ(debug.get("Pipeline.DebugInfo"), get("Pipeline.DebugInfo"));

    ASSERT_EQ(service->stop(), kZeltoSuccess);
    for (const char* key : {"FirmwareDebugReports", "FactoryResetHoldDuration", "Product"}) {
        EXPECT_FALSE(get(key).hasValue()) << key;
    }
    EXPECT_FALSE(set("Product", PropertyValue::string("x")));
    EXPECT_EQ(get("ServicePluginDebug").keys().size(), 4u) << "FirmwareDebugReports is left out";
    EXPECT_TRUE(get("Version").hasValue());
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

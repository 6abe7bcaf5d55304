#include <functional>
#include <string>

#include <gtest/gtest.h>

#include "Tests/Service/ServiceInspector.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

class ServiceLifecycle : public testing::Test {
protected:
    void SetUp() override { logCapture().clear(); }

    RegisteredDevice registered;
    ServicePointer service = makeService();
    ZeltoTouchHIDServiceInspector inspector{*service};
};

TEST_F(ServiceLifecycle, ConstructionBuildsTheChainWithoutDeviceOrThread) {
    EXPECT_EQ(inspector.recording().maxFrameCount(), 4350u);
    EXPECT_TRUE(inspector.recording().frames().empty());
    EXPECT_FALSE(inspector.hasDevice());
    EXPECT_FALSE(inspector.hasInputReportRunLoop());
    EXPECT_EQ(inspector.installedProbeCount(), 0);
    EXPECT_EQ(service->referenceCount(), 1u);
}

TEST_F(ServiceLifecycle, ProbeSucceedsAndNeverWritesTheScore) {
    int32_t score = -1234;
    EXPECT_EQ(service->probeWithService(registered.service.handle(), PropertyValue(), &score), kZeltoSuccess);
    EXPECT_EQ(score, -1234);
    EXPECT_EQ(service->probeWithService(0, PropertyValue(), nullptr), kZeltoSuccess);
}

TEST_F(ServiceLifecycle, StartNeedsADeviceObject) {
    EXPECT_EQ(service->startWithService(0xDEAD, PropertyValue()), kZeltoNoResources);
    EXPECT_FALSE(inspector.hasDevice());
    EXPECT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
    EXPECT_TRUE(inspector.hasDevice());
}

TEST_F(ServiceLifecycle, OpenAndCloseReachTheDeviceWithTheHostsOptions) {
    ASSERT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
    EXPECT_TRUE(service->openWithOptions(0x2A));
    registered.device->setOpenStatus(kZeltoNoResources);
    EXPECT_FALSE(service->openWithOptions(7));
    service->closeWithOptions(0x10);
    EXPECT_EQ(registered.device->openOptions(), (std::vector<uint32_t>{0x2A, 7}));
    EXPECT_EQ(registered.device->closeOptions(), (std::vector<uint32_t>{0x10}));
    EXPECT_EQ(logCapture().countEqual("openWithOptions:2a"), 1u);
    EXPECT_EQ(logCapture().countEqual("closeWithOptions:10"), 1u);
}

TEST_F(ServiceLifecycle, WithoutDeviceOpenFailsAndCloseDoesNothing) {
    EXPECT_FALSE(service->openWithOptions(0));
    service->closeWithOptions(0);
    EXPECT_TRUE(registered.device->closeOptions().empty());
}

TEST_F(ServiceLifecycle, StopIsHarmlessTwiceAndWithoutStart) {
    EXPECT_EQ(service->stop(), kZeltoSuccess);
    ASSERT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
    EXPECT_EQ(service->stop(), kZeltoSuccess);
    EXPECT_FALSE(inspector.hasDevice());
    EXPECT_EQ(service->stop(), kZeltoSuccess);
}

TEST_F(ServiceLifecycle, RestartCreatesAFreshDeviceAndKeepsRecordingAndAlgorithmState) {
    int devicesCreated = 0;
    Platform::ScopedDeviceService counting([&] {
        ++devicesCreated;
        return std::make_shared<InjectingDevice>();
    });
    ASSERT_EQ(service->startWithService(counting.handle(), PropertyValue()), kZeltoSuccess);
    ASSERT_TRUE(service->setProperty(PropertyValue::fromUInt32(777),
                                     PropertyValue::string("Pipeline.Algs.HoldTimeoutMilliseconds")));
    EXPECT_EQ(service->stop(), kZeltoSuccess);
    ASSERT_EQ(service->startWithService(counting.handle(), PropertyValue()), kZeltoSuccess);

    EXPECT_EQ(devicesCreated, 2);
    EXPECT_EQ(inspector.recording().frames().size(), 1u);
    EXPECT_EQ(service->getPropertyForKey(PropertyValue::string("Pipeline.Algs.HoldTimeoutMilliseconds")).toUInt64(),
              777u);
}

TEST_F(ServiceLifecycle, HostOperationsLogTheirNames) {
    struct Case {
        std::function<void(ZeltoTouchHIDService&)> call;
        const char* line;
    };
    const Case cases[] = {
        {[](auto& s) { s.probeWithService(0, PropertyValue(), nullptr); }, "probeWithService:properties:outScore:"},
        {[](auto& s) { s.startWithService(0, PropertyValue()); }, "startWithService:properties:"},
        {[](auto& s) { s.stop(); }, "stop"},
        {[](auto& s) { s.setEventCallback(nullptr, nullptr, nullptr); }, "setEventCallback:target:refcon:"},
        {[](auto& s) { s.unscheduleWithDispatchQueue(nullptr); }, "unscheduleWithDispatchQueue:"},
        {[](auto& s) { s.copyEventWithType(11, nullptr, 0); }, "copyEventWithType:matching:options:"},
        {[](auto& s) { s.setOutputEvent(nullptr); }, "setOutputEvent:"},
    };
    for (const Case& c : cases) {
        logCapture().clear();
        c.call(*service);
        EXPECT_EQ(logCapture().countEqual(c.line), 1u) << c.line;
    }
}

TEST_F(ServiceLifecycle, EventCopyAndOutputEventsAreNotOffered) {
    auto matching = HIDEvent::createAccelerometerEvent(1, 0, 0, 0, 0);
    EXPECT_EQ(service->copyEventWithType(kHIDEventTypeAccelerometer, matching.get(), 0), nullptr);
    EXPECT_EQ(service->setOutputEvent(matching.get()), kZeltoUnsupported);
}

// The defaults of the base class, seen through a service that overrides nothing.
class BareService final : public ZeltoHIDService {
public:
    static BareService* create() { return new BareService; }
};

TEST(ZeltoHIDServiceDefaults, EveryOperationRefuses) {
    BareService* bare = BareService::create();
    int32_t score = 5;
    EXPECT_EQ(bare->probeWithService(1, PropertyValue(), &score), kZeltoUnsupported);
    EXPECT_EQ(score, 5);
    EXPECT_EQ(bare->startWithService(1, PropertyValue()), kZeltoUnsupported);
    EXPECT_EQ(bare->stop(), kZeltoUnsupported);
    EXPECT_FALSE(bare->openWithOptions(0));
    EXPECT_FALSE(bare->getPropertyForKey(PropertyValue::string("Version")).hasValue());
    EXPECT_FALSE(bare->setProperty(PropertyValue::fromInt32(1), PropertyValue::string("Version")));
    EXPECT_EQ(bare->copyEventWithType(11, nullptr, 0), nullptr);
    EXPECT_EQ(bare->setOutputEvent(nullptr), kZeltoUnsupported);
    EXPECT_EQ(bare->release(), 0u);
}

TEST(ZeltoHIDServiceTables, LayoutAndBackPointers) {
    BareService* bare = BareService::create();
    void* plugin = bare->getPluginInterface();
    void* serviceInterface = bare->getServiceInterface();
    const auto& pluginTable = **static_cast<ZeltoHIDServicePlugInInterface**>(plugin);
    const auto& serviceTable = **static_cast<ZeltoHIDServiceInterface**>(serviceInterface);

    EXPECT_EQ(pluginTable.object, bare);
    EXPECT_EQ(serviceTable.object, bare);
    EXPECT_EQ(pluginTable.version, 1);
    EXPECT_EQ(pluginTable.revision, 0);
    EXPECT_EQ(pluginTable.reserved, 0u);
    EXPECT_EQ(ZeltoHIDService::fromInterface(plugin), bare);
    EXPECT_EQ(ZeltoHIDService::fromInterface(serviceInterface), bare);
    EXPECT_EQ(pluginTable.AddRef(plugin), 2u);
    EXPECT_EQ(serviceTable.Release(serviceInterface), 1u);
    EXPECT_EQ(serviceTable.Release(serviceInterface), 0u);
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

// The built plug-in module, loaded the way a host loads it and driven only through its tables.

#include <dlfcn.h>

#include <chrono>
#include <memory>
#include <stdexcept>
#include <thread>

#include <gtest/gtest.h>

#include "Platform/PluginHost.h"
#include "Platform/SimulatedSensor.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

// The module opened by hand, for what a PluginHost hides: the factory and the reference counts.
class RawModule {
public:
    RawModule() : _handle(dlopen(ZELTO_PLUGIN_PATH, RTLD_NOW | RTLD_LOCAL)) {
        if (!_handle) throw std::runtime_error(dlerror());
        factory = reinterpret_cast<ZeltoHIDServiceFactoryFunction>(dlsym(_handle, kZeltoHIDServiceFactoryName));
    }
    ~RawModule() { dlclose(_handle); }

    ZeltoHIDServiceFactoryFunction factory = nullptr;

private:
    void* _handle;
};

ZeltoHIDServicePlugInInterface& pluginTable(void* plugin) {
    return **static_cast<ZeltoHIDServicePlugInInterface**>(plugin);
}
ZeltoHIDServiceInterface& serviceTable(void* service) { return **static_cast<ZeltoHIDServiceInterface**>(service); }

// The count, read the only way the tables allow: one AddRef and one Release.
uint32_t countOf(void* interfacePointer) {
    auto& table = pluginTable(interfacePointer);  // slots 1 to 3 are the same in both tables
    table.AddRef(interfacePointer);
    return table.Release(interfacePointer);
}

TEST(PluginFactory, ExportsTheFactoryAndRefusesOtherTypes) {
    RawModule module;
    ASSERT_NE(module.factory, nullptr);
    EXPECT_EQ(module.factory(nullptr, kZeltoHIDServiceInterfaceID), nullptr);
    EXPECT_EQ(module.factory(nullptr, ZeltoUUID{}), nullptr);
}

TEST(PluginReferences, InterfacesShareOneCountAndTheLastReleaseDestroys) {
    RawModule module;
    void* plugin = module.factory(nullptr, kZeltoHIDServicePlugInTypeID);
    ASSERT_NE(plugin, nullptr);
    auto& table = pluginTable(plugin);
    EXPECT_EQ(table.version, 1);
    EXPECT_EQ(table.revision, 0);
    EXPECT_EQ(countOf(plugin), 1u) << "the host holds exactly one reference";

    EXPECT_EQ(table.AddRef(plugin), 2u);
    EXPECT_EQ(table.Release(plugin), 1u);

    void* service = nullptr;
    ASSERT_EQ(table.QueryInterface(plugin, kZeltoHIDServiceInterfaceID, &service), kZeltoSuccess);
    ASSERT_NE(service, nullptr);
    EXPECT_EQ(serviceTable(service).object, table.object);
    EXPECT_EQ(countOf(service), 2u);
    EXPECT_EQ(serviceTable(service).Release(service), 1u);

    void* again = nullptr;
    ASSERT_EQ(serviceTable(service).QueryInterface(service, kZeltoPlugInInterfaceID, &again), kZeltoSuccess);
    EXPECT_EQ(again, plugin);
    EXPECT_EQ(table.Release(plugin), 1u);

    EXPECT_EQ(table.Release(plugin), 0u);  // frees the object and both tables (asan checks)
}

TEST(PluginReferences, UnknownInterfacesAreRefusedWithoutAReference) {
    RawModule module;
    void* plugin = module.factory(nullptr, kZeltoHIDServicePlugInTypeID);
    ASSERT_NE(plugin, nullptr);
    const ZeltoUUID genericUnknown = {
        {0, 0, 0, 0, 0, 0, 0, 0, 0xC0, 0, 0, 0, 0, 0, 0, 0x46}};
    for (const ZeltoUUID& id : {genericUnknown, kZeltoHIDServicePlugInTypeID, ZeltoUUID{}}) {
        void* out = &module;
        EXPECT_EQ(pluginTable(plugin).QueryInterface(plugin, id, &out), kZeltoNoInterface);
        EXPECT_EQ(out, &module) << "out is left untouched";
        EXPECT_EQ(countOf(plugin), 1u);
    }
    EXPECT_EQ(pluginTable(plugin).Release(plugin), 0u);
}

class PluginLifecycle : public testing::Test {
protected:
    void SetUp() override { logCapture().clear(); }

    RegisteredDevice registered;
    std::unique_ptr<Platform::PluginHost> host = Platform::PluginHost::load(ZELTO_PLUGIN_PATH);
};

TEST_F(PluginLifecycle, ProbeLeavesTheScoreUntouched) {
    int32_t score = 314;
    EXPECT_EQ(host->probe(registered.service.handle(), PropertyValue(), score), kZeltoSuccess);
    EXPECT_EQ(score, 314);
}

TEST_F(PluginLifecycle, StopTwiceIsHarmlessAndRestartKeepsTheRecording) {
    ASSERT_EQ(host->start(registered.service.handle()), kZeltoSuccess);
    EXPECT_TRUE(host->open(3));
    EXPECT_TRUE(host->setProperty(PropertyValue::string("Pipeline.Algs.HoldTimeoutMilliseconds"),
                                  PropertyValue::fromUInt32(900)));
    host->close(3);
    EXPECT_EQ(host->stop(), kZeltoSuccess);
    EXPECT_EQ(host->stop(), kZeltoSuccess);
    ASSERT_EQ(host->start(registered.service.handle()), kZeltoSuccess);

    const PropertyValue recording = host->copyProperty(PropertyValue::string("Recording"));
    EXPECT_NE(recording.stringView().find("Algs.HoldTimeoutMilliseconds"), std::string_view::npos);
    EXPECT_EQ(host->copyProperty(PropertyValue::string("Pipeline.Algs.HoldTimeoutMilliseconds")).toUInt64(), 900u);
    EXPECT_EQ(registered.device->openOptions(), (std::vector<uint32_t>{3}));
    EXPECT_EQ(registered.device->closeOptions(), (std::vector<uint32_t>{3}));
}

TEST_F(PluginLifecycle, StartWithAnUnknownServiceHasNoResources) {
    EXPECT_EQ(host->start(0xFFFFFFF0), kZeltoNoResources);
}

TEST_F(PluginLifecycle, ServiceTableDefaults) {
    void* service = host->serviceInterface();
    EXPECT_EQ(serviceTable(service).copyEvent(service, kHIDEventTypeDigitizer, nullptr, 0), nullptr);
    EXPECT_EQ(serviceTable(service).setOutputEvent(service, nullptr), kZeltoUnsupported);
    EXPECT_EQ(serviceTable(service).copyProperty(service, nullptr), nullptr);
    EXPECT_FALSE(serviceTable(service).setProperty(service, nullptr, nullptr));
}

// A simulated sensor plays a short script in real time; the events arrive through the table
// callback on the host's queue, exactly those the pipeline makes of the script's reports.
TEST_F(PluginLifecycle, ScriptedSensorEndToEnd) {
    constexpr const char* kScript = "idle 100ms\ntap volume-up 120ms\nidle 300ms\nhold play-pause 800ms\nidle 300ms\n";
    auto sensor = std::make_shared<Platform::SimulatedSensor>(Platform::GestureScriptParser::parse(kScript));
    Platform::ScopedDeviceService sensorService([sensor] { return sensor; });

    ASSERT_EQ(host->start(sensorService.handle()), kZeltoSuccess);
    ASSERT_TRUE(host->open());
    void* service = host->serviceInterface();
    auto queue = Platform::DispatchQueue::fromHandle(host->queue().handle());
    EventCollector collector(queue);
    int refcon = 0;
    serviceTable(service).setEventCallback(service, EventCollector::callback, &collector, &refcon);
    serviceTable(service).scheduleWithDispatchQueue(service, queue->handle());

    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (!sensor->playbackFinished() && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    ASSERT_TRUE(sensor->playbackFinished());
    serviceTable(service).unscheduleFromDispatchQueue(service, queue->handle());
    queue->barrier();

    const auto expected = pipelineEvents(reportsOfScript(kScript));
    ASSERT_GE(expected.size(), 4u) << "may-begin and tap, may-begin and hold start at least";
    EXPECT_EQ(collector.events(), expected);
    for (const auto& delivery : collector.deliveries()) {
        EXPECT_TRUE(delivery.onQueue);
        EXPECT_EQ(delivery.sender, service);
        EXPECT_EQ(delivery.refcon, &refcon);
        EXPECT_EQ(delivery.options, 0u);
    }
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

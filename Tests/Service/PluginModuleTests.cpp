// The built plug-in module, loaded the way a host loads it and driven only through its tables.

#include <dlfcn.h>

#include <memory>

#include <gtest/gtest.h>

#include "Platform/PluginHost.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

// The module opened by hand, for what a PluginHost hides: the factory and the reference counts.
struct RawModule {
    std::unique_ptr<void, int (*)(void*)> handle{dlopen(ZELTO_PLUGIN_PATH, RTLD_NOW | RTLD_LOCAL), dlclose};
    ZeltoHIDServiceFactoryFunction factory =
        reinterpret_cast<ZeltoHIDServiceFactoryFunction>(dlsym(handle.get(), kZeltoHIDServiceFactoryName));
};

auto& pluginTable(void* plugin) { return **static_cast<ZeltoHIDServicePlugInInterface**>(plugin); }
auto& serviceTable(void* service) { return **static_cast<ZeltoHIDServiceInterface**>(service); }

// The count, read the only way the tables allow: one AddRef and one Release.
uint32_t countOf(void* interfacePointer) {
    auto& table = pluginTable(interfacePointer);  // slots 1 to 3 are the same in both tables
    table.AddRef(interfacePointer);
    return table.Release(interfacePointer);
}

// The factory and QueryInterface refuse other types without taking a reference.
TEST(PluginReferences, InterfacesShareOneCountOtherTypesAreRefusedAndTheLastReleaseDestroys) {
    RawModule module;
    ASSERT_NE(module.factory, nullptr);
    EXPECT_EQ(module.factory(nullptr, kZeltoHIDServiceInterfaceID), nullptr);
    EXPECT_EQ(module.factory(nullptr, ZeltoUUID{}), nullptr);
    void* plugin = module.factory(nullptr, kZeltoHIDServicePlugInTypeID);
    ASSERT_NE(plugin, nullptr);
    auto& table = pluginTable(plugin);
    EXPECT_EQ(table.version, 1);
    EXPECT_EQ(table.revision, 0);
    EXPECT_EQ(countOf(plugin), 1u) << "the host holds exactly one reference";
    const ZeltoUUID genericUnknown = {{0, 0, 0, 0, 0, 0, 0, 0, 0xC0, 0, 0, 0, 0, 0, 0, 0x46}};
    for (const ZeltoUUID& id : {genericUnknown, kZeltoHIDServicePlugInTypeID, ZeltoUUID{}}) {
        void* out = &module;
        EXPECT_EQ(table.QueryInterface(plugin, id, &out), kZeltoNoInterface);
        EXPECT_EQ(out, &module) << "out is left untouched";
        EXPECT_EQ(countOf(plugin), 1u);
    }
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

class PluginLifecycle : public testing::Test {
protected:
    RegisteredDevice registered;
    std::unique_ptr<Platform::PluginHost> host = Platform::PluginHost::load(ZELTO_PLUGIN_PATH);
};

// Probe leaves the score alone, stop is harmless twice, a restart makes a fresh device and keeps
// the recording and the algorithm state, and what the service refuses is refused through the table.
TEST_F(PluginLifecycle, ProbeStartStopAndRestartThroughTheTables) {
    int32_t score = 314;
    EXPECT_EQ(host->probe(registered.service.handle(), PropertyValue(), score), kZeltoSuccess);
    EXPECT_EQ(score, 314);
    EXPECT_EQ(host->start(0xFFFFFFF0), kZeltoNoResources);
    int devicesCreated = 0;
    Platform::ScopedDeviceService counting([&] {
        ++devicesCreated;
        return registered.device;
    });
    ASSERT_EQ(host->start(counting.handle()), kZeltoSuccess);
    EXPECT_TRUE(host->open(3));
    const PropertyValue holdTimeout = PropertyValue::string("Pipeline.Algs.HoldTimeoutMilliseconds");
    EXPECT_TRUE(host->setProperty(holdTimeout, PropertyValue::fromUInt32(900)));
    host->close(3);
    EXPECT_EQ(host->stop(), kZeltoSuccess);
    EXPECT_EQ(host->stop(), kZeltoSuccess);
    ASSERT_EQ(host->start(counting.handle()), kZeltoSuccess);
    EXPECT_EQ(devicesCreated, 2);
    EXPECT_NE(host->copyProperty(PropertyValue::string("Recording")).stringView().find("Algs.HoldTimeoutMilliseconds"),
              std::string_view::npos);
    EXPECT_EQ(host->copyProperty(holdTimeout).toUInt64(), 900u);
    EXPECT_EQ(registered.device->openOptions, (std::vector<uint32_t>{3}));
    EXPECT_EQ(registered.device->closeOptions, (std::vector<uint32_t>{3}));

    void* service = host->serviceInterface();
    EXPECT_EQ(serviceTable(service).copyEvent(service, kHIDEventTypeDigitizer, nullptr, 0), nullptr);
    EXPECT_EQ(serviceTable(service).setOutputEvent(service, nullptr), kZeltoUnsupported);
    EXPECT_EQ(serviceTable(service).copyProperty(service, nullptr), nullptr);
    EXPECT_FALSE(serviceTable(service).setProperty(service, nullptr, nullptr));
}

// Events arrive through the table callback on the host's queue, exactly those the pipeline
// makes of the reports.
TEST_F(PluginLifecycle, ReportsBecomeEventsThroughTheTables) {
    ASSERT_EQ(host->start(registered.service.handle()), kZeltoSuccess);
    ASSERT_TRUE(host->open());
    void* service = host->serviceInterface();
    auto queue = Platform::DispatchQueue::fromHandle(host->queue().handle());
    int refcon = 0;
    EventCollector collector(queue, &refcon, service);
    serviceTable(service).setEventCallback(service, EventCollector::callback, &collector, &refcon);
    serviceTable(service).scheduleWithDispatchQueue(service, queue->handle());
    ASSERT_TRUE(registered.device->waitUntilScheduled());
    const auto reports = reportsOfScript("idle 100ms\ntap volume-up 120ms\nidle 300ms\nhold play-pause 800ms\nidle 300ms\n");
    for (const Bytes& report : reports) ASSERT_TRUE(registered.device->deliver(report));
    serviceTable(service).unscheduleFromDispatchQueue(service, queue->handle());
    queue->barrier();

    EventTrace expected;
    expected.play(reports);
    ASSERT_GE(expected.events.size(), 4u) << "may-begin and tap, may-begin and hold start at least";
    EXPECT_EQ(collector.events(), expected.events);
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest

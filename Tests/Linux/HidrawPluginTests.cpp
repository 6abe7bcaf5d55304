// The plug-in module on a HidrawDevice, through the host's interface tables: what the service
// reads from the device when the descriptor behind it refuses every hidraw ioctl.

#include <gtest/gtest.h>

#include <cerrno>
#include <linux/input.h>
#include <sys/socket.h>

#include "Host/Format.h"
#include "Platform/DeviceRegistry.h"
#include "Platform/HidrawDevice.h"
#include "Platform/PluginHost.h"

namespace ZeltoTouch::Platform {
namespace {

class PluginOnHidraw : public ::testing::Test {
protected:
    void SetUp() override {
        int fds[2];
        ASSERT_EQ(::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, fds), 0);
        _peer = fds[1];
        HidrawIdentity identity;
        identity.busType = BUS_USB;
        identity.vendorID = 0x5A54;
        identity.productID = 0x0001;
        identity.name = "Zelto Touch Sensor";
        _device = std::make_shared<HidrawDevice>(fds[0], "/dev/hidraw-test", identity);
        _service.emplace([device = _device] { return device; });
        _host = PluginHost::load(ZELTO_TOUCH_MODULE);
        ASSERT_EQ(_host->start(_service->handle()), kZeltoSuccess);
    }
    void TearDown() override {
        _host.reset();
        _service.reset();
        ::close(_peer);
    }

    PropertyValue property(std::string_view key) { return _host->copyProperty(PropertyValue::string(key)); }

    int _peer = -1;
    std::shared_ptr<HidrawDevice> _device;
    std::optional<ScopedDeviceService> _service;
    std::unique_ptr<PluginHost> _host;
};

TEST_F(PluginOnHidraw, RefusedFeatureReportsShowAsFailureTexts) {
    const PropertyValue reports = property("FirmwareDebugReports");
    ASSERT_TRUE(reports.isDictionary());
    const uint32_t ids[] = {0x04, 0x10, 0x11, 0x12, 0x13, 0x1D, 0x32, 0x3B, 0x3C, 0x3F};
    EXPECT_EQ(reports.count(), std::size(ids));
    for (uint32_t id : ids) {
        EXPECT_EQ(reports.get(format("0x%02x", id)).stringView(),
                  format("Failed to get report ID 0x%x: 0x%x", id, ENOTTY));
    }
    EXPECT_FALSE(property("FactoryResetHoldDuration").hasValue());
}

TEST_F(PluginOnHidraw, TheDevicesOwnPropertiesPassThrough) {
    EXPECT_EQ(property("Product").stringView(), "Zelto Touch Sensor");
    EXPECT_EQ(property("VendorID").toUInt64(), 0x5A54u);
    EXPECT_EQ(property("Transport").stringView(), "USB");
    EXPECT_FALSE(_host->setProperty(PropertyValue::string("Product"), PropertyValue::string("Other")));
}

}  // namespace
}  // namespace ZeltoTouch::Platform

#include <gtest/gtest.h>

#include <filesystem>
#include <linux/input.h>

#include "Platform/HidrawDiscovery.h"
#include "Tests/Linux/TempFolder.h"

namespace ZeltoTouch::Platform {
namespace {

namespace fs = std::filesystem;

// A sysfs tree of our own in a temporary folder.
class FakeSysfs : public ::testing::Test {
protected:
    void addNode(const std::string& name, const std::string& uevent) { _sysfs.addSysfsHidrawNode(name, uevent); }

    Testing::TempFolder _sysfs;
    const fs::path& _root = _sysfs.path();
};

TEST_F(FakeSysfs, ListsNodesInNumberOrderWithTheirIdentity) {
    addNode("hidraw10", "DRIVER=hid-generic\nHID_ID=0005:0000046D:0000B33E\nHID_NAME=Keyboard K\n");
    addNode("hidraw2",
            "DRIVER=hid-generic\nHID_ID=0003:00005A54:00000001\nHID_NAME=Zelto Touch Sensor\n"
            "HID_PHYS=usb-0000:00:14.0-2/input0\nHID_UNIQ=ZT-000123\nMODALIAS=hid:b0003g0001v00005A54p00000001\n");
    addNode("hidraw0", "HID_ID=0018:000004F3:00003057\nHID_NAME=Touchpad = with equals\n");

    const auto nodes = listHidrawNodes(_root, "/dev");
    ASSERT_EQ(nodes.size(), 3u);
    EXPECT_EQ(nodes[0].name, "hidraw0");
    EXPECT_EQ(nodes[1].name, "hidraw2");
    EXPECT_EQ(nodes[2].name, "hidraw10");

    const HidrawIdentity sensor{BUS_USB, 0x5A54, 0x0001, "Zelto Touch Sensor", "usb-0000:00:14.0-2/input0", "ZT-000123"};
    EXPECT_EQ(nodes[1].identity, sensor);
    EXPECT_EQ(nodes[1].devicePath, "/dev/hidraw2");
    EXPECT_EQ(nodes[0].identity.name, "Touchpad = with equals");
    EXPECT_EQ(nodes[0].identity.transportName(), "I2C");
    EXPECT_EQ(nodes[2].identity.transportName(), "Bluetooth");
}

TEST_F(FakeSysfs, ANodeWithoutAReadableUeventIsListedWithoutIdentity) {
    fs::create_directories(_root / "class" / "hidraw" / "hidraw1");
    addNode("hidraw3", "HID_ID=garbage\nHID_NAME=Odd\n");
    const auto nodes = listHidrawNodes(_root, "/dev");
    ASSERT_EQ(nodes.size(), 2u);
    EXPECT_EQ(nodes[0].identity, HidrawIdentity{});
    EXPECT_EQ(nodes[1].identity.name, "Odd");
    EXPECT_EQ(nodes[1].ids(), (VendorProduct{0, 0}));
}

TEST_F(FakeSysfs, NoHidrawClassMeansNoNodes) {
    EXPECT_TRUE(listHidrawNodes(_root, "/dev").empty());
    EXPECT_TRUE(listHidrawNodes(_root / "missing", "/dev").empty());
}

TEST_F(FakeSysfs, MatchesNodesByVendorAndProduct) {
    addNode("hidraw0", "HID_ID=0003:00005A54:00000001\n");
    addNode("hidraw1", "HID_ID=0003:00005A54:00000002\n");
    addNode("hidraw2", "HID_ID=0003:00005A54:00000001\n");
    const auto nodes = listHidrawNodes(_root, "/dev");
    const auto matching = nodesMatching(nodes, {0x5A54, 0x0001});
    ASSERT_EQ(matching.size(), 2u);
    EXPECT_EQ(matching[0].name, "hidraw0");
    EXPECT_EQ(matching[1].name, "hidraw2");
    EXPECT_TRUE(nodesMatching(nodes, {0x5A55, 0x0001}).empty());
}

TEST(HidUevent, ParsesTheFieldsItKnowsAndIgnoresTheRest) {
    const auto identity = parseHidUevent("HID_ID=0003:0000abcd:0000EF01\nHID_NAME=\nHID_UNIQ=x\nNOEQUALS\n");
    EXPECT_EQ(identity.busType, static_cast<uint32_t>(BUS_USB));
    EXPECT_EQ(identity.vendorID, 0xABCD);
    EXPECT_EQ(identity.productID, 0xEF01);
    EXPECT_EQ(identity.name, "");
    EXPECT_EQ(identity.uniqueID, "x");
    for (const char* malformed : {"HID_ID=0003:00005A54", "HID_ID=0003::00000001", "HID_ID=xyz:1:2",
                                  "HID_ID=0003:000000005A54:1"}) {
        EXPECT_EQ(parseHidUevent(malformed), HidrawIdentity{}) << malformed;
    }
}

TEST(VendorProduct, ParsesHexPairsAndRejectsEverythingElse) {
    EXPECT_EQ(parseVendorProduct("5a54:0001"), (VendorProduct{0x5A54, 0x0001}));
    EXPECT_EQ(parseVendorProduct("5A54:1"), (VendorProduct{0x5A54, 0x0001}));
    for (const char* bad : {"", ":", "5a54", "5a54:", ":0001", "5a54:00001", "0x5a54:0001", "5a54:000g", "5a54:0001:2",
                            "-1:0001", "5a54 :0001"}) {
        EXPECT_FALSE(parseVendorProduct(bad)) << bad;
    }
    EXPECT_EQ(formatVendorProduct({0x5A54, 0x0001}), "5a54:0001");
    EXPECT_EQ(formatVendorProduct(kZeltoSensorID), "5a54:0001");
}

}  // namespace
}  // namespace ZeltoTouch::Platform

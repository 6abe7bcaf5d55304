#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Platform/HidrawDevice.h"

namespace ZeltoTouch::Platform {

struct VendorProduct {
    uint16_t vendorID = 0;
    uint16_t productID = 0;
    friend bool operator==(const VendorProduct&, const VendorProduct&) = default;
};

// The sensor's USB identity, which the udev rule matches as well.
inline constexpr VendorProduct kZeltoSensorID{0x5A54, 0x0001};

// "VVVV:PPPP" in hex (1 to 4 digits each, either case); nullopt for anything else.
std::optional<VendorProduct> parseVendorProduct(std::string_view text);
std::string formatVendorProduct(VendorProduct ids);  // "5a54:0001"

struct HidrawNode {
    std::string name;        // "hidraw3"
    std::string devicePath;  // "/dev/hidraw3"
    HidrawIdentity identity;

    VendorProduct ids() const { return {identity.vendorID, identity.productID}; }
};

// The hidraw nodes the kernel lists under <sysfsRoot>/class/hidraw, in node-number order, each
// with the identity from its HID parent's uevent (HID_ID, HID_NAME, HID_PHYS, HID_UNIQ) and its
// node under devRoot. A node whose uevent is missing or unreadable is listed with an empty
// identity. No hidraw class at all (no hidraw driver loaded) yields an empty list.
std::vector<HidrawNode> listHidrawNodes(const std::filesystem::path& sysfsRoot = "/sys",
                                        const std::filesystem::path& devRoot = "/dev");

// The nodes among nodes whose device has ids, in their order.
std::vector<HidrawNode> nodesMatching(const std::vector<HidrawNode>& nodes, VendorProduct ids);

// The identity in the text of a HID device's uevent file; fields it lacks stay empty.
HidrawIdentity parseHidUevent(std::string_view uevent);

}  // namespace ZeltoTouch::Platform

#include "Platform/HidrawDiscovery.h"

#include <algorithm>
#include <charconv>
#include <fstream>
#include <sstream>
#include <system_error>

#include "Host/Format.h"

namespace ZeltoTouch::Platform {

namespace {

// A whole field of hex digits, at most maxDigits of them.
template <typename Number>
std::optional<Number> parseHex(std::string_view text, size_t maxDigits) {
    Number value{};
    if (text.empty() || text.size() > maxDigits) return std::nullopt;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value, 16);
    if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
    return value;
}

// The number after "hidraw", for ordering hidraw2 before hidraw10.
unsigned long nodeNumber(std::string_view name) {
    constexpr std::string_view prefix = "hidraw";
    unsigned long number = 0;
    if (name.starts_with(prefix)) std::from_chars(name.data() + prefix.size(), name.data() + name.size(), number);
    return number;
}

// HID_ID: "BBBB:VVVVVVVV:PPPPPPPP", bus, vendor and product in hex.
void parseHidID(std::string_view text, HidrawIdentity& identity) {
    const size_t first = text.find(':');
    if (first == std::string_view::npos) return;
    const size_t second = text.find(':', first + 1);
    if (second == std::string_view::npos) return;
    const auto bus = parseHex<uint32_t>(text.substr(0, first), 8);
    const auto vendor = parseHex<uint32_t>(text.substr(first + 1, second - first - 1), 8);
    const auto product = parseHex<uint32_t>(text.substr(second + 1), 8);
    if (!bus || !vendor || !product) return;
    identity.busType = *bus;
    identity.vendorID = static_cast<uint16_t>(*vendor);
    identity.productID = static_cast<uint16_t>(*product);
}

std::string readFile(const std::filesystem::path& path) {
    std::ifstream file(path);
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

}  // namespace

std::optional<VendorProduct> parseVendorProduct(std::string_view text) {
    const size_t colon = text.find(':');
    if (colon == std::string_view::npos) return std::nullopt;
    const auto vendor = parseHex<uint16_t>(text.substr(0, colon), 4);
    const auto product = parseHex<uint16_t>(text.substr(colon + 1), 4);
    if (!vendor || !product) return std::nullopt;
    return VendorProduct{*vendor, *product};
}

std::string formatVendorProduct(VendorProduct ids) { return format("%04x:%04x", ids.vendorID, ids.productID); }

HidrawIdentity parseHidUevent(std::string_view uevent) {
    HidrawIdentity identity;
    while (!uevent.empty()) {
        const size_t end = std::min(uevent.find('\n'), uevent.size());
        const std::string_view line = uevent.substr(0, end);
        uevent.remove_prefix(std::min(end + 1, uevent.size()));
        const size_t equals = line.find('=');
        if (equals == std::string_view::npos) continue;
        const std::string_view key = line.substr(0, equals);
        const std::string_view value = line.substr(equals + 1);
        if (key == "HID_ID") parseHidID(value, identity);
        else if (key == "HID_NAME") identity.name = value;
        else if (key == "HID_PHYS") identity.physicalPath = value;
        else if (key == "HID_UNIQ") identity.uniqueID = value;
    }
    return identity;
}

std::vector<HidrawNode> listHidrawNodes(const std::filesystem::path& sysfsRoot, const std::filesystem::path& devRoot) {
    std::vector<HidrawNode> nodes;
    std::error_code error;
    for (const auto& entry : std::filesystem::directory_iterator(sysfsRoot / "class" / "hidraw", error)) {
        HidrawNode node;
        node.name = entry.path().filename().string();
        node.devicePath = (devRoot / node.name).string();
        node.identity = parseHidUevent(readFile(entry.path() / "device" / "uevent"));
        nodes.push_back(std::move(node));
    }
    std::sort(nodes.begin(), nodes.end(), [](const HidrawNode& a, const HidrawNode& b) {
        const auto numberA = nodeNumber(a.name), numberB = nodeNumber(b.name);
        return numberA != numberB ? numberA < numberB : a.name < b.name;
    });
    return nodes;
}

std::vector<HidrawNode> nodesMatching(const std::vector<HidrawNode>& nodes, VendorProduct ids) {
    std::vector<HidrawNode> matching;
    std::copy_if(nodes.begin(), nodes.end(), std::back_inserter(matching),
                 [&](const HidrawNode& node) { return node.ids() == ids; });
    return matching;
}

}  // namespace ZeltoTouch::Platform

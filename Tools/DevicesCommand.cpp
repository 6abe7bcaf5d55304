// zelto-touch devices: the hidraw devices the kernel lists, with the sensor's marked, so a user
// can tell which node `run --device` wants and whether they may open it.

#include <CLI/CLI.hpp>

#include <iostream>
#include <memory>
#include <unistd.h>

#include "Host/Format.h"
#include "Platform/HidrawDiscovery.h"
#include "Tools/Commands.h"
#include "Tools/SensorMatchOption.h"

namespace ZeltoTouch::Tools {

namespace {

using namespace Platform;

struct DevicesOptions {
    std::string match;
    std::string sysfsRoot = "/sys";
    std::string devRoot = "/dev";
};

// Whether this user may read and write the node: what `run` needs.
std::string_view accessText(const std::string& path) {
    if (::access(path.c_str(), F_OK) != 0) return "missing";
    return ::access(path.c_str(), R_OK | W_OK) == 0 ? "ok" : "denied";
}

void listDevices(const DevicesOptions& options) {
    const VendorProduct sensor = matchedIDs(options.match);
    const auto nodes = listHidrawNodes(options.sysfsRoot, options.devRoot);
    if (nodes.empty()) {
        std::cerr << "No hidraw devices (is a HID device connected and the hidraw driver loaded?)\n";
        return;
    }
    std::cout << format("%-16s %-9s %-10s %-7s %-6s %s\n", "NODE", "ID", "BUS", "ACCESS", "SENSOR", "NAME");
    for (const auto& node : nodes) {
        std::cout << format("%-16s %-9s %-10s %-7s %-6s %s\n", node.devicePath, formatVendorProduct(node.ids()),
                            node.identity.transportName(), accessText(node.devicePath),
                            node.ids() == sensor ? "yes" : "", node.identity.name);
    }
}

}  // namespace

void addDevicesCommand(CLI::App& app) {
    auto options = std::make_shared<DevicesOptions>();
    auto* devices = app.add_subcommand("devices", "List the hidraw devices and mark the sensor among them");
    devices->footer(
        "ACCESS tells whether you may open the node (\"denied\": install the udev rule and join the zelto-touch\n"
        "group, or run as root).");
    addMatchOption(*devices, options->match, "Mark the devices with these IDs, VENDOR:PRODUCT in hex");
    // Stand-ins, for tests and unusual systems.
    devices->add_option("--sysfs", options->sysfsRoot, "Where sysfs is mounted")->group("");
    devices->add_option("--dev", options->devRoot, "Where the device nodes are")->group("");
    devices->callback([options] { listDevices(*options); });
}

}  // namespace ZeltoTouch::Tools

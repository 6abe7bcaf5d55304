#pragma once

#include <CLI/CLI.hpp>
#include <string>

#include "Platform/HidrawDiscovery.h"

namespace ZeltoTouch::Tools {

// --match VENDOR:PRODUCT (hex), checked when parsed; the sensor's own IDs when not given.
CLI::Option* addMatchOption(CLI::App& command, std::string& match, const std::string& description);
Platform::VendorProduct matchedIDs(const std::string& match);

}  // namespace ZeltoTouch::Tools

#include "Tools/SensorMatchOption.h"

namespace ZeltoTouch::Tools {

CLI::Option* addMatchOption(CLI::App& command, std::string& match, const std::string& description) {
    return command.add_option("--match", match, description)
        ->default_str(Platform::formatVendorProduct(Platform::kZeltoSensorID))
        ->check([](const std::string& text) {
            return Platform::parseVendorProduct(text) ? std::string()
                                                      : "expected VENDOR:PRODUCT in hex, e.g. 5a54:0001";
        });
}

Platform::VendorProduct matchedIDs(const std::string& match) {
    if (match.empty()) return Platform::kZeltoSensorID;
    return Platform::parseVendorProduct(match).value();  // checked when parsed
}

}  // namespace ZeltoTouch::Tools

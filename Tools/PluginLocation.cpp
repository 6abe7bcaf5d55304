#include "Tools/PluginLocation.h"

#include <array>
#include <stdexcept>
#include <system_error>

#include "Host/Format.h"

namespace ZeltoTouch::Tools {

std::filesystem::path pluginModulePath() {
    std::error_code error;
    const auto executable = std::filesystem::read_symlink("/proc/self/exe", error);
    if (error) throw std::runtime_error(format("Cannot locate the zelto-touch binary: %s", error.message()));
    const auto binDir = executable.parent_path();
    const std::array candidates = {binDir / "../Service/ZeltoTouch.so", binDir / "../lib/zelto-touch/ZeltoTouch.so"};
    for (const auto& candidate : candidates) {
        if (std::filesystem::exists(candidate, error)) return candidate.lexically_normal();
    }
    throw std::runtime_error(format("Cannot find the plug-in module ZeltoTouch.so: looked for %s and %s",
                                    candidates[0].lexically_normal().string(), candidates[1].lexically_normal().string()));
}

}  // namespace ZeltoTouch::Tools

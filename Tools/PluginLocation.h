#pragma once

#include <filesystem>

namespace ZeltoTouch::Tools {

// The ZeltoTouch plug-in module that belongs to this zelto-touch binary: ../Service/ZeltoTouch.so
// next to it in the build tree, ../lib/zelto-touch/ZeltoTouch.so once installed. Throws
// std::runtime_error naming both places when neither holds the module.
std::filesystem::path pluginModulePath();

}  // namespace ZeltoTouch::Tools

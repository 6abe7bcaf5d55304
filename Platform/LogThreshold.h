#pragma once

#include <optional>
#include <string_view>

#include "Shared/Util/Log.h"

namespace ZeltoTouch::Platform {

// The lowest level a sink writes; Off writes nothing.
enum class LogThreshold : uint8_t { Debug, Default, Error, Off };

// The environment variable that sets the stderr threshold: debug, default, error or off.
inline constexpr const char* kLogThresholdVariable = "ZELTO_TOUCH_LOG";

// "debug", "default", "error", "off" (exact, lower case); anything else yields nothing.
std::optional<LogThreshold> parseLogThreshold(std::string_view text) noexcept;

bool thresholdAdmits(LogThreshold threshold, LogLevel level) noexcept;

std::string_view logLevelName(LogLevel level) noexcept;

}  // namespace ZeltoTouch::Platform

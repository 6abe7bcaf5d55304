#include "Platform/LogThreshold.h"

namespace ZeltoTouch::Platform {

std::optional<LogThreshold> parseLogThreshold(std::string_view text) noexcept {
    if (text == "debug") return LogThreshold::Debug;
    if (text == "default") return LogThreshold::Default;
    if (text == "error") return LogThreshold::Error;
    if (text == "off") return LogThreshold::Off;
    return std::nullopt;
}

bool thresholdAdmits(LogThreshold threshold, LogLevel level) noexcept {
    return threshold != LogThreshold::Off && static_cast<uint8_t>(level) >= static_cast<uint8_t>(threshold);
}

std::string_view logLevelName(LogLevel level) noexcept {
    switch (level) {
        case LogLevel::Debug: return "debug";
        case LogLevel::Default: return "default";
        case LogLevel::Error: return "error";
    }
    return "unknown";
}

}  // namespace ZeltoTouch::Platform

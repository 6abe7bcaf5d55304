#pragma once

#include <string_view>

namespace ZeltoTouch::Tools::InspectAssets {

// The inspect report's assets, embedded at build time (Tools/Inspect/Embed.cmake).
extern const std::string_view dygraphsScript;  // from libjs-dygraphs
extern const std::string_view dygraphsStyle;
extern const std::string_view pageTemplate;  // Tools/Inspect/inspect.html
extern const std::string_view pageScript;    // Tools/Inspect/inspect.js
extern const std::string_view pageStyle;     // Tools/Inspect/inspect.css

}  // namespace ZeltoTouch::Tools::InspectAssets

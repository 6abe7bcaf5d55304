#pragma once

#include <cstdint>
#include <string>

namespace ZeltoTouch::Tools {

// The name people use for a region number as gesture events carry it: "play/pause",
// "volume down", "volume up"; "no region" for 0 and "region N" for anything else.
std::string regionName(int64_t region);

}  // namespace ZeltoTouch::Tools

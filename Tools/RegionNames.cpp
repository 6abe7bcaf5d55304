#include "Tools/RegionNames.h"

#include "Shared/Algs/Pixel.h"

namespace ZeltoTouch::Tools {

std::string regionName(int64_t region) {
    switch (region) {
        case static_cast<int64_t>(PixelRegion::None): return "no region";
        case static_cast<int64_t>(PixelRegion::PlayPause): return "play/pause";
        case static_cast<int64_t>(PixelRegion::VolumeDown): return "volume down";
        case static_cast<int64_t>(PixelRegion::VolumeUp): return "volume up";
        default: return "region " + std::to_string(region);
    }
}

}  // namespace ZeltoTouch::Tools

#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "Shared/Algs/Pixel.h"

namespace ZeltoTouch {

// Twenty-three virtual channels, each the sum of three or four neighbouring physical
// channels, so that a finger covering several channels is seen as one. Per frame it sums
// the members above noise and tracks each combination's strongest member.
struct VirtualImage {
    VirtualImage();

    // Recomputes values and maxPixelIndices from the physical pixels' values of this frame.
    // Throws std::out_of_range if pixels holds fewer than 15 entries.
    void updateValues(const std::vector<Pixel>& pixels);

    std::vector<int32_t> values;               // summed member values of this frame
    std::vector<std::string> names;            // member letters, ascending
    std::vector<int32_t> maxPixelIndices;      // strongest member; persists across frames
    std::vector<float> normalizationFactors;   // gain given to each VirtualPixel when built
};

}  // namespace ZeltoTouch

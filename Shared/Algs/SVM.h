#pragma once

#include <array>
#include <cstdint>
#include <vector>

#include "Shared/Algs/Pixel.h"

namespace ZeltoTouch {

// Fixed linear frame classifier over the 38 channel values sorted by rank. It separates a
// real touch from accidental contact; its per-frame score feeds the accumulated touch score.
struct SVM {
    SVM();

    // Scores one frame from its 15 physical and 23 virtual pixels (std::out_of_range if
    // fewer). timeMs is accepted for symmetry with the other frame steps and not used.
    void updateSVMScore(const std::vector<Pixel>& pixels, const std::vector<VirtualPixel>& virtualPixels,
                        float activationThreshold, uint32_t timeMs);
    float getSVMScore() const noexcept { return score; }

    float score = 0;  // 0 when the frame was not evaluated
    std::vector<float> means;
    std::vector<float> scales;
    std::vector<float> weights;
    float bias = 2.0083f;

private:
    // The channel values (physical, then virtual) in descending order.
    std::array<int32_t, kChannelCount> rankDescending(const std::array<int32_t, kChannelCount>& values) noexcept;

    // Channel numbers in the order the last evaluated frame ranked them.
    std::array<uint8_t, kChannelCount> _rankOrder;
};

}  // namespace ZeltoTouch

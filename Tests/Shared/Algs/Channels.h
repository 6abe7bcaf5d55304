#pragma once

#include <vector>

#include "Shared/Algs/Pixel.h"

namespace ZeltoTouch {

// The 15 physical and 23 virtual channels at gain 1, all reading 0, for tests that set channel
// state by hand. Each virtual channel's strongest member is A.
struct Channels {
    Channels() {
        for (int i = 0; i < kPixelCount; ++i) pixels.emplace_back(i, 1.0f);
        for (int i = 0; i < kVirtualPixelCount; ++i) virtualPixels.emplace_back("A", 1.0f).index = 0;
    }
    // Physical channels first, then virtual ones.
    Pixel& operator[](int channel) {
        return channel < kPixelCount ? pixels[channel] : virtualPixels[channel - kPixelCount];
    }

    std::vector<Pixel> pixels;
    std::vector<VirtualPixel> virtualPixels;
};

}  // namespace ZeltoTouch

#include "Shared/Algs/Pixel.h"

#include <array>

namespace ZeltoTouch {

namespace {

constexpr std::array<float, kPixelCount> kChannelGains = {
    1.9219f, 1.8833f, 1.9281f, 1.8837f, 1.9163f, 1.8105f,  // A to F
    1.0081f, 1.0f,    1.4851f, 1.5033f,                    // G to J
    2.4154f,                                               // K
    1.5378f, 1.5431f, 1.04f,   1.0493f,                    // L to O
};

}  // namespace

float channelGain(int index) noexcept { return kChannelGains.at(static_cast<size_t>(index)); }

void Pixel::resetGlobalStats() noexcept {
    everAboveNoise = false;
    everActive = false;
    maxAboveNoise = 0;
}

}  // namespace ZeltoTouch

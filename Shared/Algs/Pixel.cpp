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

constexpr uint32_t kVolumeUpChannels = 0b000'0011'1100'0000;    // G H I J
constexpr uint32_t kVolumeDownChannels = 0b111'1000'0000'0000;  // L M N O
constexpr uint32_t kPlayPauseChannels = 0b000'0100'0011'1111;   // A to F, K

}  // namespace

PixelRegion regionOfChannel(int32_t index) noexcept {
    if (index < 0 || index >= 32) return PixelRegion::None;
    const uint32_t bit = 1u << index;
    if (bit & kVolumeUpChannels) return PixelRegion::VolumeUp;
    if (bit & kVolumeDownChannels) return PixelRegion::VolumeDown;
    if (bit & kPlayPauseChannels) return PixelRegion::PlayPause;
    return PixelRegion::None;
}

float channelGain(int index) noexcept { return kChannelGains.at(static_cast<size_t>(index)); }

void Pixel::resetGlobalStats() noexcept {
    everAboveNoise = false;
    everActive = false;
    maxAboveNoise = 0;
}

}  // namespace ZeltoTouch

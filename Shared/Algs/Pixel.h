#pragma once

#include <cmath>
#include <cstdint>
#include <limits>
#include <string>

#include "Shared/Pipeline/InputReport.h"  // kPixelCount

namespace ZeltoTouch {

// The part of the sensor a channel, and so a gesture, belongs to. The numbers reach the
// host in the gesture events and key the event statistics.
enum class PixelRegion : uint32_t {
    None = 0,
    PlayPause = 1,   // A to F and K
    VolumeDown = 2,  // L to O
    VolumeUp = 3,    // G to J
};

inline constexpr int kVirtualPixelCount = 23;
inline constexpr int kChannelCount = kPixelCount + kVirtualPixelCount;  // physical, then virtual
inline constexpr int kRegionCount = 4;                         // including PixelRegion::None

// A channel value above this is above noise.
inline constexpr int32_t kNoiseLevel = 75;

// The region of a physical channel index (0 to 14); any other index has no region.
inline PixelRegion regionOfChannel(int32_t index) noexcept {
    constexpr uint32_t kVolumeUpChannels = 0b000'0011'1100'0000;    // G H I J
    constexpr uint32_t kVolumeDownChannels = 0b111'1000'0000'0000;  // L M N O
    constexpr uint32_t kPlayPauseChannels = 0b000'0100'0011'1111;   // A to F, K
    if (index < 0 || index >= 32) return PixelRegion::None;
    const uint32_t bit = 1u << index;
    if (bit & kVolumeUpChannels) return PixelRegion::VolumeUp;
    if (bit & kVolumeDownChannels) return PixelRegion::VolumeDown;
    if (bit & kPlayPauseChannels) return PixelRegion::PlayPause;
    return PixelRegion::None;
}

// Gain of physical channel `index` (0 to 14).
float channelGain(int index) noexcept;

// Float to int32, truncating toward zero. Values beyond the int32 range saturate to its
// ends and NaN gives 0, so every input has a defined result.
inline int32_t truncateToInt32(float value) noexcept {
    constexpr float kLimit = 2147483648.0f;  // 2^31, exact; every float below it fits
    if (std::fabs(value) < kLimit) return static_cast<int32_t>(value);  // every reading
    if (std::isnan(value)) return 0;
    if (value >= kLimit) return std::numeric_limits<int32_t>::max();
    if (value < -kLimit) return std::numeric_limits<int32_t>::min();
    return static_cast<int32_t>(value);
}

// Per-frame and per-gesture state of one sensing channel: the scaled reading, its
// normalisation by the activation threshold, a relative hysteresis deciding activity, and
// sticky statistics over the current gesture.
struct Pixel {
    Pixel(int index, float gain) noexcept : gain(gain), index(index) {}

    // One frame of input: scaleReading, then updateActivity. The frame driver runs the two
    // halves as separate passes over all channels so the divisions overlap.
    void updatePixelState(int raw, float activationThreshold) noexcept {
        scaleReading(raw, activationThreshold);
        updateActivity();
    }
    // Sets value and normalizedValue from the raw reading.
    void scaleReading(int raw, float activationThreshold) noexcept {
        value = truncateToInt32(gain * static_cast<float>(raw));
        normalizedValue = static_cast<float>(value) / activationThreshold;
    }
    // Hysteresis and statistics from normalizedValue and the state of the previous frame.
    void updateActivity() noexcept;
    PixelRegion getPixelRegion() const noexcept { return regionOfChannel(index); }
    // Clears the per-gesture statistics; the hysteresis state carries over.
    void resetGlobalStats() noexcept;

    int32_t value = 0;  // gain × raw, truncated toward zero
    float gain;
    float normalizedValue = 0;
    float peak = 0;    // active: highest normalizedValue since activation; else the current one
    float trough = 0;  // inactive: lowest normalizedValue since deactivation; else the current one
    bool active = false;
    bool aboveNoise = false;
    bool everAboveNoise = false;
    bool everActive = false;
    float maxAboveNoise = 0;  // highest normalizedValue among frames above noise
    int32_t index;            // channel index; for a virtual pixel its strongest member
};

// One of the virtual image's channel combinations. Its gain is its normalisation factor,
// and its index follows the strongest member.
struct VirtualPixel : Pixel {
    VirtualPixel(const std::string& name, float gain)
        : Pixel(name.empty() ? 0 : static_cast<unsigned char>(name[0]), gain), name(name) {}

    void updatePixelState(int raw, float activationThreshold, int strongestIndex) noexcept {
        Pixel::updatePixelState(raw, activationThreshold);
        index = strongestIndex;
    }
    using Pixel::updateActivity;
    void updateActivity(int strongestIndex) noexcept {
        updateActivity();
        index = strongestIndex;
    }

    std::string name;  // member letters in ascending order
};

// Hysteresis: an active channel drops out at this fraction of its peak, an inactive one
// comes back above its trough divided by it (and in any case above 1.0).
inline constexpr float kPixelHysteresis = 0.6f;

inline void Pixel::updateActivity() noexcept {
    float threshold;
    if (active) {
        threshold = peak * kPixelHysteresis;
    } else if (trough <= kPixelHysteresis) {
        threshold = 1.0f;  // the quotient below cannot exceed 1.0: skip the division
    } else {
        const float fromTrough = trough / kPixelHysteresis;
        threshold = fromTrough > 1.0f ? fromTrough : 1.0f;  // NaN gives 1.0
    }

    active = normalizedValue > threshold;
    if (active) {
        if (normalizedValue > peak) peak = normalizedValue;
        trough = normalizedValue;
        everActive = true;
    } else {
        peak = normalizedValue;
        if (normalizedValue < trough) trough = normalizedValue;
    }

    aboveNoise = value > kNoiseLevel;
    if (aboveNoise) {
        everAboveNoise = true;
        if (normalizedValue > maxAboveNoise) maxAboveNoise = normalizedValue;
    }
}

}  // namespace ZeltoTouch

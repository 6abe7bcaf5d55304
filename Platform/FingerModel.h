#pragma once

#include <array>
#include <cstdint>
#include <span>

#include "Platform/SensorLayout.h"

namespace ZeltoTouch::Platform {

// Something resting on the surface: a finger or a palm. Its coupling into an electrode falls
// off with distance as a Gaussian of width spread; strength is the channel signal (in scaled
// units, i.e. after the channel's gain) of an electrode right under the contact's centre.
struct Contact {
    SurfacePoint centre;
    float spread = 0;
    float strength = 0;
};

// The physics of the simulated sensor: what each channel reads for a set of contacts.
class FingerModel {
public:
    // The scaled signal of every channel: each electrode's coupling to every contact, summed
    // over the channel's electrodes and the contacts.
    static std::array<float, kPixelCount> channelSignals(std::span<const Contact> contacts);

    // The raw report values for scaled signals: divided by each channel's gain (so that the
    // algorithm's gain brings them back), with noise added, rounded and clamped to 16 bits.
    static std::array<int16_t, kPixelCount> rawValues(const std::array<float, kPixelCount>& signals,
                                                      const std::array<float, kPixelCount>& rawNoise);
};

// Reproducible, roughly Gaussian noise (mean 0, deviation 1) from a seed, the same on every
// platform.
class NoiseSource {
public:
    explicit NoiseSource(uint64_t seed) noexcept : _state(seed ? seed : 0x9E3779B97F4A7C15u) {}
    float next() noexcept;

private:
    uint64_t _state;
};

}  // namespace ZeltoTouch::Platform

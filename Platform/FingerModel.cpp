#include "Platform/FingerModel.h"

#include <algorithm>
#include <cmath>

namespace ZeltoTouch::Platform {

std::array<float, kPixelCount> FingerModel::channelSignals(std::span<const Contact> contacts) {
    std::array<float, kPixelCount> signals{};
    for (int channel = 0; channel < kPixelCount; ++channel) {
        for (const SurfacePoint& electrode : electrodesOfChannel(channel)) {
            for (const Contact& contact : contacts) {
                const float dx = electrode.x - contact.centre.x;
                const float dy = electrode.y - contact.centre.y;
                const float spread2 = 2 * contact.spread * contact.spread;
                signals[static_cast<size_t>(channel)] += contact.strength * std::exp(-(dx * dx + dy * dy) / spread2);
            }
        }
    }
    return signals;
}

std::array<int16_t, kPixelCount> FingerModel::rawValues(const std::array<float, kPixelCount>& signals,
                                                        const std::array<float, kPixelCount>& rawNoise) {
    std::array<int16_t, kPixelCount> raw{};
    for (size_t channel = 0; channel < raw.size(); ++channel) {
        const float value = signals[channel] / channelGain(static_cast<int>(channel)) + rawNoise[channel];
        raw[channel] = static_cast<int16_t>(std::clamp(std::lround(value), -32768L, 32767L));
    }
    return raw;
}

// xorshift64*, and the sum of four uniforms (Irwin-Hall) rescaled to unit deviation.
float NoiseSource::next() noexcept {
    float sum = 0;
    for (int i = 0; i < 4; ++i) {
        _state ^= _state >> 12;
        _state ^= _state << 25;
        _state ^= _state >> 27;
        const uint64_t bits = (_state * 0x2545F4914F6CDD1Du) >> 40;  // 24 bits
        sum += static_cast<float>(bits) / 16777216.0f;
    }
    return (sum - 2.0f) * 1.7320508f;  // variance of the sum is 4/12
}

}  // namespace ZeltoTouch::Platform

// Region tracking of HandStats: which region of the sensor a touch belongs to.
#include <algorithm>
#include <array>

#include "Shared/Algs/HandStats.h"

namespace ZeltoTouch {

namespace {

constexpr int32_t kChannelI = 8;
constexpr int32_t kChannelK = 10;
constexpr int32_t kChannelM = 12;
// Virtual pixels combining K with its neighbours towards the volume regions.
constexpr size_t kVirtualIJK = 18;
constexpr size_t kVirtualKLM = 19;
// How strong K's combination towards a volume region must be, relative to K alone.
constexpr float kChannelKShare = 0.7f;

// Stable insertion sort of the physical pixels by maxAboveNoise, descending: on ties the
// lower channel stays first.
std::array<const Pixel*, kPixelCount> sortedByMaxAboveNoise(const std::vector<Pixel>& pixels) {
    std::array<const Pixel*, kPixelCount> sorted;
    for (size_t i = 0; i < sorted.size(); ++i) {
        const Pixel* pixel = &pixels.at(i);
        size_t j = i;
        for (; j > 0 && sorted[j - 1]->maxAboveNoise < pixel->maxAboveNoise; --j) sorted[j] = sorted[j - 1];
        sorted[j] = pixel;
    }
    return sorted;
}

float regionMaxOf(const std::array<float, kRegionCount>& regionMax, PixelRegion region) noexcept {
    return regionMax[static_cast<size_t>(region)];  // regions are 0 to 3 by construction
}

}  // namespace

float HandStats::fuzzify(float x, float x0, float x1, float y0, float y1) noexcept {
    const float r = (x - x0) / (x1 - x0);
    return r * y1 + (1 - r) * y0;
}

float HandStats::fuzzifyAndClip(float x, float x0, float x1, float y0, float y1) noexcept {
    if (x <= x0) return y0;
    if (x >= x1) return y1;
    return fuzzify(x, x0, x1, y0, y1);
}

float HandStats::updateTimeBiasFactor(uint32_t timeMs) const noexcept {
    const float secondsSinceGesture =
        static_cast<float>(static_cast<double>(static_cast<uint32_t>(timeMs - lastGestureMs)) * 0.001);
    return fuzzifyAndClip(secondsSinceGesture, 0.3f, 1.0f, 0.65f, 1.0f);
}

void HandStats::updateRegionMax(const std::vector<Pixel>& pixels) noexcept {
    regionMax.fill(0);
    for (const Pixel& pixel : pixels) {
        const PixelRegion region = pixel.getPixelRegion();
        if (region == PixelRegion::None) continue;
        const float excess = static_cast<float>(pixel.value) - static_cast<float>(kNoiseLevel);
        float& max = regionMax[static_cast<size_t>(region)];
        if (excess > 0 && excess > max) max = excess;
    }
}

PixelRegion HandStats::updateActiveRegion(const std::vector<Pixel>& pixels,
                                          const std::vector<VirtualPixel>& virtualPixels, uint32_t timeMs) {
    PixelRegion region = regionOfChannel(peakActiveIndex);
    const auto sorted = sortedByMaxAboveNoise(pixels);
    const Pixel& first = *sorted[0];
    const Pixel& second = *sorted[1];
    const float bias = updateTimeBiasFactor(timeMs);
    const float noise = static_cast<float>(kNoiseLevel) / activationThreshold;

    // Soon after a gesture, a runner-up in that gesture's region keeps the touch there.
    if (region != lastGestureRegion && second.maxAboveNoise > noise && first.getPixelRegion() == region) {
        if (second.getPixelRegion() == lastGestureRegion && second.maxAboveNoise > first.maxAboveNoise * bias) {
            region = lastGestureRegion;
        }
    }

    // K neighbours all three regions: a touch centred on it goes to a volume region when
    // K's combination towards that region is strong enough.
    if (peakActiveIndex == kChannelK && first.index == kChannelK && second.maxAboveNoise > noise) {
        const auto share = [&](PixelRegion volumeRegion) {
            return lastGestureRegion == volumeRegion && bias < kChannelKShare ? bias : kChannelKShare;
        };
        if (second.index == kChannelM) {
            if (virtualPixels.at(kVirtualKLM).maxAboveNoise > share(PixelRegion::VolumeDown) * first.maxAboveNoise) {
                region = PixelRegion::VolumeDown;
            }
        } else if (second.index == kChannelI) {
            if (virtualPixels.at(kVirtualIJK).maxAboveNoise > share(PixelRegion::VolumeUp) * first.maxAboveNoise) {
                region = PixelRegion::VolumeUp;
            }
        }
    }

    updateRegionMax(pixels);
    return region;
}

PixelRegion HandStats::changeActiveRegion(const std::vector<Pixel>& pixels, int32_t strongestIndex) noexcept {
    const PixelRegion current = activeRegion;
    previousRegion = current;
    const PixelRegion candidate = regionOfChannel(strongestIndex);
    if (candidate == current) return current;
    if (current == PixelRegion::None || candidate == PixelRegion::None) return candidate;

    const float before = regionMaxOf(regionMax, current);
    const float ratioBefore = before > 0 ? regionMaxOf(regionMax, candidate) / before : 0.0f;
    updateRegionMax(pixels);
    const float now = regionMaxOf(regionMax, current);
    const float drop =
        before > 0 ? static_cast<float>(std::max(static_cast<double>(before - now), 0.0) / before) : 0.0f;
    if (!(now > 0)) return candidate;

    // A falling current region (a lifting finger) needs up to five times the growth.
    regionSwitchGain = fuzzifyAndClip(drop, 0.2f, 0.5f, 1.3f, 5.0f);
    const float ratioNow = regionMaxOf(regionMax, candidate) / now;
    return ratioNow < ratioBefore * regionSwitchGain ? current : candidate;
}

}  // namespace ZeltoTouch

#include "Shared/Algs/SVM.h"

#include <array>
#include <stdexcept>

namespace ZeltoTouch {

namespace {

struct RankTerm {
    float mean;
    float scale;
    float weight;
};

// Rank 1 (largest channel value) first.
constexpr std::array<RankTerm, kChannelCount> kRankTerms = {{
    {559.2485f, 319.631f, 2.0791f},   {458.1396f, 264.2479f, 0.577f},   {409.6764f, 238.355f, -0.0003f},
    {376.5288f, 222.3886f, 1.7971f},  {339.7854f, 211.1872f, 0.8896f},  {302.5308f, 206.0873f, -0.194f},
    {281.1469f, 198.0056f, -1.7877f}, {258.9062f, 189.2092f, 1.9933f},  {234.2004f, 182.5528f, 0.5968f},
    {215.7817f, 177.034f, -0.6801f},  {199.7768f, 170.0103f, -0.1372f}, {184.8617f, 163.5788f, -0.4558f},
    {172.0251f, 157.3571f, 0.3444f},  {160.0365f, 151.1289f, 0.1195f},  {148.0888f, 144.6578f, 0.2427f},
    {135.208f, 138.2757f, 0.2738f},   {124.4527f, 131.4855f, -0.7458f}, {114.4343f, 124.7151f, -0.2226f},
    {104.0568f, 116.673f, -0.95f},    {93.4508f, 107.0524f, -0.238f},   {83.6343f, 98.8414f, 0.0785f},
    {74.3161f, 91.5114f, -1.6108f},   {65.3713f, 84.5376f, -0.4774f},   {57.6177f, 78.8144f, 0.3914f},
    {50.8842f, 72.6408f, -0.0379f},   {43.4918f, 64.3881f, -0.5014f},   {37.2454f, 58.6809f, 0.2391f},
    {31.5491f, 51.8691f, 0.5287f},    {26.5578f, 45.1187f, -0.3405f},   {22.2556f, 39.4927f, 0.2821f},
    {18.6728f, 35.9957f, 0.8225f},    {15.4697f, 32.8257f, -0.5142f},   {12.7815f, 29.4461f, -1.1009f},
    {10.1925f, 25.6704f, 0.3262f},    {7.6475f, 20.1275f, -1.7422f},    {5.3422f, 15.8161f, 0.4487f},
    {3.7211f, 11.7617f, 0.0877f},     {2.1581f, 10.0508f, -0.2101f},
}};

}  // namespace

SVM::SVM() {
    for (size_t channel = 0; channel < _rankOrder.size(); ++channel) {
        _rankOrder[channel] = static_cast<uint8_t>(channel);
    }
    for (const RankTerm& term : kRankTerms) {
        means.push_back(term.mean);
        scales.push_back(term.scale);
        weights.push_back(term.weight);
    }
}

std::array<int32_t, kChannelCount> SVM::rankDescending(const std::array<int32_t, kChannelCount>& values) noexcept {
    // Insertion sort starting from the previous order: a frame ranks its channels much as
    // the last one did, so fewer of them move than from scratch. Equal values keep their
    // order; the score cannot tell them apart anyway.
    std::array<int32_t, kChannelCount> ranked;
    for (size_t rank = 0; rank < ranked.size(); ++rank) ranked[rank] = values[_rankOrder[rank]];
    for (size_t rank = 1; rank < ranked.size(); ++rank) {
        const int32_t value = ranked[rank];
        const uint8_t channel = _rankOrder[rank];
        size_t to = rank;
        for (; to > 0 && ranked[to - 1] < value; --to) {
            ranked[to] = ranked[to - 1];
            _rankOrder[to] = _rankOrder[to - 1];
        }
        ranked[to] = value;
        _rankOrder[to] = channel;
    }
    return ranked;
}

void SVM::updateSVMScore(const std::vector<Pixel>& pixels, const std::vector<VirtualPixel>& virtualPixels,
                         float activationThreshold, uint32_t) {
    score = 0;
    if (means.size() < kChannelCount || scales.size() < kChannelCount || weights.size() < kChannelCount) {
        throw std::out_of_range("SVM: the model needs one term per rank");
    }

    if (pixels.size() < kPixelCount || virtualPixels.size() < kVirtualPixelCount) {
        throw std::out_of_range("SVM: a frame has 15 physical and 23 virtual pixels");
    }
    // Most frames are idle: the ranking is paid for only when the leader is above the
    // threshold or the runner-up above noise, that is when any value is above the
    // threshold or two are above noise.
    std::array<int32_t, kChannelCount> values;
    bool anyAboveThreshold = false;
    int32_t aboveNoise = 0;
    const auto take = [&](size_t channel, int32_t value) {
        values[channel] = value;
        anyAboveThreshold |= static_cast<float>(value) > activationThreshold;
        aboveNoise += value > kNoiseLevel;
    };
    for (size_t i = 0; i < kPixelCount; ++i) take(i, pixels[i].value);
    for (size_t i = 0; i < kVirtualPixelCount; ++i) take(kPixelCount + i, virtualPixels[i].value);
    if (!anyAboveThreshold && aboveNoise < 2) return;

    const std::array<int32_t, kChannelCount> ranked = rankDescending(values);
    // The terms are independent, so they are computed in one pass the compiler can
    // vectorise; the sum then adds them in rank order.
    const float* mean = means.data();
    const float* scale = scales.data();
    const float* weight = weights.data();
    std::array<float, kChannelCount> terms;
    for (size_t k = 0; k < terms.size(); ++k) {
        terms[k] = ((static_cast<float>(ranked[k]) - mean[k]) / scale[k]) * weight[k];
    }
    for (const float term : terms) score += term;
    score = bias + score;
}

}  // namespace ZeltoTouch

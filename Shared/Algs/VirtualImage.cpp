#include "Shared/Algs/VirtualImage.h"

#include <array>
#include <span>
#include <stdexcept>
#include <string_view>

namespace ZeltoTouch {

namespace {

constexpr int32_t channelOfLetter(char letter) noexcept { return letter - 'A'; }

struct VirtualChannel {
    // The members are the channels of the name's letters, in the name's order.
    constexpr VirtualChannel(std::string_view name, float normalizationFactor)
        : name(name), normalizationFactor(normalizationFactor), memberCount(name.size()) {
        for (size_t i = 0; i < memberCount; ++i) memberChannels[i] = channelOfLetter(name[i]);
    }
    std::span<const int32_t> members() const noexcept { return {memberChannels.data(), memberCount}; }

    std::string_view name;
    float normalizationFactor;  // roughly one over the member count
    std::array<int32_t, 4> memberChannels{};
    size_t memberCount;
};

constexpr std::array<VirtualChannel, kVirtualPixelCount> kVirtualChannels = {{
    {"ABE", 0.6667f},  {"ABF", 0.4444f}, {"ADEF", 0.6667f}, {"AEGJ", 0.5714f}, {"BCEF", 0.6667f},
    {"BFHJ", 0.5714f}, {"CDE", 0.6667f}, {"CDF", 0.4651f},  {"CELN", 0.6667f}, {"DFLO", 0.6667f},
    {"EFK", 0.4f},     {"EJK", 0.4f},    {"EKL", 0.4f},     {"FJK", 0.4f},     {"FKL", 0.4f},
    {"GHI", 0.5714f},  {"GIJ", 0.4f},    {"HIJ", 0.4f},     {"IJK", 0.4f},     {"KLM", 0.4f},
    {"LMN", 0.4444f},  {"LMO", 0.5714f}, {"MNO", 0.6667f},
}};

}  // namespace

VirtualImage::VirtualImage() {
    for (const VirtualChannel& channel : kVirtualChannels) names.emplace_back(channel.name);
    for (size_t i = 0; i < names.size(); ++i) {
        maxPixelIndices.push_back(channelOfLetter(names[i].front()));
        values.push_back(0);
        normalizationFactors.push_back(kVirtualChannels[i].normalizationFactor);
    }
}

void VirtualImage::updateValues(const std::vector<Pixel>& pixels) {
    // Every member and strongest index is a channel 0 to 14, so these checks cover every
    // lookup below.
    if (pixels.size() < kPixelCount) throw std::out_of_range("VirtualImage: fewer than 15 pixels");
    if (values.size() < names.size() || maxPixelIndices.size() < names.size()) {
        throw std::out_of_range("VirtualImage: tables of different lengths");
    }
    for (size_t i = 0; i < names.size(); ++i) {
        int32_t sum = 0;
        int32_t strongest = maxPixelIndices[i];
        // Scanning from last frame's choice keeps it on ties, then the earlier letter.
        for (const int32_t member : kVirtualChannels.at(i).members()) {
            const int32_t memberValue = pixels[static_cast<size_t>(member)].value;
            if (memberValue <= kNoiseLevel) continue;
            // Wrapping add: a sum of four scaled 16-bit readings cannot overflow, but any
            // input must stay defined.
            sum = static_cast<int32_t>(static_cast<uint32_t>(sum) + static_cast<uint32_t>(memberValue));
            if (memberValue > pixels[static_cast<size_t>(strongest)].value) strongest = member;
        }
        values[i] = sum;
        maxPixelIndices[i] = strongest;
    }
}

}  // namespace ZeltoTouch

#include "Shared/Algs/VirtualImage.h"

#include <algorithm>
#include <array>
#include <stdexcept>
#include <string_view>

namespace ZeltoTouch {

namespace {

constexpr int32_t channelOfLetter(char letter) noexcept { return letter - 'A'; }

// Member slot of a three-member combination's missing fourth member.
constexpr int32_t kPaddingChannel = kPixelCount;

struct VirtualChannel {
    // The members are the channels of the name's letters, in the name's order.
    constexpr VirtualChannel(std::string_view name, float normalizationFactor)
        : name(name), normalizationFactor(normalizationFactor) {
        for (size_t i = 0; i < memberChannels.size(); ++i) {
            memberChannels[i] = i < name.size() ? channelOfLetter(name[i]) : kPaddingChannel;
            if (i < name.size()) memberMask |= 1u << memberChannels[i];
        }
    }

    std::string_view name;
    float normalizationFactor;  // roughly one over the member count
    std::array<int32_t, 4> memberChannels{};
    uint32_t memberMask = 0;  // bit per member channel
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
    if (names.size() > kVirtualChannels.size()) {
        throw std::out_of_range("VirtualImage: more channels than combinations");
    }
    // What each channel adds to a sum: its value when above noise, else 0. After them one
    // slot of 0 pads the three-member combinations to four.
    std::array<int32_t, kPixelCount + 1> contributions{};
    uint32_t channelsAboveNoise = 0;
    for (size_t i = 0; i < kPixelCount; ++i) {
        const int32_t value = pixels[i].value;
        const bool aboveNoise = value > kNoiseLevel;
        contributions[i] = aboveNoise ? value : 0;
        channelsAboveNoise |= static_cast<uint32_t>(aboveNoise) << i;
    }
    for (size_t i = 0; i < names.size(); ++i) {
        const VirtualChannel& channel = kVirtualChannels[i];
        // Without a member above noise the sum is 0 and the strongest stays.
        if ((channel.memberMask & channelsAboveNoise) == 0) {
            values[i] = 0;
            continue;
        }
        int32_t sum = 0;
        int32_t strongest = maxPixelIndices[i];
        // A member takes over when above noise and above the strongest's value; scanning
        // from last frame's choice keeps it on ties, then the earlier letter.
        int32_t takeOverAbove = std::max(kNoiseLevel, pixels[static_cast<size_t>(strongest)].value);
#pragma GCC unroll 4
        for (const int32_t member : channel.memberChannels) {
            const int32_t contribution = contributions[static_cast<size_t>(member)];
            // Wrapping add: a sum of four scaled 16-bit readings cannot overflow, but any
            // input must stay defined.
            sum = static_cast<int32_t>(static_cast<uint32_t>(sum) + static_cast<uint32_t>(contribution));
            const bool takesOver = contribution > takeOverAbove;
            strongest = takesOver ? member : strongest;
            takeOverAbove = takesOver ? contribution : takeOverAbove;
        }
        values[i] = sum;
        maxPixelIndices[i] = strongest;
    }
}

}  // namespace ZeltoTouch

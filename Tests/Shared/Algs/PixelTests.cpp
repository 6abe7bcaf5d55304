#include <limits>
#include <vector>

#include <gtest/gtest.h>

#include "Shared/Algs/Pixel.h"
#include "Shared/Algs/VirtualImage.h"

namespace ZeltoTouch {
namespace {

TEST(PixelTest, ActivityFollowsThresholdsRelativeToPeakAndTrough) {
    // Gain 1 and threshold 100: a reading r gives normalizedValue r / 100.
    const std::vector<std::pair<int, bool>> cases[] = {  // readings, each with the activity after it
        {{100, false}, {101, true}},                             // on strictly above one
        {{200, true}, {121, true}, {120, false}},                // off at six tenths of the peak
        {{200, true}, {120, false}, {200, false}, {201, true}},  // back on above the trough over six tenths
        {{200, true}, {30, false}, {100, false}, {101, true}},   // a low trough leaves the threshold at one
        {{-50, false}, {100, false}, {101, true}},               // so does a negative reading
    };
    for (size_t c = 0; c < std::size(cases); ++c) {
        Pixel pixel(3, 1.0f);
        for (const auto& [reading, active] : cases[c]) {
            pixel.updatePixelState(reading, 100.0f);
            EXPECT_EQ(pixel.active, active) << "case " << c << ", reading " << reading;
        }
    }
}

TEST(PixelTest, ScalesByGainTruncatingTowardZero) {
    Pixel pixel(0, 1.9219f);
    pixel.updatePixelState(100, 200.0f);
    EXPECT_EQ(pixel.value, 192);  // 192.19
    pixel.updatePixelState(-100, 200.0f);
    EXPECT_EQ(pixel.value, -192);
    EXPECT_FLOAT_EQ(pixel.normalizedValue, -192.0f / 200.0f);

    EXPECT_EQ(truncateToInt32(std::numeric_limits<float>::quiet_NaN()), 0);
    EXPECT_EQ(truncateToInt32(3e9f), std::numeric_limits<int32_t>::max());
    EXPECT_EQ(truncateToInt32(-3e9f), std::numeric_limits<int32_t>::min());
    EXPECT_EQ(truncateToInt32(-2147483648.0f), std::numeric_limits<int32_t>::min());
}

TEST(PixelTest, NoiseLevelIsSeventyFiveAndGlobalStatsAreSticky) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(75, 200.0f);
    EXPECT_FALSE(pixel.everAboveNoise);
    pixel.updatePixelState(76, 200.0f);
    EXPECT_TRUE(pixel.aboveNoise);
    EXPECT_EQ(pixel.maxAboveNoise, 0.38f);
    pixel.updatePixelState(10, 200.0f);
    EXPECT_FALSE(pixel.aboveNoise);
    EXPECT_TRUE(pixel.everAboveNoise);
    EXPECT_EQ(pixel.maxAboveNoise, 0.38f);

    pixel.updatePixelState(400, 200.0f);
    pixel.resetGlobalStats();  // keeps the hysteresis
    EXPECT_FALSE(pixel.everActive || pixel.everAboveNoise);
    EXPECT_EQ(pixel.maxAboveNoise, 0.0f);
    EXPECT_TRUE(pixel.active);
    EXPECT_EQ(pixel.peak, 2.0f);
}

TEST(PixelTest, RegionsOfChannels) {
    constexpr PixelRegion P = PixelRegion::PlayPause, U = PixelRegion::VolumeUp, D = PixelRegion::VolumeDown;
    const PixelRegion expected[] = {P, P, P, P, P, P, U, U, U, U, P, D, D, D, D};
    for (int index = 0; index < kPixelCount; ++index) {
        EXPECT_EQ(Pixel(index, 1.0f).getPixelRegion(), expected[index]) << "channel " << index;
    }
    for (const int outside : {-1, 15, 31, 32, 1000}) EXPECT_EQ(regionOfChannel(outside), PixelRegion::None);
}

std::vector<Pixel> physicalPixels(const std::vector<std::pair<int, int>>& values) {
    std::vector<Pixel> pixels;
    for (int i = 0; i < kPixelCount; ++i) pixels.emplace_back(i, 1.0f);
    for (const auto& [index, value] : values) pixels[index].value = value;
    return pixels;
}

TEST(VirtualImageTest, SumsMembersAboveNoiseAndFollowsStrongestKeepingThePreviousOnATie) {
    VirtualImage image;
    image.updateValues(physicalPixels({{0, 80}, {1, 120}, {4, 75}}));  // A, B, E
    EXPECT_EQ(image.values[0], 200);  // "ABE": E adds nothing
    EXPECT_EQ(image.maxPixelIndices[0], 1);
    EXPECT_EQ(image.values[1], 200);  // "ABF"
    // The previous choice B reads 0 now, so A at 76 beats it.
    image.updateValues(physicalPixels({{0, 76}}));
    EXPECT_EQ(image.values[0], 76);
    EXPECT_EQ(image.maxPixelIndices[0], 0);
    image.updateValues(physicalPixels({{0, 95}, {1, 95}}));  // a tie keeps the previous choice A
    EXPECT_EQ(image.maxPixelIndices[0], 0);

    // All below noise: nothing sums and every choice stays.
    const std::vector<int32_t> before = image.maxPixelIndices;
    image.updateValues(physicalPixels({{0, 75}, {1, 75}, {4, 75}}));
    EXPECT_EQ(image.values, std::vector<int32_t>(23, 0));
    EXPECT_EQ(image.maxPixelIndices, before);
    EXPECT_THROW(image.updateValues(std::vector<Pixel>(14, Pixel(0, 1.0f))), std::out_of_range);
}

}  // namespace
}  // namespace ZeltoTouch

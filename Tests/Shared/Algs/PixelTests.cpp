#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <vector>

#include "Shared/Algs/Pixel.h"
#include "Shared/Algs/VirtualImage.h"

namespace ZeltoTouch {
namespace {

// Gain 1 and threshold 100: a reading r gives normalizedValue r / 100.
constexpr float kThreshold = 100.0f;

struct HysteresisCase {
    const char* name;
    std::vector<int> readings;
    std::vector<bool> active;  // after each reading
};

class PixelHysteresisTest : public testing::TestWithParam<HysteresisCase> {};

TEST_P(PixelHysteresisTest, FollowsRelativeThresholds) {
    Pixel pixel(3, 1.0f);
    const HysteresisCase& c = GetParam();
    for (size_t i = 0; i < c.readings.size(); ++i) {
        pixel.updatePixelState(c.readings[i], kThreshold);
        EXPECT_EQ(pixel.active, c.active[i]) << "reading #" << i << " = " << c.readings[i];
    }
}

INSTANTIATE_TEST_SUITE_P(
    Pixel, PixelHysteresisTest,
    testing::Values(
        HysteresisCase{"OnStrictlyAboveOne", {100, 101}, {false, true}},
        HysteresisCase{"OffAtSixTenthsOfPeak", {200, 121, 120}, {true, true, false}},
        HysteresisCase{"BackOnAboveTroughOverSixTenths", {200, 120, 200, 201}, {true, false, false, true}},
        HysteresisCase{"LowTroughLeavesThresholdAtOne", {200, 30, 100, 101}, {true, false, false, true}},
        HysteresisCase{"NegativeReadingKeepsThresholdAtOne", {-50, 100, 101}, {false, false, true}}),
    [](const auto& info) { return std::string(info.param.name); });

TEST(PixelTest, ScalesByGainTruncatingTowardZero) {
    Pixel pixel(0, 1.9219f);
    pixel.updatePixelState(100, 200.0f);
    EXPECT_EQ(pixel.value, 192);  // 192.19
    pixel.updatePixelState(-100, 200.0f);
    EXPECT_EQ(pixel.value, -192);
    EXPECT_FLOAT_EQ(pixel.normalizedValue, -192.0f / 200.0f);
}

TEST(PixelTest, NoiseLevelIsSeventyFive) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(75, 200.0f);
    EXPECT_FALSE(pixel.aboveNoise);
    EXPECT_FALSE(pixel.everAboveNoise);
    EXPECT_EQ(pixel.maxAboveNoise, 0.0f);

    pixel.updatePixelState(76, 200.0f);
    EXPECT_TRUE(pixel.aboveNoise);
    EXPECT_TRUE(pixel.everAboveNoise);
    EXPECT_EQ(pixel.maxAboveNoise, 0.38f);

    pixel.updatePixelState(10, 200.0f);  // sticky statistics stay
    EXPECT_FALSE(pixel.aboveNoise);
    EXPECT_TRUE(pixel.everAboveNoise);
    EXPECT_EQ(pixel.maxAboveNoise, 0.38f);
}

TEST(PixelTest, ResetGlobalStatsKeepsHysteresis) {
    Pixel pixel(0, 1.0f);
    pixel.updatePixelState(400, 200.0f);
    pixel.resetGlobalStats();
    EXPECT_FALSE(pixel.everActive);
    EXPECT_FALSE(pixel.everAboveNoise);
    EXPECT_EQ(pixel.maxAboveNoise, 0.0f);
    EXPECT_TRUE(pixel.active);
    EXPECT_EQ(pixel.peak, 2.0f);
}

TEST(PixelTest, RegionsOfChannels) {
    const PixelRegion expected[] = {
        PixelRegion::PlayPause,  PixelRegion::PlayPause,  PixelRegion::PlayPause,  PixelRegion::PlayPause,
        PixelRegion::PlayPause,  PixelRegion::PlayPause,  PixelRegion::VolumeUp,   PixelRegion::VolumeUp,
        PixelRegion::VolumeUp,   PixelRegion::VolumeUp,   PixelRegion::PlayPause,  PixelRegion::VolumeDown,
        PixelRegion::VolumeDown, PixelRegion::VolumeDown, PixelRegion::VolumeDown,
    };
    for (int index = 0; index < kPixelCount; ++index) {
        EXPECT_EQ(Pixel(index, 1.0f).getPixelRegion(), expected[index]) << "channel " << index;
    }
    for (const int outside : {-1, 15, 31, 32, 1000}) EXPECT_EQ(regionOfChannel(outside), PixelRegion::None);
}

TEST(PixelTest, FloatToIntConversionIsDefinedEverywhere) {
    EXPECT_EQ(truncateToInt32(-2.9f), -2);
    EXPECT_EQ(truncateToInt32(std::numeric_limits<float>::quiet_NaN()), 0);
    EXPECT_EQ(truncateToInt32(3e9f), std::numeric_limits<int32_t>::max());
    EXPECT_EQ(truncateToInt32(-3e9f), std::numeric_limits<int32_t>::min());
    EXPECT_EQ(truncateToInt32(-2147483648.0f), std::numeric_limits<int32_t>::min());
}

TEST(VirtualPixelTest, IndexIsFirstLetterUntilFirstUpdate) {
    VirtualPixel pixel("ABE", 0.6667f);
    EXPECT_EQ(pixel.index, 'A');
    pixel.updatePixelState(300, 200.0f, 1);
    EXPECT_EQ(pixel.index, 1);
    EXPECT_EQ(pixel.value, 200);  // 0.6667 × 300 = 200.01
}

std::vector<Pixel> physicalPixels(const std::vector<std::pair<int, int>>& values) {
    std::vector<Pixel> pixels;
    for (int i = 0; i < kPixelCount; ++i) pixels.emplace_back(i, 1.0f);
    for (const auto& [index, value] : values) pixels[index].value = value;
    return pixels;
}

TEST(VirtualImageTest, FreshImage) {
    const VirtualImage image;
    EXPECT_EQ(image.names.size(), 23u);
    EXPECT_EQ(image.maxPixelIndices,
              (std::vector<int32_t>{0, 0, 0, 0, 1, 1, 2, 2, 2, 3, 4, 4, 4, 5, 5, 6, 6, 7, 8, 10, 11, 11, 12}));
    EXPECT_EQ(image.names[18], "IJK");
    EXPECT_EQ(image.names[19], "KLM");
    EXPECT_EQ(image.normalizationFactors[7], 0.4651f);
}

TEST(VirtualImageTest, SumsMembersAboveNoiseAndFollowsStrongest) {
    VirtualImage image;
    image.updateValues(physicalPixels({{0, 80}, {1, 120}, {4, 75}}));  // A, B, E
    EXPECT_EQ(image.values[0], 200);  // "ABE": E adds nothing
    EXPECT_EQ(image.maxPixelIndices[0], 1);
    EXPECT_EQ(image.values[1], 200);  // "ABF"

    // The previous choice B reads 0 now, so A at 76 beats it.
    image.updateValues(physicalPixels({{0, 76}}));
    EXPECT_EQ(image.values[0], 76);
    EXPECT_EQ(image.maxPixelIndices[0], 0);
}

TEST(VirtualImageTest, StrongestMemberTiesKeepEarlierChoice) {
    VirtualImage image;
    image.updateValues(physicalPixels({{6, 90}, {7, 90}}));  // "GHI"
    EXPECT_EQ(image.values[15], 180);
    EXPECT_EQ(image.maxPixelIndices[15], 6);

    image.updateValues(physicalPixels({{7, 95}}));
    EXPECT_EQ(image.maxPixelIndices[15], 7);
    image.updateValues(physicalPixels({{6, 95}, {7, 95}}));  // previous choice H wins the tie
    EXPECT_EQ(image.maxPixelIndices[15], 7);
}

TEST(VirtualImageTest, AllBelowNoiseKeepsChoices) {
    VirtualImage image;
    image.updateValues(physicalPixels({{1, 500}}));
    const std::vector<int32_t> before = image.maxPixelIndices;
    image.updateValues(physicalPixels({{0, 75}, {1, 75}, {4, 75}}));
    EXPECT_EQ(image.values, std::vector<int32_t>(23, 0));
    EXPECT_EQ(image.maxPixelIndices, before);
}

TEST(VirtualImageTest, TooFewPixelsIsAnError) {
    VirtualImage image;
    EXPECT_THROW(image.updateValues(std::vector<Pixel>(14, Pixel(0, 1.0f))), std::out_of_range);
}

}  // namespace
}  // namespace ZeltoTouch

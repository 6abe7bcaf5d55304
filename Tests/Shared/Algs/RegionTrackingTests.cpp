#include <gtest/gtest.h>

#include <vector>

#include "Shared/Algs/HandStats.h"

namespace ZeltoTouch {
namespace {

constexpr int A = 0, B = 1, G = 6, H = 7, I = 8, K = 10, L = 11, M = 12;

struct RegionFixture {
    RegionFixture() {
        for (int i = 0; i < kPixelCount; ++i) pixels.emplace_back(i, 1.0f);
        for (int i = 0; i < kVirtualPixelCount; ++i) virtualPixels.emplace_back("A", 1.0f);
    }
    void maxAboveNoise(int channel, float value) { pixels[channel].maxAboveNoise = value; }

    std::vector<Pixel> pixels;
    std::vector<VirtualPixel> virtualPixels;
    HandStats hand;
};

TEST(RegionTrackingTest, TimeBiasFactorFadesFromLastGesture) {
    const std::pair<uint32_t, float> cases[] = {{0, 0.65f}, {300, 0.65f}, {650, 0.825f}, {1000, 1.0f}, {60000, 1.0f}};
    for (const auto& [sinceGestureMs, factor] : cases) {
        HandStats hand;
        hand.lastGestureMs = 0xFFFFFF00u;  // the difference wraps around 2^32
        EXPECT_NEAR(hand.updateTimeBiasFactor(0xFFFFFF00u + sinceGestureMs), factor, 1e-6f) << sinceGestureMs;
    }
}

TEST(RegionTrackingTest, Interpolation) {
    EXPECT_FLOAT_EQ(HandStats::fuzzify(2.0f, 0.0f, 1.0f, 0.0f, 10.0f), 20.0f);  // not clipped
    EXPECT_EQ(HandStats::fuzzifyAndClip(0.1f, 0.2f, 0.5f, 1.3f, 5.0f), 1.3f);
    EXPECT_EQ(HandStats::fuzzifyAndClip(0.9f, 0.2f, 0.5f, 1.3f, 5.0f), 5.0f);
    EXPECT_NEAR(HandStats::fuzzifyAndClip(0.35f, 0.2f, 0.5f, 1.3f, 5.0f), 3.15f, 1e-5f);
}

struct BiasCase {
    const char* name;
    int peakChannel;
    std::vector<std::pair<int, float>> maxAboveNoise;  // physical channels
    PixelRegion lastGestureRegion;
    uint32_t sinceGestureMs;
    float klm, ijk;  // virtual pixels' maxAboveNoise
    PixelRegion expected;
};

class ActiveRegionTest : public testing::TestWithParam<BiasCase> {};

TEST_P(ActiveRegionTest, ChoosesRegion) {
    const BiasCase& c = GetParam();
    RegionFixture f;
    f.hand.peakActiveIndex = c.peakChannel;
    for (const auto& [channel, value] : c.maxAboveNoise) f.maxAboveNoise(channel, value);
    f.hand.lastGestureRegion = c.lastGestureRegion;
    f.hand.lastGestureMs = 5000;
    f.virtualPixels[19].maxAboveNoise = c.klm;
    f.virtualPixels[18].maxAboveNoise = c.ijk;
    EXPECT_EQ(f.hand.updateActiveRegion(f.pixels, f.virtualPixels, 5000 + c.sinceGestureMs), c.expected);
}

constexpr PixelRegion P = PixelRegion::PlayPause, D = PixelRegion::VolumeDown, U = PixelRegion::VolumeUp;

INSTANTIATE_TEST_SUITE_P(
    RegionTracking, ActiveRegionTest,
    testing::Values(
        BiasCase{"RunnerUpInLastRegionWins", H, {{H, 2.0f}, {L, 1.5f}}, D, 200, 0, 0, D},
        BiasCase{"RunnerUpTooWeak", H, {{H, 2.0f}, {L, 1.2f}}, D, 200, 0, 0, U},
        BiasCase{"BiasFadedAfterOneSecond", H, {{H, 2.0f}, {L, 1.9f}}, D, 1000, 0, 0, U},
        BiasCase{"RunnerUpBelowNoise", H, {{H, 0.5f}, {L, 0.375f}}, D, 200, 0, 0, U},
        BiasCase{"TieKeepsLowerChannelFirst", H, {{H, 2.0f}, {L, 2.0f}}, D, 200, 0, 0, D},
        BiasCase{"KTowardsVolumeDown", K, {{K, 2.0f}, {M, 1.0f}}, P, 2000, 1.5f, 0, D},
        BiasCase{"KCombinationTooWeak", K, {{K, 2.0f}, {M, 1.0f}}, P, 2000, 1.4f, 0, P},
        BiasCase{"KShareFollowsBiasAfterVolumeDownGesture", K, {{K, 2.0f}, {M, 1.0f}}, D, 200, 1.35f, 0, D},
        BiasCase{"KShareFixedAfterOtherGesture", K, {{K, 2.0f}, {M, 1.0f}}, P, 200, 1.35f, 0, P},
        BiasCase{"KTowardsVolumeUp", K, {{K, 2.0f}, {I, 1.0f}}, P, 2000, 0, 1.5f, U},
        BiasCase{"KRuleNeedsKFirst", K, {{M, 2.0f}, {K, 1.0f}}, P, 2000, 5.0f, 0, P},
        BiasCase{"AllEqualKeepsPeakRegion", G, {}, P, 200, 0, 0, U}),
    [](const auto& info) { return std::string(info.param.name); });

TEST(RegionTrackingTest, ActiveRegionRefreshesRegionMax) {
    RegionFixture f;
    f.pixels[B].value = 175;
    f.pixels[H].value = 95;
    f.pixels[L].value = 60;
    f.hand.updateActiveRegion(f.pixels, f.virtualPixels, 0);
    EXPECT_EQ(f.hand.regionMax, (std::array<float, kRegionCount>{0, 100, 0, 20}));
}

struct HoldMoveCase {
    const char* name;
    float currentBefore, candidateBefore, currentAfter, candidateAfter;
    PixelRegion expected;
    float gain;
};

TEST(RegionTrackingTest, HoldMovesOnlyWithEnoughRelativeGrowth) {
    const HoldMoveCase cases[] = {
        {"grew 40%", 100, 50, 100, 70, U, 1.3f},
        {"grew 20%", 100, 50, 100, 60, P, 1.3f},
        {"current falling", 100, 50, 40, 30, P, 5.0f},
        {"current was empty", 0, 50, 10, 1, U, 1.3f},
        {"current now empty", 100, 50, 0, 30, U, 1.3f},
    };
    for (const HoldMoveCase& c : cases) {
        RegionFixture f;
        f.hand.activeRegion = P;
        f.hand.regionMax = {0, c.currentBefore, 0, c.candidateBefore};
        f.pixels[A].value = static_cast<int32_t>(c.currentAfter) + 75;
        f.pixels[G].value = static_cast<int32_t>(c.candidateAfter) + 75;
        EXPECT_EQ(f.hand.changeActiveRegion(f.pixels, G), c.expected) << c.name;
        EXPECT_EQ(f.hand.previousRegion, P) << c.name;
        EXPECT_EQ(f.hand.regionSwitchGain, c.gain) << c.name;
    }
}

TEST(RegionTrackingTest, SameCandidateReturnsWithoutRefresh) {
    RegionFixture f;
    f.hand.activeRegion = U;
    f.hand.regionMax = {0, 7, 8, 9};
    f.pixels[A].value = 500;
    EXPECT_EQ(f.hand.changeActiveRegion(f.pixels, H), U);
    EXPECT_EQ(f.hand.regionMax, (std::array<float, kRegionCount>{0, 7, 8, 9}));
    EXPECT_EQ(f.hand.previousRegion, U);
}

}  // namespace
}  // namespace ZeltoTouch

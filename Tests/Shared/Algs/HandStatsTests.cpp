#include "Shared/Algs/HandStats.h"

#include <array>
#include <cmath>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "Tests/Shared/Algs/Channels.h"

namespace ZeltoTouch {
namespace {

// Channel A's values stay 0 unless touched, so the classifier does not evaluate and the touch
// score changes only where a test changes it.
class HandStatsFrames : public testing::Test {
protected:
    // A frame with pixel A touched (above noise at a normalised value) or not.
    void frame(uint32_t timeMs, bool touched, float normalizedValue = 2.0f) {
        channels.pixels[0].active = channels.pixels[0].aboveNoise = touched;
        channels.pixels[0].normalizedValue = touched ? normalizedValue : 0.0f;
        hand.updateHandState(channels.pixels, channels.virtualPixels, timeMs);
    }

    HandStats hand;
    Channels channels;
};

// A finished touch with a peak of 2, for the tap features.
HandStats finishedTouch(uint32_t startMs, uint32_t endMs, uint32_t aboveNoiseStartMs, uint32_t lastGestureMs) {
    HandStats hand;
    hand.touchStartMs = startMs;
    hand.touchEndMs = endMs;
    hand.aboveNoiseStartMs = aboveNoiseStartMs;
    hand.lastGestureMs = lastGestureMs;
    hand.peakActiveValue = 2.0f;
    return hand;
}

TEST(HandStatsTest, DecayDependsOnGapSinceLastAboveNoisePeriod) {
    const std::tuple<float, uint32_t, float> cases[] = {  // score, ms since the period ended, decayed score
        {10.0f, 1, 8.435f}, {10.0f, 2, 5.745f}, {-10.0f, 2, -5.745f}, {10.0f, 3, 0.0f},
        {10.0f, 0, 0.0f},  // an end at this very frame wraps the gap to 2^32 - 1
    };
    for (const auto& [score, sinceEndMs, expected] : cases) {
        HandStats hand;
        hand.touchScore = score;
        hand.aboveNoiseEndMs = 0xFFFFFFFFu;  // the gap wraps around 2^32 too
        hand.decayTouchScore(0xFFFFFFFFu + sinceEndMs);
        EXPECT_NEAR(hand.touchScore, expected, 0.001f) << score << " after " << sinceEndMs << " ms";
    }
    HandStats negativeZero;
    negativeZero.touchScore = -0.0f;
    negativeZero.decayTouchScore(5);
    EXPECT_TRUE(std::signbit(negativeZero.touchScore));
}

TEST_F(HandStatsFrames, TouchScoreIsClampedAndDecaysWhenAboveNoisePeriodStarts) {
    for (const float start : {100.5f, -100.5f, 99.5f}) {
        hand.touchScore = start;
        frame(1000, false);  // a frame the classifier does not evaluate adds 0
        EXPECT_EQ(hand.touchScore, std::fmin(std::fmax(start, -100.0f), 100.0f));
    }
    frame(1010, true);
    frame(1020, false);  // above-noise period ends at 1020
    hand.touchScore = 10;
    frame(1022, true);  // new period 2 ms later
    EXPECT_NEAR(hand.touchScore, 5.745f, 0.001f);
}

TEST(HandStatsTest, TapFeaturesOfAnAcceptedTap) {
    HandStats hand = finishedTouch(1000, 1100, 990, 0);
    const Channels channels;
    hand.updateTapRejection(channels.pixels, channels.virtualPixels);
    EXPECT_EQ(hand.peakAmplitude, 400.0f);
    EXPECT_NEAR(hand.sd, 3.126f, 0.001f);
    EXPECT_NEAR(hand.tsd, 3.35f, 0.0001f);
    EXPECT_NEAR(hand.timeDurationRatio, 0.659f, 0.001f);
    EXPECT_NEAR(hand.tapSVMScore, 4.21f, 0.01f);

    HandStats afterGesture = finishedTouch(1000, 1100, 500, 1070);  // a recent gesture limits the time
    afterGesture.updateTapRejection(channels.pixels, channels.virtualPixels);
    EXPECT_NEAR(afterGesture.sd, 400.0f / 30.0f - 0.51f, 1e-5f);
}

TEST(HandStatsTest, TapRejectionRules) {
    const struct {
        const char* name;
        uint32_t touchStartMs, touchEndMs, aboveNoiseStartMs, lastGestureMs;
        int silentChannels;  // above noise without ever becoming active
        bool rejected;
    } cases[] = {
        {"accepted", 1000, 1100, 990, 0, 0, false},
        {"zero touch time gives tsd 0", 1100, 1100, 990, 0, 0, true},
        {"twenty-two silent channels", 1000, 1100, 990, 0, 22, true},
        {"twenty-one silent channels", 1000, 1100, 990, 0, 21, false},
        {"times wrapping around 2^32", 0xFFFFFFD0u, 0x34u, 0xFFFFFFC6u, 0x80000000u, 0, false},
    };
    for (const auto& c : cases) {
        HandStats hand = finishedTouch(c.touchStartMs, c.touchEndMs, c.aboveNoiseStartMs, c.lastGestureMs);
        Channels channels;
        for (int i = 0; i < c.silentChannels; ++i) channels[i].everAboveNoise = true;
        hand.updateTapRejection(channels.pixels, channels.virtualPixels);
        EXPECT_EQ(hand.tapRejected, c.rejected) << c.name;
        EXPECT_EQ(hand.nonActivePixels, 21 - c.silentChannels) << c.name;
    }
}

TEST_F(HandStatsFrames, HoldTimeWrapsAroundTwoToThe32) {
    hand.enableHoldSuppression = false;
    frame(0xFFFFFF00u, true);
    frame(0xF4u, true);  // 500 ms later
    EXPECT_FALSE(hand.holding);
    frame(0xF5u, true);
    EXPECT_TRUE(hand.holding);
}

TEST_F(HandStatsFrames, RejectedTapVerdictLastsOneFrameWithSuppression) {
    frame(1000, true, 0.5f);  // too weak: tsd < 0
    frame(1400, false);
    EXPECT_TRUE(hand.tapCandidate && hand.tapRejected);
    EXPECT_FALSE(hand.tap);
    frame(1410, false);
    EXPECT_FALSE(hand.tapRejected || hand.tapCandidate);
}

// Region tracking: which region a touch belongs to, and when a hold moves to another.
constexpr int B = 1, G = 6, H = 7, I = 8, K = 10, L = 11, M = 12;
constexpr PixelRegion P = PixelRegion::PlayPause, D = PixelRegion::VolumeDown, U = PixelRegion::VolumeUp;

TEST(RegionTrackingTest, TimeBiasFactorFadesFromLastGestureAndInterpolationClips) {
    const std::pair<uint32_t, float> cases[] = {{0, 0.65f}, {300, 0.65f}, {650, 0.825f}, {1000, 1.0f}, {60000, 1.0f}};
    for (const auto& [sinceGestureMs, factor] : cases) {
        HandStats hand;
        hand.lastGestureMs = 0xFFFFFF00u;  // the difference wraps around 2^32
        EXPECT_NEAR(hand.updateTimeBiasFactor(0xFFFFFF00u + sinceGestureMs), factor, 1e-6f) << sinceGestureMs;
    }
    EXPECT_FLOAT_EQ(HandStats::fuzzify(2.0f, 0.0f, 1.0f, 0.0f, 10.0f), 20.0f);  // not clipped
    EXPECT_EQ(HandStats::fuzzifyAndClip(0.1f, 0.2f, 0.5f, 1.3f, 5.0f), 1.3f);
    EXPECT_EQ(HandStats::fuzzifyAndClip(0.9f, 0.2f, 0.5f, 1.3f, 5.0f), 5.0f);
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

TEST(RegionTrackingTest, ActiveRegionFollowsTheLastGestureAndChannelK) {
    const BiasCase cases[] = {
        {"runner-up in the last gesture's region wins", H, {{H, 2.0f}, {L, 1.5f}}, D, 200, 0, 0, D},
        {"runner-up too weak", H, {{H, 2.0f}, {L, 1.2f}}, D, 200, 0, 0, U},
        {"bias faded after one second", H, {{H, 2.0f}, {L, 1.9f}}, D, 1000, 0, 0, U},
        {"runner-up below noise", H, {{H, 0.5f}, {L, 0.375f}}, D, 200, 0, 0, U},
        {"a tie keeps the lower channel first", H, {{H, 2.0f}, {L, 2.0f}}, D, 200, 0, 0, D},
        {"K towards volume down", K, {{K, 2.0f}, {M, 1.0f}}, P, 2000, 1.5f, 0, D},
        {"K combination too weak", K, {{K, 2.0f}, {M, 1.0f}}, P, 2000, 1.4f, 0, P},
        {"K share follows the bias after a volume-down gesture", K, {{K, 2.0f}, {M, 1.0f}}, D, 200, 1.35f, 0, D},
        {"K share fixed after another gesture", K, {{K, 2.0f}, {M, 1.0f}}, P, 200, 1.35f, 0, P},
        {"K towards volume up", K, {{K, 2.0f}, {I, 1.0f}}, P, 2000, 0, 1.5f, U},
        {"the K rule needs K first", K, {{M, 2.0f}, {K, 1.0f}}, P, 2000, 5.0f, 0, P},
        {"all equal keeps the peak's region", G, {}, P, 200, 0, 0, U},
    };
    for (const BiasCase& c : cases) {
        Channels channels;
        HandStats hand;
        hand.peakActiveIndex = c.peakChannel;
        for (const auto& [channel, value] : c.maxAboveNoise) channels[channel].maxAboveNoise = value;
        hand.lastGestureRegion = c.lastGestureRegion;
        hand.lastGestureMs = 5000;
        channels.virtualPixels[19].maxAboveNoise = c.klm;
        channels.virtualPixels[18].maxAboveNoise = c.ijk;
        EXPECT_EQ(hand.updateActiveRegion(channels.pixels, channels.virtualPixels, 5000 + c.sinceGestureMs), c.expected)
            << c.name;
    }
}

TEST(RegionTrackingTest, ActiveRegionRefreshesRegionMax) {
    Channels channels;
    channels[B].value = 175;
    channels[H].value = 95;
    channels[L].value = 60;
    HandStats hand;
    hand.updateActiveRegion(channels.pixels, channels.virtualPixels, 0);
    EXPECT_EQ(hand.regionMax, (std::array<float, kRegionCount>{0, 100, 0, 20}));
}

}  // namespace
}  // namespace ZeltoTouch

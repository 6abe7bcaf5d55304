#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "Shared/Algs/HandStats.h"

namespace ZeltoTouch {
namespace {

// Channels whose flags a test sets by hand. Their values stay 0, so the classifier does not
// evaluate and the touch score changes only where a test changes it.
struct Channels {
    Channels() {
        for (int i = 0; i < kPixelCount; ++i) pixels.emplace_back(i, 1.0f);
        for (int i = 0; i < kVirtualPixelCount; ++i) virtualPixels.emplace_back("A", 1.0f);
        for (VirtualPixel& pixel : virtualPixels) pixel.index = 0;
    }
    // Pixel A touched (or not) at a normalised value, above noise while touched.
    void touchA(bool touched, float normalizedValue = 2.0f) {
        pixels[0].active = touched;
        pixels[0].aboveNoise = touched;
        pixels[0].normalizedValue = touched ? normalizedValue : 0.0f;
    }

    std::vector<Pixel> pixels;
    std::vector<VirtualPixel> virtualPixels;
};

class HandStatsFrames : public testing::Test {
protected:
    void frame(uint32_t timeMs, bool touched, float strength = 2.0f) {
        channels.touchA(touched, strength);
        hand.updateHandState(channels.pixels, channels.virtualPixels, timeMs);
    }

    HandStats hand;
    Channels channels;
};

TEST_F(HandStatsFrames, ResetClearsScoresOnly) {
    frame(1000, true);
    hand.touchScore = 5;
    hand.Reset();
    EXPECT_EQ(hand.touchScore, 0.0f);
    EXPECT_EQ(hand.peakActiveValue, 0.0f);
    EXPECT_TRUE(hand.touching);
    EXPECT_EQ(hand.touchStartMs, 1000u);
    EXPECT_EQ(hand.activeRegion, PixelRegion::PlayPause);

    hand.decayBase = 3;
    hand.SetDecayParameters();
    EXPECT_EQ(hand.decayBase, 7.389056f);
}

struct DecayCase {
    float score;
    uint32_t sinceEndMs;
    float expected;
};

TEST(HandStatsTest, DecayDependsOnGapSinceLastAboveNoisePeriod) {
    const DecayCase cases[] = {
        {10.0f, 1, 8.435f},      // d = 0
        {10.0f, 2, 5.745f},      // d = 1
        {-10.0f, 2, -5.745f},    // the sign stays
        {10.0f, 3, 0.0f},        // d = 2 and later: gone
        {10.0f, 0, 0.0f},        // an end at this very frame wraps d to 2^32 - 1
    };
    for (const DecayCase& c : cases) {
        HandStats hand;
        hand.touchScore = c.score;
        hand.aboveNoiseEndMs = 0xFFFFFFFFu;  // the gap wraps around 2^32 too
        hand.decayTouchScore(0xFFFFFFFFu + c.sinceEndMs);
        EXPECT_NEAR(hand.touchScore, c.expected, 0.001f) << c.score << " after " << c.sinceEndMs << " ms";
    }
    HandStats negativeZero;
    negativeZero.touchScore = -0.0f;
    negativeZero.decayTouchScore(5);
    EXPECT_TRUE(std::signbit(negativeZero.touchScore));
}

TEST_F(HandStatsFrames, TouchScoreIsClampedToLimit) {
    for (const float start : {100.5f, -100.5f, 99.5f}) {
        hand.touchScore = start;
        frame(1000, false);  // a frame the classifier does not evaluate adds 0
        EXPECT_EQ(hand.touchScore, std::fmin(std::fmax(start, -100.0f), 100.0f));
    }
}

TEST_F(HandStatsFrames, DecayAppliesWhenAboveNoisePeriodStarts) {
    frame(1000, true);
    frame(1010, false);  // above-noise period ends at 1010
    hand.touchScore = 10;
    frame(1012, true);   // new period 2 ms later: d = 1
    EXPECT_NEAR(hand.touchScore, 5.745f, 0.001f);
}

TEST(HandStatsTest, TapFeaturesOfAnAcceptedTap) {
    HandStats hand;
    hand.touchStartMs = 1000;
    hand.touchEndMs = 1100;
    hand.aboveNoiseStartMs = 990;
    hand.lastGestureMs = 0;
    hand.peakActiveValue = 2.0f;
    const Channels channels;
    hand.updateTapRejection(channels.pixels, channels.virtualPixels);
    EXPECT_EQ(hand.peakAmplitude, 400.0f);
    EXPECT_NEAR(hand.sd, 3.126f, 0.001f);
    EXPECT_NEAR(hand.tsd, 3.35f, 0.0001f);
    EXPECT_NEAR(hand.timeDurationRatio, 0.659f, 0.001f);
    EXPECT_EQ(hand.nonActivePixels, 21);
    EXPECT_NEAR(hand.tapSVMScore, 4.21f, 0.01f);
    EXPECT_FALSE(hand.tapRejected);
}

TEST(HandStatsTest, TapRejectionRules) {
    struct Case {
        const char* name;
        uint32_t touchStartMs, touchEndMs, aboveNoiseStartMs, lastGestureMs;
        int silentChannels;  // above noise without ever becoming active
        bool rejected;
    };
    const Case cases[] = {
        {"accepted", 1000, 1100, 990, 0, 0, false},
        {"zero touch time gives tsd 0", 1100, 1100, 990, 0, 0, true},
        {"twenty-two silent channels", 1000, 1100, 990, 0, 22, true},
        {"twenty-one silent channels", 1000, 1100, 990, 0, 21, false},
        {"times wrapping around 2^32", 0xFFFFFFD0u, 0x34u, 0xFFFFFFC6u, 0x80000000u, 0, false},
    };
    for (const Case& c : cases) {
        HandStats hand;
        hand.touchStartMs = c.touchStartMs;
        hand.touchEndMs = c.touchEndMs;
        hand.aboveNoiseStartMs = c.aboveNoiseStartMs;
        hand.lastGestureMs = c.lastGestureMs;
        hand.peakActiveValue = 2.0f;
        Channels channels;
        for (int i = 0; i < c.silentChannels; ++i) {
            Pixel& pixel = i < kPixelCount ? channels.pixels[i] : channels.virtualPixels[i - kPixelCount];
            pixel.everAboveNoise = true;
        }
        hand.updateTapRejection(channels.pixels, channels.virtualPixels);
        EXPECT_EQ(hand.tapRejected, c.rejected) << c.name;
        EXPECT_EQ(hand.nonActivePixels, 21 - c.silentChannels) << c.name;
    }
}

TEST(HandStatsTest, RecentGestureLimitsAboveNoiseTime) {
    HandStats hand;
    hand.touchStartMs = 1000;
    hand.touchEndMs = 1100;
    hand.aboveNoiseStartMs = 500;
    hand.lastGestureMs = 1070;
    hand.peakActiveValue = 2.0f;
    const Channels channels;
    hand.updateTapRejection(channels.pixels, channels.virtualPixels);
    EXPECT_NEAR(hand.sd, 400.0f / 30.0f - 0.51f, 1e-5f);
}

TEST_F(HandStatsFrames, HoldStartsStrictlyAfterHoldTime) {
    for (const bool suppression : {false, true}) {
        hand = HandStats();
        hand.enableHoldSuppression = suppression;
        for (uint32_t t = 1000; t <= 1500; t += 10) frame(t, true);
        EXPECT_FALSE(hand.holding);
        frame(1501, true);
        EXPECT_TRUE(hand.holding) << "suppression " << suppression;
        EXPECT_FALSE(hand.holdSuppressed);
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

TEST_F(HandStatsFrames, SuppressedHoldTurnsIntoHoldWhenScoreRecovers) {
    frame(1000, true);
    hand.touchScore = -3;
    frame(1501, true);
    EXPECT_TRUE(hand.holdSuppressed);
    EXPECT_FALSE(hand.holding);
    EXPECT_TRUE(hand.holdTimeElapsed);

    hand.touchScore = 0;
    frame(1511, true);
    EXPECT_TRUE(hand.holding);
    EXPECT_FALSE(hand.holdSuppressed);
    EXPECT_TRUE(hand.wasHoldSuppressed);

    hand.touchScore = -50;  // a granted hold survives a drop of the score
    frame(1521, true);
    EXPECT_TRUE(hand.holding);
}

TEST_F(HandStatsFrames, RejectedTapVerdictLastsOneFrameWithSuppression) {
    frame(1000, true, 0.5f);  // too weak: tsd < 0
    frame(1400, false);
    EXPECT_TRUE(hand.tapCandidate);
    EXPECT_FALSE(hand.tap);
    EXPECT_TRUE(hand.tapRejected);
    frame(1410, false);
    EXPECT_FALSE(hand.tapRejected);
    EXPECT_FALSE(hand.tapCandidate);
}

TEST_F(HandStatsFrames, TapDecision) {
    struct Case {
        bool holdSuppression, tapSuppression;
        float strength;  // normalised value while touched
        uint32_t lengthMs;
        bool tapCandidate, tap;
    };
    const Case cases[] = {
        {true, true, 2.0f, 400, true, true},
        {true, true, 0.0f, 400, true, false},   // rejected: no amplitude
        {true, false, 0.0f, 400, true, true},   // rejected, but suppression off
        {true, true, 2.0f, 600, false, false},  // past the hold time
        {false, true, 5.0f, 600, true, true},   // hold time not tracked without hold suppression
    };
    for (const Case& c : cases) {
        hand = HandStats();
        hand.enableHoldSuppression = c.holdSuppression;
        hand.enableTapSuppression = c.tapSuppression;
        for (uint32_t t = 1000; t < 1000 + c.lengthMs; t += 10) frame(t, true, c.strength);
        frame(1000 + c.lengthMs, false);
        EXPECT_EQ(hand.tapCandidate, c.tapCandidate) << c.lengthMs << " ms at " << c.strength;
        EXPECT_EQ(hand.tap, c.tap) << c.lengthMs << " ms at " << c.strength;
        if (c.tap) {
            EXPECT_EQ(hand.lastGestureMs, 1000 + c.lengthMs);
        }
    }
}

}  // namespace
}  // namespace ZeltoTouch

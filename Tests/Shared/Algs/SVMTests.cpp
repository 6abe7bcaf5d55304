#include <gtest/gtest.h>

#include <algorithm>
#include <numeric>
#include <vector>

#include "Shared/Algs/SVM.h"

namespace ZeltoTouch {
namespace {

// Scores a frame whose 38 channel values are given (physical first, the rest 0).
float score(const std::vector<int32_t>& values, float activationThreshold = 200.0f) {
    std::vector<Pixel> pixels;
    std::vector<VirtualPixel> virtualPixels;
    for (int i = 0; i < kPixelCount; ++i) pixels.emplace_back(i, 1.0f);
    for (int i = 0; i < kVirtualPixelCount; ++i) virtualPixels.emplace_back("A", 1.0f);
    for (size_t i = 0; i < values.size(); ++i) {
        Pixel& pixel = i < kPixelCount ? pixels[i] : virtualPixels[i - kPixelCount];
        pixel.value = values[i];
    }
    SVM svm;
    svm.updateSVMScore(pixels, virtualPixels, activationThreshold, 0);
    return svm.getSVMScore();
}

TEST(SVMTest, GateOnLeaderAndRunnerUp) {
    struct Case {
        std::vector<int32_t> values;
        bool evaluated;
    };
    const Case cases[] = {
        {{200, 75}, false},  // leader not above the threshold, runner-up not above noise
        {{150, 76}, true},   // runner-up reaches 76
        {{201}, true},       // leader above the threshold alone
        {{76, 76}, true},
        {{}, false},
    };
    for (const Case& c : cases) {
        EXPECT_EQ(score(c.values) != 0.0f, c.evaluated) << c.values.size() << " values, first "
                                                        << (c.values.empty() ? 0 : c.values[0]);
    }
    EXPECT_EQ(score({300}, 300.0f), 0.0f);
}

TEST(SVMTest, ScoreDependsOnRanksNotChannels) {
    std::vector<int32_t> values(kChannelCount);
    std::iota(values.begin(), values.end(), 40);
    values[3] = 700;
    const float reference = score(values);
    std::reverse(values.begin(), values.end());
    EXPECT_EQ(score(values), reference);
    std::rotate(values.begin(), values.begin() + 11, values.end());
    EXPECT_EQ(score(values), reference);
}

// One classifier keeps the previous frame's ranking to start from; whatever came before, a
// frame scores as it does on a fresh classifier.
TEST(SVMTest, ScoreDoesNotDependOnEarlierFrames) {
    std::vector<Pixel> pixels;
    std::vector<VirtualPixel> virtualPixels;
    for (int i = 0; i < kPixelCount; ++i) pixels.emplace_back(i, 1.0f);
    for (int i = 0; i < kVirtualPixelCount; ++i) virtualPixels.emplace_back("A", 1.0f);
    const auto setFrame = [&](int frame) {
        for (int i = 0; i < kChannelCount; ++i) {
            Pixel& pixel = i < kPixelCount ? pixels[i] : virtualPixels[i - kPixelCount];
            pixel.value = (i * 37 + frame * 101) % 613 - 40 + (i == frame % kChannelCount ? 900 : 0);
        }
    };
    SVM continuing;
    for (int frame = 0; frame < 60; ++frame) {
        setFrame(frame);
        continuing.updateSVMScore(pixels, virtualPixels, 200.0f, 0);
        SVM fresh;
        fresh.updateSVMScore(pixels, virtualPixels, 200.0f, 0);
        EXPECT_NE(fresh.getSVMScore(), 0.0f) << frame;
        EXPECT_EQ(continuing.getSVMScore(), fresh.getSVMScore()) << frame;
    }
}

}  // namespace
}  // namespace ZeltoTouch

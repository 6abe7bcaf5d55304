#include "Shared/Algs/SVM.h"

#include <algorithm>
#include <numeric>
#include <vector>

#include <gtest/gtest.h>

#include "Tests/Shared/Algs/Channels.h"

namespace ZeltoTouch {
namespace {

// Scores a frame whose channel values are given (physical first, the rest 0).
float score(const std::vector<int32_t>& values, float activationThreshold = 200.0f) {
    Channels channels;
    for (size_t i = 0; i < values.size(); ++i) channels[static_cast<int>(i)].value = values[i];
    SVM svm;
    svm.updateSVMScore(channels.pixels, channels.virtualPixels, activationThreshold, 0);
    return svm.getSVMScore();
}

TEST(SVMTest, EvaluatesOnlyWithALeaderAboveThresholdOrARunnerUpAboveNoise) {
    const std::pair<std::vector<int32_t>, bool> cases[] = {
        {{200, 75}, false}, {{150, 76}, true}, {{201}, true}, {{76, 76}, true}, {{}, false},
    };
    for (const auto& [values, evaluated] : cases) {
        EXPECT_EQ(score(values) != 0.0f, evaluated) << testing::PrintToString(values);
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
    Channels channels;
    SVM continuing;
    for (int frame = 0; frame < 60; ++frame) {
        for (int i = 0; i < kChannelCount; ++i) {
            channels[i].value = (i * 37 + frame * 101) % 613 - 40 + (i == frame % kChannelCount ? 900 : 0);
        }
        continuing.updateSVMScore(channels.pixels, channels.virtualPixels, 200.0f, 0);
        SVM fresh;
        fresh.updateSVMScore(channels.pixels, channels.virtualPixels, 200.0f, 0);
        EXPECT_NE(fresh.getSVMScore(), 0.0f) << frame;
        EXPECT_EQ(continuing.getSVMScore(), fresh.getSVMScore()) << frame;
    }
}

}  // namespace
}  // namespace ZeltoTouch

#include "Shared/Algs/SVM.h"

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

}  // namespace
}  // namespace ZeltoTouch

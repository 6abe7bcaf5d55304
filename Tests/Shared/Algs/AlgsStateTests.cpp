#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "Shared/Algs/Algs.h"

namespace ZeltoTouch {
namespace {

using PV = PropertyValue;
const std::string kFactor = "VirtualNormalizationFactors.";

TEST(AlgsStateTest, DefaultsAndTheirTypes) {
    using K = PV::NumberKind;
    const Algs algs;
    const std::tuple<const char*, K, double> cases[] = {
        {"EnableHoldSuppression", K::Boolean, 1}, {"EnableTapSuppression", K::Boolean, 1},
        {"HoldTimeoutMilliseconds", K::UInt32, 500}, {"ActivationThreshold", K::Float32, 200},
    };
    for (const auto& [key, kind, value] : cases) {
        EXPECT_EQ(algs.getState(key).numberKind(), kind) << key;
        EXPECT_EQ(algs.getState(key).toDouble(), value) << key;
    }
}

TEST(AlgsStateTest, WritesCoerceValuesToTheKeysType) {
    const std::tuple<std::string, PV, double> cases[] = {
        {"HoldTimeoutMilliseconds", PV::fromUInt64(4294967296ull + 250), 250},
        {"HoldTimeoutMilliseconds", PV::string("750"), 0}, {"HoldTimeoutMilliseconds", PV(), 0},
        {"EnableTapSuppression", PV::fromInt32(0), 0},
        {"EnableHoldSuppression", PV::mutableDictionary(), 0}, {"EnableHoldSuppression", PV::fromInt32(7), 1},
        {"ActivationThreshold", PV::fromDouble(123.5), 123.5},  {"ActivationThreshold", PV::null(), 0},
        {kFactor + "5", PV::fromDouble(2.5), 2.5}, {kFactor + "5", PV::string("2.5"), 0},
    };
    for (const auto& [key, written, readBack] : cases) {
        Algs algs;
        algs.setState(key, written);
        EXPECT_EQ(algs.getState(key).toDouble(), readBack) << key << " <- " << written.description();
        EXPECT_EQ(algs.getState(key).numberKind(), Algs().getState(key).numberKind()) << key;
    }
}

TEST(AlgsStateTest, FactorIndexIsReadLikeAStreamExtractsAnUnsignedNumber) {
    Algs algs;
    EXPECT_EQ(algs.getState(kFactor + "0").toFloat(), 0.6667f);
    EXPECT_EQ(algs.getState(kFactor + "7").toFloat(), 0.4651f);
    for (int i = 0; i < kVirtualPixelCount; ++i) algs.setState(kFactor + std::to_string(i), PV::fromInt32(i));
    // Writes out of range change nothing.
    for (const char* rest : {"23", "-1", "18446744073709551616"}) algs.setState(kFactor + rest, PV::fromInt32(99));
    algs.setState("VirtualNormalizationFactors", PV::fromInt32(99));
    const std::pair<const char*, int> cases[] = {  // entry -1: no value
        {"22", 22}, {"23", -1}, {"-1", -1}, {"x", 0}, {"", 0}, {"3abc", 3}, {" \t7", 7}, {"+7", 7}, {"007", 7},
        {"-0", 0}, {"- 1", 0}, {"7.9", 7}, {"18446744073709551616", -1}, {"99999999999999999999999", -1},
        {"VirtualNormalizationFactors.1", 0},  // only one level of domain is stripped
    };
    for (const auto& [rest, entry] : cases) {
        const PV value = algs.getState(kFactor + rest);
        EXPECT_EQ(value ? value.toFloat() : -1.0f, static_cast<float>(entry)) << '"' << rest << '"';
    }
    for (int i = 0; i < kVirtualPixelCount; ++i) {
        EXPECT_EQ(algs.getState(kFactor + std::to_string(i)).toFloat(), static_cast<float>(i));
    }
    EXPECT_FALSE(algs.getState("VirtualNormalizationFactors"));
    EXPECT_FALSE(algs.getState("VirtualNormalizationFactorsX0"));
}

// A raised threshold applies from the next frame; factor writes never reach the running algorithm.
TEST(AlgsStateTest, ThresholdWritesApplyButFactorWritesDoNotReachTheAlgorithm) {
    Algs changed;
    changed.setState("ActivationThreshold", PV::fromFloat(1000));
    changed.setState(kFactor + "0", PV::fromDouble(2.5));
    InputReport::Image image;
    image.signedPixels[0] = 300;  // 576, no longer above the threshold
    EXPECT_TRUE(changed.handleImage(image).empty());
    EXPECT_FALSE(changed.handStats().touching);
    EXPECT_EQ(changed.virtualPixels()[0].value, 384);
}

TEST(AlgsStateTest, UnknownAndReadOnlyKeys) {
    Algs algs;
    for (const char* key : {"Unknown", "activationThreshold", "Algs.ActivationThreshold", "ResetEventStats", ""}) {
        EXPECT_FALSE(algs.getState(key)) << key;
    }
    for (const char* key : {"EventStats", "DebugInfo", "Unknown"}) algs.setState(key, PV::fromInt32(1));
    const PropertyValue debugInfo = algs.getState("DebugInfo");
    EXPECT_EQ(debugInfo.keys(), std::vector<std::string>{"EventStats"});
    EXPECT_EQ(debugInfo.get("EventStats"), algs.getState("EventStats"));
}

}  // namespace
}  // namespace ZeltoTouch

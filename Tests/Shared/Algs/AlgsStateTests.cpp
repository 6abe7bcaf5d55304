#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "Shared/Algs/Algs.h"

namespace ZeltoTouch {
namespace {

TEST(AlgsStateTest, DefaultsAndTheirTypes) {
    const Algs algs;
    struct Case {
        const char* key;
        PropertyValue::NumberKind kind;
        double value;
    };
    const Case cases[] = {
        {"EnableHoldSuppression", PropertyValue::NumberKind::Boolean, 1},
        {"EnableTapSuppression", PropertyValue::NumberKind::Boolean, 1},
        {"HoldTimeoutMilliseconds", PropertyValue::NumberKind::UInt32, 500},
        {"ActivationThreshold", PropertyValue::NumberKind::Float32, 200},
    };
    for (const Case& c : cases) {
        const PropertyValue value = algs.getState(c.key);
        ASSERT_TRUE(value.isNumber()) << c.key;
        EXPECT_EQ(value.numberKind(), c.kind) << c.key;
        EXPECT_EQ(value.toDouble(), c.value) << c.key;
    }
}

TEST(AlgsStateTest, WritesCoerceValues) {
    struct Case {
        const char* key;
        PropertyValue written;
        double readBack;
    };
    const Case cases[] = {
        {"HoldTimeoutMilliseconds", PropertyValue::fromUInt64(4294967296ull + 250), 250},
        {"HoldTimeoutMilliseconds", PropertyValue::string("750"), 0},
        {"HoldTimeoutMilliseconds", PropertyValue(), 0},
        {"EnableTapSuppression", PropertyValue::fromInt32(0), 0},
        {"EnableHoldSuppression", PropertyValue::mutableDictionary(), 0},
        {"EnableHoldSuppression", PropertyValue::fromInt32(7), 1},
        {"ActivationThreshold", PropertyValue::fromDouble(123.5), 123.5},
        {"ActivationThreshold", PropertyValue::null(), 0},
        {"VirtualNormalizationFactors.5", PropertyValue::fromDouble(2.5), 2.5},
        {"VirtualNormalizationFactors.5", PropertyValue::string("2.5"), 0},
    };
    for (const Case& c : cases) {
        Algs algs;
        algs.setState(c.key, c.written);
        EXPECT_EQ(algs.getState(c.key).toDouble(), c.readBack) << c.key << " <- " << c.written.description();
    }
    Algs algs;
    algs.setState("EnableTapSuppression", PropertyValue::fromInt32(0));
    EXPECT_EQ(algs.getState("EnableTapSuppression").numberKind(), PropertyValue::NumberKind::Boolean);
}

TEST(AlgsStateTest, FactorIndexIsReadLikeAStreamExtractsAnUnsignedNumber) {
    const Algs algs;
    const PropertyValue first = algs.getState("VirtualNormalizationFactors.0");
    ASSERT_TRUE(first.isNumber());
    EXPECT_EQ(first.toFloat(), 0.6667f);
    struct Case {
        const char* rest;
        int entry;  // -1: no value
    };
    const Case cases[] = {
        {"22", 22}, {"23", -1}, {"-1", -1}, {"x", 0}, {"", 0}, {"3abc", 3}, {" \t7", 7}, {"+7", 7},
        {"007", 7}, {"-0", 0}, {"- 1", 0}, {"7.9", 7}, {"18446744073709551616", -1}, {"99999999999999999999999", -1},
        {"VirtualNormalizationFactors.1", 0},  // only one level of domain is stripped
    };
    const std::vector<float> factors = {0.6667f, 0.4444f, 0.6667f, 0.5714f, 0.6667f, 0.5714f, 0.6667f, 0.4651f,
                                        0.6667f, 0.6667f, 0.4f,    0.4f,    0.4f,    0.4f,    0.4f,    0.5714f,
                                        0.4f,    0.4f,    0.4f,    0.4f,    0.4444f, 0.5714f, 0.6667f};
    for (const Case& c : cases) {
        const PropertyValue value = algs.getState(std::string("VirtualNormalizationFactors.") + c.rest);
        if (c.entry < 0) {
            EXPECT_FALSE(value) << '"' << c.rest << '"';
        } else {
            EXPECT_EQ(value.toFloat(), factors[c.entry]) << '"' << c.rest << '"';
        }
    }
    EXPECT_FALSE(algs.getState("VirtualNormalizationFactors"));
    EXPECT_FALSE(algs.getState("VirtualNormalizationFactorsX0"));
}

TEST(AlgsStateTest, FactorWritesOutOfRangeChangeNothing) {
    Algs algs;
    algs.setState("VirtualNormalizationFactors.23", PropertyValue::fromDouble(9));
    algs.setState("VirtualNormalizationFactors.-1", PropertyValue::fromDouble(9));
    algs.setState("VirtualNormalizationFactors", PropertyValue::fromDouble(9));
    for (int i = 0; i < kVirtualPixelCount; ++i) {
        EXPECT_NE(algs.getState("VirtualNormalizationFactors." + std::to_string(i)).toFloat(), 9.0f) << i;
    }
}

TEST(AlgsStateTest, FactorWritesDoNotReachRunningAlgorithm) {
    Algs changed;
    Algs reference;
    changed.setState("VirtualNormalizationFactors.0", PropertyValue::fromDouble(2.5));
    InputReport::Image image;
    image.signedPixels[0] = 300;
    changed.handleImage(image);
    reference.handleImage(image);
    EXPECT_EQ(changed.virtualPixels()[0].value, reference.virtualPixels()[0].value);
    EXPECT_EQ(changed.getState("VirtualNormalizationFactors.0").toFloat(), 2.5f);
}

TEST(AlgsStateTest, ActivationThresholdAppliesFromNextFrame) {
    Algs algs;
    algs.setState("ActivationThreshold", PropertyValue::fromFloat(1000));
    InputReport::Image image;
    image.signedPixels[0] = 300;  // 576, no longer above the threshold
    EXPECT_TRUE(algs.handleImage(image).empty());
    EXPECT_FALSE(algs.handStats().touching);
}

TEST(AlgsStateTest, UnknownAndReadOnlyKeys) {
    Algs algs;
    for (const char* key : {"Unknown", "activationThreshold", "Algs.ActivationThreshold", "ResetEventStats", ""}) {
        EXPECT_FALSE(algs.getState(key)) << key;
    }
    algs.setState("EventStats", PropertyValue::fromInt32(1));
    algs.setState("DebugInfo", PropertyValue::fromInt32(1));
    algs.setState("Unknown", PropertyValue::fromInt32(1));
    const PropertyValue debugInfo = algs.getState("DebugInfo");
    EXPECT_EQ(debugInfo.keys(), std::vector<std::string>{"EventStats"});
    EXPECT_EQ(debugInfo.get("EventStats"), algs.getState("EventStats"));
}

}  // namespace
}  // namespace ZeltoTouch

#include "Fuzz/FuzzedValues.h"

#include <array>
#include <limits>
#include <string_view>
#include <vector>

namespace ZeltoTouch::Fuzz {

namespace {

constexpr std::string_view kFactorPrefix = "VirtualNormalizationFactors.";
constexpr std::array<std::string_view, 9> kAlgsKeys = {
    "EnableHoldSuppression", "EnableTapSuppression", "HoldTimeoutMilliseconds",
    "ActivationThreshold",   "EventStats",           "ResetEventStats",
    "DebugInfo",             kFactorPrefix,          "VirtualNormalizationFactors",
};

constexpr std::array<double, 12> kEdgeDoubles = {
    std::numeric_limits<double>::quiet_NaN(), std::numeric_limits<double>::infinity(),
    -std::numeric_limits<double>::infinity(), -1.0,
    -0.0, 1e300, -1e300, 4294967296.0 + 250.0,
    18446744073709551616.0, -9223372036854775808.0, std::numeric_limits<double>::denorm_min(),
    std::numeric_limits<double>::max(),
};

constexpr size_t kMaxDepth = 3;

}  // namespace

PropertyValue FuzzedValues::number() {
    switch (_input.ConsumeIntegralInRange<int>(0, 8)) {
        case 0: return PropertyValue::fromUInt64(_input.ConsumeIntegral<uint64_t>());
        case 1: return PropertyValue::fromInt64(_input.ConsumeIntegral<int64_t>());
        case 2: return PropertyValue::fromInt32(_input.ConsumeIntegral<int32_t>());
        case 3: return PropertyValue::fromUInt32(_input.ConsumeIntegral<uint32_t>());
        case 4: return PropertyValue::fromFloat(_input.ConsumeFloatingPoint<float>());
        case 5: return PropertyValue::fromDouble(_input.ConsumeFloatingPoint<double>());
        case 6: return PropertyValue::fromBool(_input.ConsumeBool());
        case 7: return PropertyValue::fromDouble(_input.PickValueInArray(kEdgeDoubles));
        default: return PropertyValue::fromFloat(static_cast<float>(_input.PickValueInArray(kEdgeDoubles)));
    }
}

PropertyValue FuzzedValues::value(int depth) {
    const bool nested = static_cast<size_t>(depth) < kMaxDepth;
    switch (_input.ConsumeIntegralInRange<int>(0, nested ? 7 : 5)) {
        case 0: return {};
        case 1: return PropertyValue::null();
        case 2: return PropertyValue::string(text());
        case 3: return PropertyValue::data(_input.ConsumeBytes<uint8_t>(_input.ConsumeIntegralInRange<size_t>(0, 16)));
        case 4:
        case 5: return number();
        case 6: {
            std::vector<PropertyValue> elements(_input.ConsumeIntegralInRange<size_t>(0, 3));
            for (PropertyValue& element : elements) element = value(depth + 1);
            return PropertyValue::array(std::move(elements));
        }
        default: {
            PropertyValue dictionary = PropertyValue::mutableDictionary();
            for (size_t n = _input.ConsumeIntegralInRange<size_t>(0, 3); n > 0; --n) {
                const std::string key = text(8);
                dictionary.set(key, value(depth + 1));
            }
            return dictionary;
        }
    }
}

std::string FuzzedValues::algsKey() {
    switch (_input.ConsumeIntegralInRange<int>(0, 3)) {
        case 0: return text();
        case 1:  // a factor index, in range or not
            return std::string(kFactorPrefix) + std::to_string(_input.ConsumeIntegralInRange<int>(-2, 25));
        case 2: return std::string(kFactorPrefix) + text(8);
        default: return std::string(_input.PickValueInArray(kAlgsKeys));
    }
}

std::string FuzzedValues::text(size_t maxLength) { return _input.ConsumeRandomLengthString(maxLength); }

}  // namespace ZeltoTouch::Fuzz

#pragma once

#include <cmath>
#include <cstdint>
#include <limits>

// Floating-point to integer conversions that are defined for every input. A plain cast is
// undefined for NaN and for values outside the target's range, so these check first.
namespace ZeltoTouch::NumberConversion {

inline constexpr double kTwoPow63 = 9223372036854775808.0;
inline constexpr double kTwoPow64 = 18446744073709551616.0;

// Truncates toward zero, saturating at the int64 limits; NaN gives 0.
inline int64_t saturatingInt64(double value) noexcept {
    if (std::isnan(value)) return 0;
    if (value >= kTwoPow63) return std::numeric_limits<int64_t>::max();
    if (value <= -kTwoPow63) return std::numeric_limits<int64_t>::min();
    return static_cast<int64_t>(value);
}

// NaN gives 0, values at or above 2^64 give UINT64_MAX, [0, 2^64) truncates toward zero, and
// negative values truncate as int64 (saturating at INT64_MIN) and then wrap as two's complement,
// just as a negative integer does.
inline uint64_t wrappingUInt64(double value) noexcept {
    if (std::isnan(value)) return 0;
    if (value >= kTwoPow64) return std::numeric_limits<uint64_t>::max();
    if (value >= 0) return static_cast<uint64_t>(value);
    return static_cast<uint64_t>(saturatingInt64(value));
}

// Rounds to nearest; magnitudes that round beyond FLT_MAX become infinities, NaN stays NaN.
inline float roundedFloat(double value) noexcept {
    // Half a float ulp above FLT_MAX: from here on, round-to-nearest yields infinity.
    constexpr double kFloatOverflow = 340282356779733661637539395458142568448.0;
    if (value >= kFloatOverflow) return std::numeric_limits<float>::infinity();
    if (value <= -kFloatOverflow) return -std::numeric_limits<float>::infinity();
    return static_cast<float>(value);
}

}  // namespace ZeltoTouch::NumberConversion

#include "Host/PropertyValue.h"

#include <cmath>
#include <cstdint>
#include <limits>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Tests/Host/PropertyValuePrinter.h"

namespace ZeltoTouch {
namespace {

using PV = PropertyValue;
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity();
constexpr float kFloatInf = std::numeric_limits<float>::infinity();
constexpr uint64_t kU64Max = std::numeric_limits<uint64_t>::max();
constexpr uint64_t kInt64Min = 0x8000000000000000ull;

TEST(PropertyValueNumber, ReadingsAreDefinedForEveryInput) {
    const std::tuple<PV, uint64_t, float, bool> cases[] = {  // value, toUInt64, toFloat, toBool
        {PV::fromUInt64(kU64Max), kU64Max, 18446744073709551616.0f, true},
        {PV::fromInt64(-1), kU64Max, -1.0f, true},  // wraps
        {PV::fromInt32(INT32_MIN), 0xFFFFFFFF80000000ull, -2147483648.0f, true},
        {PV::fromDouble(kNaN), 0, std::numeric_limits<float>::quiet_NaN(), true},
        {PV::fromDouble(kInf), kU64Max, kFloatInf, true}, {PV::fromDouble(-kInf), kInt64Min, -kFloatInf, true},
        {PV::fromDouble(18446744073709551616.0), kU64Max, 18446744073709551616.0f, true},  // saturates
        {PV::fromDouble(18446744073709549568.0), 18446744073709549568ull, 18446744073709551616.0f, true},
        {PV::fromDouble(-1.5), kU64Max, -1.5f, true},  // truncates, then wraps
        {PV::fromDouble(2.9), 2, 2.9f, true},
        {PV::fromDouble(1e39), kU64Max, kFloatInf, true},  // beyond the float range
        {PV::fromDouble(3.4028235e38), kU64Max, std::numeric_limits<float>::max(), true},
        {PV::fromDouble(-0.0), 0, -0.0f, false}, {PV::fromBool(true), 1, 1.0f, true},
        {PV::string("7"), 0, 0.0f, false}, {PV(), 0, 0.0f, false},
    };
    for (const auto& [value, asUInt64, asFloat, asBool] : cases) {
        SCOPED_TRACE(value.description());
        EXPECT_EQ(value.toUInt64(), asUInt64);
        EXPECT_TRUE(value.toFloat() == asFloat || (std::isnan(asFloat) && std::isnan(value.toFloat())));
        EXPECT_EQ(value.toBool(), asBool);
    }
    EXPECT_EQ(PV::fromInt64(INT64_MIN).toDouble(), -9223372036854775808.0);
}

TEST(PropertyValueEquality, ComparesNumbersByValueAndTreesDeeply) {
    const std::tuple<PV, PV, bool> cases[] = {
        {PV::fromUInt64(1), PV::fromDouble(1.0), true}, {PV::fromInt32(-1), PV::fromInt64(-1), true},
        {PV::fromInt64(-1), PV::fromUInt64(kU64Max), false},
        {PV::fromUInt64(kU64Max), PV::fromDouble(18446744073709551616.0), false},
        {PV::fromUInt64((1ull << 53) + 1), PV::fromDouble(9007199254740992.0), false},
        {PV::fromFloat(0.1f), PV::fromDouble(0.1), false}, {PV::fromFloat(0.5f), PV::fromDouble(0.5), true},
        {PV::fromDouble(-0.0), PV::fromInt32(0), true}, {PV::fromDouble(kNaN), PV::fromDouble(kNaN), true},
        {PV::fromDouble(kNaN), PV::fromUInt64(0), false}, {PV::fromBool(true), PV::fromUInt64(1), false},
        {PV::fromUInt64(1), PV::string("1"), false}, {PV::null(), PV(), false}, {PV(), PV(), true},
        {PV::array({PV::null()}), PV::array({PV::null()}).mutableCopy(), true},
        {PV::dictionary({{"B", PV::string("x")}}), PV::dictionary({{"B", PV::string("y")}}), false},
    };
    for (const auto& [a, b, equal] : cases) {
        EXPECT_EQ(a == b, equal) << a.description() << " == " << b.description();
        EXPECT_EQ(b == a, equal) << b.description() << " == " << a.description();
    }
}

TEST(PropertyValueOwnership, InsertionsThatWouldFormACycleAreRefused) {
    auto array = PV::mutableArray();
    EXPECT_FALSE(array.append(array));
    auto dictionary = PV::mutableDictionary();
    EXPECT_TRUE(dictionary.set("Array", array));
    EXPECT_FALSE(array.append(dictionary));
    EXPECT_FALSE(array.append(PV::array({PV::array({dictionary})})));
    EXPECT_FALSE(dictionary.set("Self", dictionary));
    auto leaf = PV::mutableArray();  // shared but acyclic structure is fine
    EXPECT_TRUE(array.append(leaf) && array.append(leaf));
    EXPECT_EQ(dictionary.description(), "{\"Array\": [[], []]}");
}

TEST(PropertyValueDescription, QuotedStringsEscapeQuotesBackslashesAndControlCharacters) {
    const struct {
        std::string text;
        std::string quoted;
    } cases[] = {
        {"", "\"\""},
        {"plain \xC3\xA9", "\"plain \xC3\xA9\""},
        {"\"a\\b\"", "\"\\\"a\\\\b\\\"\""},
        {std::string("\n\r\t\x01\x1F\0", 6), "\"\\n\\r\\t\\u0001\\u001f\\u0000\""},
    };
    for (const auto& [text, quoted] : cases) {
        EXPECT_EQ(PV::array({PV::string(text)}).description(), "[" + quoted + "]");
    }
}

TEST(PropertyValueDictionary, KeysAreSortedUniqueAndNoValueMeansAbsent) {
    auto dictionary =
        PV::dictionary({"B", "A", "C", "A"}, {PV::fromUInt64(1), PV::fromUInt64(2), PV(), PV::fromUInt64(3)});
    EXPECT_EQ(dictionary.description(), "{\"A\": 3, \"B\": 1}");  // the last duplicate wins
    auto mutableDictionary = dictionary.mutableCopy();
    EXPECT_TRUE(mutableDictionary.set("0", PV::null()) && mutableDictionary.set("B", PV()));
    EXPECT_TRUE(mutableDictionary.remove("Missing"));
    EXPECT_THAT(mutableDictionary.keys(), testing::ElementsAre("0", "A"));
    EXPECT_EQ(dictionary.count(), 2u);
    EXPECT_THROW(PV::dictionary({"A"}, {}), std::invalid_argument);
}

TEST(PropertyValueString, FromDataRequiresValidUTF8) {
    EXPECT_EQ(PV::stringFromData(PV::data(std::vector<uint8_t>{'h', 0xC3, 0xA9})).stringView(), "h\xC3\xA9");
    EXPECT_TRUE(PV::stringFromData(PV::data(std::vector<uint8_t>{})).isString());
    const std::vector<uint8_t> invalid[] = {{0xC3}, {0xC0, 0xAF}, {0xED, 0xA0, 0x80}, {0xF4, 0x90, 0x80, 0x80}};
    for (const auto& bytes : invalid) EXPECT_FALSE(PV::stringFromData(PV::data(bytes)).hasValue()) << bytes.size();
    EXPECT_FALSE(PV::stringFromData(PV::string("text")).hasValue());
}

TEST(PropertyValueDescription, ShowsEveryKind) {
    const std::pair<PV, const char*> cases[] = {
        {PV(), "(no value)"}, {PV::null(), "null"}, {PV::string("plain \"text\""), "plain \"text\""},
        {PV::fromInt32(-5), "-5"}, {PV::fromUInt64(kU64Max), "18446744073709551615"}, {PV::fromFloat(0.1f), "0.1"},
        {PV::fromDouble(0.1), "0.1"}, {PV::fromDouble(kNaN), "nan"}, {PV::fromBool(false), "false"},
        {PV::data(std::vector<uint8_t>{0x00, 0xAB, 0x10}), "<00ab10>"},
        {PV::array({PV::string("a\n"), PV::fromUInt64(1)}), "[\"a\\n\", 1]"},
        {PV::dictionary({{"K", PV::dictionary({{"L", PV::null()}})}}), "{\"K\": {\"L\": null}}"},
    };
    for (const auto& [value, text] : cases) EXPECT_EQ(value.description(), text);
}

}  // namespace
}  // namespace ZeltoTouch

#include "Host/PropertyValue.h"

#include <cmath>
#include <cstdint>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Tests/Host/PropertyValuePrinter.h"

namespace ZeltoTouch {
namespace {

using ::testing::ElementsAre;

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity();
constexpr uint64_t kU64Max = std::numeric_limits<uint64_t>::max();

struct ConversionCase {
    const char* name;
    PropertyValue value;
    uint64_t asUInt64;
    float asFloat;
    bool asBool;
};

TEST(PropertyValueNumber, ReadingsAreDefinedForEveryInput) {
    const ConversionCase cases[] = {
        {"u64 max", PropertyValue::fromUInt64(kU64Max), kU64Max, 18446744073709551616.0f, true},
        {"int64 -1 wraps", PropertyValue::fromInt64(-1), kU64Max, -1.0f, true},
        {"int32 min wraps", PropertyValue::fromInt32(INT32_MIN), 0xFFFFFFFF80000000ull, -2147483648.0f, true},
        {"uint32 max", PropertyValue::fromUInt32(UINT32_MAX), 4294967295ull, 4294967296.0f, true},
        {"zero", PropertyValue::fromInt32(0), 0, 0.0f, false},
        {"NaN", PropertyValue::fromDouble(kNaN), 0, std::numeric_limits<float>::quiet_NaN(), true},
        {"+inf", PropertyValue::fromDouble(kInf), kU64Max, std::numeric_limits<float>::infinity(), true},
        {"-inf", PropertyValue::fromDouble(-kInf), 0x8000000000000000ull, -std::numeric_limits<float>::infinity(), true},
        {"1e30 saturates", PropertyValue::fromDouble(1e30), kU64Max, 1e30f, true},
        {"2^64 saturates", PropertyValue::fromDouble(18446744073709551616.0), kU64Max, 18446744073709551616.0f, true},
        {"just below 2^64", PropertyValue::fromDouble(18446744073709549568.0), 18446744073709549568ull,
         18446744073709551616.0f, true},
        {"-1.5 truncates then wraps", PropertyValue::fromDouble(-1.5), kU64Max, -1.5f, true},
        {"-1e300 saturates at INT64_MIN", PropertyValue::fromDouble(-1e300), 0x8000000000000000ull,
         -std::numeric_limits<float>::infinity(), true},
        {"2.9 truncates", PropertyValue::fromDouble(2.9), 2, 2.9f, true},
        {"double beyond float range", PropertyValue::fromDouble(1e39), kU64Max, std::numeric_limits<float>::infinity(), true},
        {"double rounding down to FLT_MAX", PropertyValue::fromDouble(3.4028235e38), kU64Max,
         std::numeric_limits<float>::max(), true},
        {"-0.0", PropertyValue::fromDouble(-0.0), 0, -0.0f, false},
        {"float 0.5", PropertyValue::fromFloat(0.5f), 0, 0.5f, true},
        {"true", PropertyValue::fromBool(true), 1, 1.0f, true},
        {"false", PropertyValue::fromBool(false), 0, 0.0f, false},
        {"not a number", PropertyValue::string("7"), 0, 0.0f, false},
        {"no value", PropertyValue(), 0, 0.0f, false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        EXPECT_EQ(c.value.toUInt64(), c.asUInt64);
        if (std::isnan(c.asFloat)) EXPECT_TRUE(std::isnan(c.value.toFloat()));
        else EXPECT_EQ(c.value.toFloat(), c.asFloat);
        EXPECT_EQ(c.value.toBool(), c.asBool);
    }
}

TEST(PropertyValueNumber, RemembersItsKind) {
    using K = PropertyValue::NumberKind;
    EXPECT_EQ(PropertyValue::fromUInt64(1).numberKind(), K::UInt64);
    EXPECT_EQ(PropertyValue::fromInt64(1).numberKind(), K::Int64);
    EXPECT_EQ(PropertyValue::fromInt32(1).numberKind(), K::Int32);
    EXPECT_EQ(PropertyValue::fromUInt32(1).numberKind(), K::UInt32);
    EXPECT_EQ(PropertyValue::fromFloat(1).numberKind(), K::Float32);
    EXPECT_EQ(PropertyValue::fromDouble(1).numberKind(), K::Float64);
    EXPECT_EQ(PropertyValue::fromBool(true).numberKind(), K::Boolean);
    EXPECT_EQ(PropertyValue::fromDouble(0.1).toDouble(), 0.1);
    EXPECT_EQ(PropertyValue::fromInt64(INT64_MIN).toDouble(), -9223372036854775808.0);
}

TEST(PropertyValueEquality, ComparesNumbersByValue) {
    struct Case {
        PropertyValue a, b;
        bool equal;
    };
    const Case cases[] = {
        {PropertyValue::fromUInt64(1), PropertyValue::fromDouble(1.0), true},
        {PropertyValue::fromInt32(-1), PropertyValue::fromInt64(-1), true},
        {PropertyValue::fromInt64(-1), PropertyValue::fromUInt64(kU64Max), false},
        {PropertyValue::fromUInt64(kU64Max), PropertyValue::fromDouble(18446744073709551616.0), false},
        {PropertyValue::fromUInt64((1ull << 53) + 1), PropertyValue::fromDouble(9007199254740992.0), false},
        {PropertyValue::fromFloat(0.1f), PropertyValue::fromDouble(0.1), false},
        {PropertyValue::fromFloat(0.5f), PropertyValue::fromDouble(0.5), true},
        {PropertyValue::fromDouble(-0.0), PropertyValue::fromInt32(0), true},
        {PropertyValue::fromDouble(kNaN), PropertyValue::fromDouble(kNaN), true},
        {PropertyValue::fromDouble(kNaN), PropertyValue::fromUInt64(0), false},
        {PropertyValue::fromBool(true), PropertyValue::fromUInt64(1), false},
        {PropertyValue::fromBool(true), PropertyValue::fromBool(true), true},
        {PropertyValue::fromUInt64(1), PropertyValue::string("1"), false},
        {PropertyValue::null(), PropertyValue(), false},
        {PropertyValue(), PropertyValue(), true},
    };
    for (size_t i = 0; i < std::size(cases); ++i) {
        SCOPED_TRACE(i);
        EXPECT_EQ(cases[i].a == cases[i].b, cases[i].equal);
        EXPECT_EQ(cases[i].b == cases[i].a, cases[i].equal);
    }
}

TEST(PropertyValueEquality, IsDeepAndIgnoresMutability) {
    auto build = [] {
        return PropertyValue::dictionary({{"A", PropertyValue::array({PropertyValue::fromInt32(1), PropertyValue::null()})},
                                          {"B", PropertyValue::string("x")}});
    };
    EXPECT_EQ(build(), build());
    EXPECT_EQ(build(), build().mutableCopy());
    auto changed = build().mutableCopy();
    changed.set("B", PropertyValue::string("y"));
    EXPECT_NE(build(), changed);
}

TEST(PropertyValueOwnership, CopiesShareOneRecord) {
    auto original = PropertyValue::mutableDictionary();
    auto copy = original;
    EXPECT_TRUE(copy.set("Key", PropertyValue::fromUInt32(3)));
    EXPECT_EQ(original.get("Key").toUInt64(), 3u);

    auto text = PropertyValue::mutableString();
    auto sameText = text;
    EXPECT_TRUE(text.appendString("ab"));
    EXPECT_TRUE(sameText.appendString("c"));
    EXPECT_EQ(text.stringView(), "abc");
    EXPECT_EQ(text.length(), 3u);
}

TEST(PropertyValueOwnership, ImmutableValuesRefuseMutation) {
    auto dictionary = PropertyValue::dictionary({{"A", PropertyValue::fromUInt64(1)}});
    auto array = PropertyValue::array({PropertyValue::fromUInt64(1)});
    auto text = PropertyValue::string("a");
    auto number = PropertyValue::fromUInt64(1);

    EXPECT_FALSE(dictionary.set("B", number));
    EXPECT_FALSE(dictionary.remove("A"));
    EXPECT_FALSE(array.append(number));
    EXPECT_FALSE(text.appendString("b"));
    EXPECT_FALSE(number.append(number));
    EXPECT_FALSE(PropertyValue().set("A", number));

    EXPECT_EQ(dictionary.count(), 1u);
    EXPECT_EQ(array.count(), 1u);
    EXPECT_EQ(text.stringView(), "a");
    EXPECT_FALSE(dictionary.isMutable());
}

TEST(PropertyValueOwnership, MutableCopyIsShallowAndIndependent) {
    auto inner = PropertyValue::mutableArray();
    auto outer = PropertyValue::array({inner});
    auto copy = outer.mutableCopy();
    ASSERT_TRUE(copy.isMutable());
    EXPECT_TRUE(copy.append(PropertyValue::null()));
    EXPECT_EQ(outer.count(), 1u);
    EXPECT_TRUE(copy.at(0).append(PropertyValue::null()));  // shallow: the element is shared
    EXPECT_EQ(inner.count(), 1u);
    EXPECT_FALSE(PropertyValue::fromUInt64(1).mutableCopy().hasValue());
}

TEST(PropertyValueOwnership, InsertionsThatWouldFormACycleAreRefused) {
    auto array = PropertyValue::mutableArray();
    EXPECT_FALSE(array.append(array));
    auto dictionary = PropertyValue::mutableDictionary();
    EXPECT_TRUE(dictionary.set("Array", array));
    EXPECT_FALSE(array.append(dictionary));
    EXPECT_FALSE(array.append(PropertyValue::array({PropertyValue::array({dictionary})})));
    EXPECT_FALSE(dictionary.set("Self", dictionary));
    // Shared but acyclic structure is fine.
    auto leaf = PropertyValue::mutableArray();
    EXPECT_TRUE(array.append(leaf));
    EXPECT_TRUE(array.append(leaf));
    EXPECT_EQ(dictionary.description(), "{\"Array\": [[], []]}");
}

TEST(PropertyValueDictionary, KeysAreSortedUniqueAndNoValueMeansAbsent) {
    auto dictionary = PropertyValue::dictionary({"B", "A", "C", "A"},
                                                {PropertyValue::fromUInt64(1), PropertyValue::fromUInt64(2),
                                                 PropertyValue(), PropertyValue::fromUInt64(3)});
    EXPECT_THAT(dictionary.keys(), ElementsAre("A", "B"));
    EXPECT_EQ(dictionary.get("A").toUInt64(), 3u);  // the last duplicate wins
    EXPECT_FALSE(dictionary.get("C").hasValue());
    EXPECT_FALSE(dictionary.get("Missing").hasValue());

    auto mutableDictionary = dictionary.mutableCopy();
    EXPECT_TRUE(mutableDictionary.set("0", PropertyValue::null()));
    EXPECT_TRUE(mutableDictionary.set("B", PropertyValue()));
    EXPECT_THAT(mutableDictionary.keys(), ElementsAre("0", "A"));
    EXPECT_TRUE(mutableDictionary.get("0").isNull());
    EXPECT_TRUE(mutableDictionary.remove("Missing"));
    EXPECT_EQ(dictionary.count(), 2u);

    EXPECT_THROW(PropertyValue::dictionary({"A"}, {}), std::invalid_argument);
}

TEST(PropertyValueArray, ReadsByIndexAndEnumeratesInOrder) {
    auto array = PropertyValue::mutableArray();
    for (uint64_t i = 0; i < 3; ++i) EXPECT_TRUE(array.append(PropertyValue::fromUInt64(i)));
    EXPECT_FALSE(array.append(PropertyValue()));
    ASSERT_EQ(array.count(), 3u);
    EXPECT_EQ(array.at(2).toUInt64(), 2u);
    EXPECT_FALSE(array.at(3).hasValue());
    uint64_t expected = 0;
    for (const auto& element : array.elements()) EXPECT_EQ(element.toUInt64(), expected++);
    EXPECT_TRUE(PropertyValue().elements().empty());
    EXPECT_TRUE(PropertyValue::string("x").elements().empty());
}

TEST(PropertyValueKinds, TypeTestsAndNoValue) {
    PropertyValue none;
    EXPECT_FALSE(none.hasValue());
    EXPECT_FALSE(none.isNull() || none.isNumber() || none.isString() || none.isData() || none.isArray() ||
                 none.isDictionary() || none.isMutable());
    EXPECT_TRUE(PropertyValue::null().hasValue());
    EXPECT_TRUE(PropertyValue::null().isNull());
    EXPECT_EQ(PropertyValue::data(std::vector<uint8_t>{1}).kind(), PropertyValue::Kind::Data);
    EXPECT_EQ(PropertyValue::mutableDictionary().kind(), PropertyValue::Kind::Dictionary);
    EXPECT_TRUE(PropertyValue::mutableString().isString());
}

TEST(PropertyValueString, FromDataRequiresValidUTF8) {
    auto bytes = [](std::initializer_list<uint8_t> b) { return PropertyValue::data(std::vector<uint8_t>(b)); };
    EXPECT_EQ(PropertyValue::stringFromData(bytes({'h', 0xC3, 0xA9})).stringView(), "h\xC3\xA9");
    EXPECT_FALSE(PropertyValue::stringFromData(bytes({0xC3})).hasValue());              // truncated
    EXPECT_FALSE(PropertyValue::stringFromData(bytes({0xC0, 0xAF})).hasValue());        // overlong
    EXPECT_FALSE(PropertyValue::stringFromData(bytes({0xED, 0xA0, 0x80})).hasValue());  // surrogate
    EXPECT_FALSE(PropertyValue::stringFromData(bytes({0xF4, 0x90, 0x80, 0x80})).hasValue());  // > U+10FFFF
    EXPECT_FALSE(PropertyValue::stringFromData(PropertyValue::string("text")).hasValue());
    EXPECT_EQ(PropertyValue::stringFromData(bytes({})).stringView(), "");
}

TEST(PropertyValueDescription, ShowsEveryKind) {
    struct Case {
        PropertyValue value;
        const char* text;
    };
    const Case cases[] = {
        {PropertyValue(), "(no value)"},
        {PropertyValue::null(), "null"},
        {PropertyValue::string("plain \"text\""), "plain \"text\""},
        {PropertyValue::fromInt32(-5), "-5"},
        {PropertyValue::fromUInt64(kU64Max), "18446744073709551615"},
        {PropertyValue::fromFloat(0.1f), "0.1"},
        {PropertyValue::fromDouble(0.1), "0.1"},
        {PropertyValue::fromDouble(kNaN), "nan"},
        {PropertyValue::fromBool(false), "false"},
        {PropertyValue::data(std::vector<uint8_t>{0x00, 0xAB, 0x10}), "<00ab10>"},
        {PropertyValue::array({PropertyValue::string("a\n"), PropertyValue::fromUInt64(1)}), "[\"a\\n\", 1]"},
        {PropertyValue::dictionary({{"K", PropertyValue::dictionary({{"L", PropertyValue::null()}})}}),
         "{\"K\": {\"L\": null}}"},
    };
    for (const auto& c : cases) EXPECT_EQ(c.value.description(), c.text);
}

}  // namespace
}  // namespace ZeltoTouch

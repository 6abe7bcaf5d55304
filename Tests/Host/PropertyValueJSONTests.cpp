#include <chrono>
#include <cmath>
#include <limits>
#include <string>

#include <gtest/gtest.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "Host/JSONWriter.h"
#include "Host/PropertyValue.h"
#include "Tests/Host/PropertyValuePrinter.h"

namespace ZeltoTouch {
namespace {

std::string jsonText(const PropertyValue& value) {
    std::string text;
    return value.toJSON(text) ? text : "(failed)";
}

std::string nested(size_t depth, std::string_view inner = "") {
    return std::string(depth, '[') + std::string(inner) + std::string(depth, ']');
}

TEST(PropertyValueJSON, WritesCompactTextThatReadsBackEqual) {
    struct Case {
        PropertyValue value;
        const char* text;
    };
    const Case cases[] = {
        {PropertyValue::fromUInt64(std::numeric_limits<uint64_t>::max()), "18446744073709551615"},
        {PropertyValue::fromInt64(std::numeric_limits<int64_t>::min()), "-9223372036854775808"},
        {PropertyValue::fromInt32(-7), "-7"},
        {PropertyValue::fromUInt32(4294967295u), "4294967295"},
        {PropertyValue::fromDouble(0.1), "0.1"},
        {PropertyValue::fromDouble(1e308), "1e308"},
        {PropertyValue::fromDouble(2.0), "2.0"},
        {PropertyValue::fromDouble(5e-324), "5e-324"},
        {PropertyValue::fromBool(true), "true"},
        {PropertyValue::null(), "null"},
        {PropertyValue::string("a\"\\\n\x01\xC3\xA9"), "\"a\\\"\\\\\\n\\u0001\xC3\xA9\""},
        {PropertyValue::string(std::string("a\0b", 3)), "\"a\\u0000b\""},
        {PropertyValue::array({}), "[]"},
        {PropertyValue::dictionary({{"B", PropertyValue::array({PropertyValue::null(), PropertyValue::fromInt32(1)})},
                                    {"A", PropertyValue::mutableDictionary()}}),
         "{\"A\":{},\"B\":[null,1]}"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.text);
        EXPECT_EQ(jsonText(c.value), c.text);
        EXPECT_EQ(PropertyValue::fromJSON(std::string_view(c.text)), c.value);
    }
}

TEST(PropertyValueJSON, FloatsAreWrittenAsTheShortestTextOfTheFloat) {
    const std::pair<float, const char*> cases[] = {
        {0.1f, "0.1"}, {3.0f, "3.0"}, {-0.0f, "-0.0"}, {3.4028235e38f, "3.4028235e+38"}, {1e-45f, "1e-45"},
    };
    for (const auto& [value, text] : cases) {
        SCOPED_TRACE(text);
        EXPECT_EQ(jsonText(PropertyValue::fromFloat(value)), text);
        auto parsed = PropertyValue::fromJSON(std::string_view(text));
        EXPECT_EQ(parsed.numberKind(), PropertyValue::NumberKind::Float64);
        EXPECT_EQ(parsed.toFloat(), value);
    }
}

TEST(PropertyValueJSON, ParsedNumbersKeepExactValues) {
    using K = PropertyValue::NumberKind;
    auto u64 = PropertyValue::fromJSON("18446744073709551615");
    EXPECT_EQ(u64.numberKind(), K::UInt64);
    EXPECT_EQ(u64.toUInt64(), std::numeric_limits<uint64_t>::max());
    auto negative = PropertyValue::fromJSON("-9223372036854775808");
    EXPECT_EQ(negative.numberKind(), K::Int64);
    EXPECT_EQ(negative.toUInt64(), 0x8000000000000000ull);
    EXPECT_EQ(PropertyValue::fromJSON("-1").toUInt64(), std::numeric_limits<uint64_t>::max());
    // Beyond 64 bits, integers become the nearest double.
    EXPECT_EQ(PropertyValue::fromJSON("18446744073709551616").numberKind(), K::Float64);
    // Full precision: the correctly rounded double, not an approximation.
    EXPECT_EQ(PropertyValue::fromJSON("0.30000000000000004").toDouble(), 0.30000000000000004);
    EXPECT_EQ(PropertyValue::fromJSON("2.2250738585072011e-308").toDouble(), 2.2250738585072011e-308);
    for (double d : {0.1, 1e308, 1.0 / 3.0, -123.456e-200, 4.9406564584124654e-324}) {
        SCOPED_TRACE(d);
        EXPECT_EQ(PropertyValue::fromJSON(jsonText(PropertyValue::fromDouble(d))).toDouble(), d);
    }
}

TEST(PropertyValueJSON, NullIsAValueAndDuplicateKeysKeepTheLast) {
    auto parsed = PropertyValue::fromJSON(" { \"A\" : null , \"B\": 1, \"A\": 2 } ");
    ASSERT_TRUE(parsed.isDictionary());
    EXPECT_EQ(parsed.count(), 2u);
    EXPECT_EQ(parsed.get("A").toUInt64(), 2u);
    auto null = PropertyValue::fromJSON("null");
    EXPECT_TRUE(null.hasValue());
    EXPECT_TRUE(null.isNull());
}

TEST(PropertyValueJSON, RefusesWhatIsNotExactlyOneValidDocument) {
    const std::string cases[] = {
        "",
        "   ",
        "{\"A\":1",
        "[1,]",
        "1 2",
        "{} x",
        std::string("1\0", 2),
        std::string("[1]\0garbage", 11),
        std::string("\"a\0b\"", 5),
        "\"\xC3\"",
        "\"\xED\xA0\x80\"",
        "\"\xFF\"",
        "{\"\xC0\x80\":1}",
        "\"\\uDC00\"",
        "\"\\uD800x\"",
        "NaN",
        "Infinity",
        "01",
        "'a'",
        nested(PropertyValue::kMaxJSONDepth + 1),
        nested(10000),
        std::string(100000, '['),
    };
    for (const auto& text : cases) {
        SCOPED_TRACE(text.substr(0, 40));
        EXPECT_FALSE(PropertyValue::fromJSON(text).hasValue());
    }
}

TEST(PropertyValueJSON, EscapesDecodeToUTF8) {
    EXPECT_EQ(PropertyValue::fromJSON("\"\\u00e9\\uD83D\\uDE00\\/\"").stringView(), "\xC3\xA9\xF0\x9F\x98\x80/");
}

TEST(PropertyValueJSON, NestingIsBoundedOnBothSides) {
    auto deepest = PropertyValue::fromJSON(nested(PropertyValue::kMaxJSONDepth, "1"));
    ASSERT_TRUE(deepest.isArray());
    EXPECT_EQ(jsonText(deepest), nested(PropertyValue::kMaxJSONDepth, "1"));

    auto tooDeep = PropertyValue::mutableArray();
    tooDeep.append(deepest);
    EXPECT_FALSE(tooDeep.toJSON().hasValue());

    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    EXPECT_FALSE(writeJSON(writer, deepest, 1));
}

TEST(PropertyValueJSON, RefusesToSerialiseWhatJSONCannotHold) {
    const std::pair<const char*, PropertyValue> cases[] = {
        {"no value", PropertyValue()},
        {"data", PropertyValue::data(std::vector<uint8_t>{1, 2})},
        {"data inside", PropertyValue::dictionary({{"A", PropertyValue::data(std::vector<uint8_t>{})}})},
        {"NaN", PropertyValue::fromDouble(std::nan(""))},
        {"inf", PropertyValue::array({PropertyValue::fromDouble(std::numeric_limits<double>::infinity())})},
        {"float inf", PropertyValue::fromFloat(-std::numeric_limits<float>::infinity())},
        {"invalid UTF-8", PropertyValue::string("\xC3")},
        {"invalid UTF-8 key", PropertyValue::dictionary({{"\xFF", PropertyValue::null()}})},
    };
    for (const auto& [name, value] : cases) {
        SCOPED_TRACE(name);
        EXPECT_FALSE(value.toJSON().hasValue());
        std::string out = "kept";
        EXPECT_FALSE(value.toJSON(out));
        EXPECT_EQ(out, "kept");
    }
}

TEST(PropertyValueJSON, ParsesFromDataOrTextAndSerialisesToData) {
    auto value = PropertyValue::dictionary({{"Frames", PropertyValue::array({PropertyValue::fromUInt64(1)})}});
    auto data = value.toJSON();
    ASSERT_TRUE(data.isData());
    EXPECT_EQ(PropertyValue::stringFromData(data).stringView(), "{\"Frames\":[1]}");
    EXPECT_EQ(PropertyValue::fromJSON(data), value);
    EXPECT_EQ(PropertyValue::fromJSON(PropertyValue::string("[true]")), PropertyValue::array({PropertyValue::fromBool(true)}));
    EXPECT_FALSE(PropertyValue::fromJSON(PropertyValue::fromUInt64(1)).hasValue());
}

TEST(PropertyValueJSON, WriterStreamsValuesIntoACallersDocument) {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    writer.StartArray();
    EXPECT_TRUE(writeJSON(writer, PropertyValue::dictionary({{"Value", PropertyValue::fromFloat(0.25f)}}), 1));
    EXPECT_TRUE(writeJSON(writer, PropertyValue::string("x"), 1));
    writer.EndArray();
    EXPECT_STREQ(buffer.GetString(), "[{\"Value\":0.25},\"x\"]");
}

TEST(PropertyValueJSON, HugeObjectsParseInLinearishTime) {
    constexpr int kKeys = 100000;
    std::string text = "{";
    for (int i = kKeys - 1; i >= 0; --i) {  // reverse order: the parser must sort
        text += "\"k" + std::to_string(i) + "\":" + std::to_string(i) + ",";
    }
    text += "\"k7\":\"last\"}";
    auto start = std::chrono::steady_clock::now();
    auto parsed = PropertyValue::fromJSON(text);
    auto elapsed = std::chrono::steady_clock::now() - start;
    ASSERT_TRUE(parsed.isDictionary());
    EXPECT_EQ(parsed.count(), static_cast<size_t>(kKeys));
    EXPECT_EQ(parsed.get("k7").stringView(), "last");
    EXPECT_EQ(parsed.get("k99999").toUInt64(), 99999u);
    EXPECT_LT(elapsed, std::chrono::seconds(5));
}

}  // namespace
}  // namespace ZeltoTouch

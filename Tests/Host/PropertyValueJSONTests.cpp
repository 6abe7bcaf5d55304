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

using PV = PropertyValue;

std::string jsonText(const PV& value) {
    std::string text;
    return value.toJSON(text) ? text : "(failed)";
}

std::string nested(size_t depth, std::string_view inner = "") {
    return std::string(depth, '[') + std::string(inner) + std::string(depth, ']');
}

TEST(PropertyValueJSON, WritesCompactTextThatReadsBackEqual) {
    const std::pair<PV, const char*> cases[] = {
        {PV::fromUInt64(std::numeric_limits<uint64_t>::max()), "18446744073709551615"},
        {PV::fromInt64(std::numeric_limits<int64_t>::min()), "-9223372036854775808"},
        {PV::fromUInt32(4294967295u), "4294967295"}, {PV::fromDouble(0.1), "0.1"},
        {PV::fromDouble(1e308), "1e308"}, {PV::fromDouble(2.0), "2.0"},
        {PV::fromDouble(5e-324), "5e-324"}, {PV::fromBool(true), "true"}, {PV::null(), "null"},
        {PV::string("a\"\\\n\x01\xC3\xA9"), "\"a\\\"\\\\\\n\\u0001\xC3\xA9\""},
        {PV::string(std::string("a\0b", 3)), "\"a\\u0000b\""},
        {PV::dictionary({{"B", PV::array({PV::null(), PV::fromInt32(-1)})}, {"A", PV::mutableDictionary()}}),
         "{\"A\":{},\"B\":[null,-1]}"},
    };
    for (const auto& [value, text] : cases) {
        SCOPED_TRACE(text);
        EXPECT_EQ(jsonText(value), text);
        EXPECT_EQ(PV::fromJSON(std::string_view(text)), value);
    }
}

TEST(PropertyValueJSON, FloatsAreWrittenAsTheShortestTextOfTheFloat) {
    const std::pair<float, const char*> cases[] = {
        {0.1f, "0.1"}, {3.0f, "3.0"}, {-0.0f, "-0.0"}, {3.4028235e38f, "3.4028235e+38"}, {1e-45f, "1e-45"},
    };
    for (const auto& [value, text] : cases) {
        EXPECT_EQ(jsonText(PV::fromFloat(value)), text);
        EXPECT_EQ(PV::fromJSON(std::string_view(text)).toFloat(), value) << text;
    }
}

TEST(PropertyValueJSON, ParsedNumbersKeepTheirKindAndExactValue) {
    using K = PV::NumberKind;
    EXPECT_EQ(PV::fromJSON("18446744073709551615").numberKind(), K::UInt64);
    EXPECT_EQ(PV::fromJSON("-9223372036854775808").numberKind(), K::Int64);
    EXPECT_EQ(PV::fromJSON("-1").toUInt64(), std::numeric_limits<uint64_t>::max());
    // Beyond 64 bits, integers become the nearest double.
    EXPECT_EQ(PV::fromJSON("18446744073709551616").numberKind(), K::Float64);
    EXPECT_EQ(PV::fromJSON("2.2250738585072011e-308").toDouble(), 2.2250738585072011e-308);
    EXPECT_EQ(PV::fromJSON("\"\\u00e9\\uD83D\\uDE00\\/\"").stringView(), "\xC3\xA9\xF0\x9F\x98\x80/");
    // Null is a value; a duplicate key keeps the last.
    auto parsed = PV::fromJSON(" { \"A\" : null , \"B\": 1, \"A\": 2 } ");
    EXPECT_EQ(parsed.count(), 2u);
    EXPECT_EQ(parsed.get("A").toUInt64(), 2u);
    EXPECT_TRUE(PV::fromJSON("null").isNull());
    EXPECT_EQ(PV::fromJSON(PV::string("[true]")).at(0), PV::fromBool(true));
    EXPECT_FALSE(PV::fromJSON(PV::fromUInt64(1)).hasValue());  // neither data nor text
}

TEST(PropertyValueJSON, RefusesWhatIsNotExactlyOneValidDocument) {
    const std::string cases[] = {
        "", "   ", "{\"A\":1", "[1,]", "1 2", "{} x", std::string("1\0", 2), std::string("[1]\0garbage", 11),
        std::string("\"a\0b\"", 5), "\"\xC3\"", "\"\xED\xA0\x80\"", "\"\xFF\"", "{\"\xC0\x80\":1}", "\"\\uDC00\"",
        "\"\\uD800x\"", "NaN", "Infinity", "01", "'a'", nested(PV::kMaxJSONDepth + 1), nested(10000),
        std::string(100000, '['),
    };
    for (const auto& text : cases) EXPECT_FALSE(PV::fromJSON(text).hasValue()) << text.substr(0, 40);
}

TEST(PropertyValueJSON, NestingIsBoundedOnBothSides) {
    auto deepest = PV::fromJSON(nested(PV::kMaxJSONDepth, "1"));
    ASSERT_TRUE(deepest.isArray());
    EXPECT_EQ(jsonText(deepest), nested(PV::kMaxJSONDepth, "1"));
    EXPECT_FALSE(PV::array({deepest}).toJSON().hasValue());

    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    EXPECT_FALSE(writeJSON(writer, deepest, 1));
}

TEST(PropertyValueJSON, RefusesToSerialiseWhatJSONCannotHold) {
    const std::pair<const char*, PV> cases[] = {
        {"no value", PV()}, {"data inside", PV::dictionary({{"A", PV::data(std::vector<uint8_t>{})}})},
        {"NaN", PV::fromDouble(std::nan(""))},
        {"inf", PV::array({PV::fromDouble(std::numeric_limits<double>::infinity())})},
        {"float inf", PV::fromFloat(-std::numeric_limits<float>::infinity())}, {"invalid UTF-8", PV::string("\xC3")},
        {"invalid UTF-8 key", PV::dictionary({{"\xFF", PV::null()}})},
    };
    for (const auto& [name, value] : cases) {
        std::string out = "kept";
        EXPECT_FALSE(value.toJSON().hasValue() || value.toJSON(out)) << name;
        EXPECT_EQ(out, "kept") << name;
    }
}

TEST(PropertyValueJSON, HugeObjectsAreSortedWithTheLastDuplicateWinning) {
    constexpr int kKeys = 100000;
    std::string text = "{";
    for (int i = kKeys - 1; i >= 0; --i) text += "\"k" + std::to_string(i) + "\":" + std::to_string(i) + ",";
    text += "\"k7\":\"last\"}";  // reverse order with a late duplicate: the parser must sort
    const auto parsed = PV::fromJSON(text);
    EXPECT_EQ(parsed.count(), static_cast<size_t>(kKeys));
    EXPECT_EQ(parsed.get("k7").stringView(), "last");
    EXPECT_EQ(parsed.get("k99999").toUInt64(), 99999u);
}

}  // namespace
}  // namespace ZeltoTouch

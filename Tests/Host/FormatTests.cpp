#include "Host/Format.h"

#include <cmath>
#include <cstdio>
#include <limits>
#include <vector>

#include <gtest/gtest.h>

namespace ZeltoTouch {
namespace {

struct FormatCase {
    const char* format;
    std::vector<FormatArg> args;
    std::string expected;
};

void expectFormats(const std::vector<FormatCase>& cases) {
    for (const auto& c : cases) EXPECT_EQ(formatv(c.format, c.args), c.expected) << c.format;
}

// Correctly typed arguments must print exactly what the C library prints.
template <typename... Args>
void expectMatchesC(const char* format, Args... args) {
    char buffer[512];
    std::snprintf(buffer, sizeof buffer, format, args...);
    EXPECT_EQ(ZeltoTouch::format(format, args...), buffer) << format;
}

TEST(Format, MatchesCForCorrectlyTypedArguments) {
    constexpr double kInf = std::numeric_limits<double>::infinity();
    expectMatchesC("%*jd|%-4d|", 5, intmax_t{-42}, 7);
    expectMatchesC("%.2f %e %g %G", 1.005, 12345.678, 0.0001, 1e100);
    expectMatchesC("%+08.3f %a", -2.5, 1.0);
    expectMatchesC("%#o %#x %X %i %u %hhd %hu", 8u, 255u, 255u, INT32_MIN, UINT32_MAX, -1, 65535);
    expectMatchesC("%*d|%.*f|%.*d|%.0d|%5.3d", -4, 1, 2, 1.23456, -1, 5, 0, 7);
    expectMatchesC("%f %F", std::nan(""), -kInf);
    expectFormats({
        {"%.3s|%5s|%-5s|", {"abcdef", "ab", "ab"}, "abc|   ab|ab   |"}, {"%*s|%-*s|", {3, "x", 3, "y"}, "  x|y  |"},
        {"100%% %d%%", {5}, "100% 5%"},
    });
}

TEST(Format, PrintsDescriptionsForAtSign) {
    auto dictionary = PropertyValue::dictionary({{"A", PropertyValue::fromUInt64(1)}});
    auto event = HIDEvent::createAccelerometerEvent(5, 0.5, -1, 0, 0);
    ASSERT_TRUE(event);
    expectFormats({
        {"<%@>", {dictionary}, "<{\"A\": 1}>"}, {"%@", {PropertyValue()}, "(no value)"},
        {"%@", {*event}, event->description()}, {"%@%*s|", {PropertyValue::string("pad"), 4, ""}, "pad    |"},
        {"%8@|%-6@|", {PropertyValue::fromInt32(-5), PropertyValue::null()}, "      -5|null  |"},
        {"%@ %@ %@", {"plain", 12u, 0.5}, "plain 12 0.5"}, {"%s", {dictionary}, "{\"A\": 1}"},
    });
}

TEST(Format, MismatchedArgumentsAreConvertedNotMisread) {
    constexpr uint64_t kU64Max = std::numeric_limits<uint64_t>::max();
    expectFormats({
        {"%d", {uint32_t{4294967295u}}, "-1"},    {"%d", {uint64_t{1} << 32}, "0"},
        {"%u", {-1}, "4294967295"},               {"%lu", {-1}, "18446744073709551615"},
        {"%hhu", {300}, "44"},                    {"%hhd", {255u}, "-1"},
        {"%hx", {0x12345}, "2345"},               {"%jd", {kU64Max}, "-1"},
        {"%d", {2.9}, "2"},                       {"%d", {-2.9}, "-2"},
        {"%d", {std::nan("")}, "0"},              {"%jd", {1e300}, "9223372036854775807"},
        {"%ju", {-1.0}, "18446744073709551615"},  {"%ju", {1e300}, "18446744073709551615"},
        {"%f", {3}, "3.000000"},                  {"%.1f", {kU64Max}, "18446744073709551616.0"},
        {"%g", {PropertyValue::fromFloat(0.5f)}, "0.5"}, {"%d", {PropertyValue::fromBool(true)}, "1"},
        {"%x", {PropertyValue::fromUInt64(255)}, "ff"},
        {"%d", {"text"}, "text"},                 {"%5d|", {PropertyValue::null()}, " null|"},
        {"%s|%s|%s", {-7, uint64_t{7}, 0.25}, "-7|7|0.25"},
        {"%c%c", {65.9, 0x142}, "AB"},            {"%c", {"xyz"}, "xyz"}, {"%p %p", {0, 0x10}, "(nil) 0x10"},
    });
}

TEST(Format, MissingSurplusAndUnsafeConversions) {
    expectFormats({
        {"%d and %s", {1}, "1 and (missing)"}, {"%*d", {5}, "(missing)"}, {"%*d", {}, "(missing)"},
        {"%d", {1, 2, 3}, "1"},                {"a%nb", {}, "ab"},        {"%n%d", {4}, "4"},
        {"%y %", {1}, "%y %"},                 {"%l", {}, "%l"},          {"%5", {}, "%5"},
    });
}

TEST(Format, LongOutputIsNeverTruncated) {
    std::string longText(100000, 'x');
    EXPECT_EQ(format("[%s]", longText), "[" + longText + "]");
    EXPECT_EQ(format("%.300f", 1.0).size(), 302u);
    EXPECT_EQ(format("%2000d", 1).size(), 2000u);
    // A runaway width is capped instead of allocating gigabytes.
    EXPECT_EQ(format("%*d", 2000000000, 1).size(), size_t{1} << 20);
    std::string out = "prefix ";
    appendFormat(out, "%d-%s", 1, std::string("two"));
    EXPECT_EQ(out, "prefix 1-two");
    EXPECT_EQ(formatString("%02d:%02d", 3, 4).stringView(), "03:04");
}

}  // namespace
}  // namespace ZeltoTouch

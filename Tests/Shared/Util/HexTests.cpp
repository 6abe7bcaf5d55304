#include "Shared/Util/Hex.h"

#include <stdexcept>
#include <string>
#include <vector>

#include <gtest/gtest.h>

namespace ZeltoTouch::Util {
namespace {

using Bytes = std::vector<uint8_t>;

std::string hexText(const Bytes& bytes) { return std::string(hexStringFromBytes(bytes).stringView()); }
Bytes readHex(std::string_view text) { return bytesFromHexString(PropertyValue::string(text)); }

TEST(HexWriting, TwoLowercaseDigitsAndASpacePerByte) {
    EXPECT_EQ(hexText({0x00, 0x10, 0x9f, 0xff}), "00 10 9f ff ");
    EXPECT_TRUE(hexStringFromBytes({}).isString());
    std::string text = "x";
    appendHexText(text, Bytes{0xab});
    EXPECT_EQ(text, "xab ");
}

TEST(HexReading, ReadsTheBytesBeforeTheFirstFailedExtraction) {
    const std::pair<std::string, Bytes> cases[] = {
        {"0A\tFF\n", {0x0a, 0xff}}, {"   \n\t", {}}, {"1g", {0x01}}, {"0a zz 0b", {0x0a}}, {"0X1F", {0x1f}},
        {"0xg", {}},
        {"0a0b0c", {}},     // beyond 16 bits: the extraction fails
        {"-ffff", {0x01}},  // negation wraps modulo 2^16
        {"0x0x1", {0x00}}, {"\v1\f2\r3", {1, 2, 3}}, {"- 1", {}}, {"00000000000000ff", {0xff}}, {"01 02 ,03", {1, 2}},
    };
    for (const auto& [text, bytes] : cases) EXPECT_EQ(readHex(text), bytes) << '"' << text << '"';
}

TEST(HexReading, ValuesFrom0x100To0xFFFFThrow) {
    for (const char* text : {"100", "0a0b", "ffff", "0xffff", "-1", "01 02 100"}) {
        EXPECT_THROW(
            try { readHex(text); } catch (const std::invalid_argument& error) {
                EXPECT_STREQ(error.what(), "invalid hex string");
                throw;
            },
            std::invalid_argument)
            << text;
    }
}

TEST(HexReading, RoundTripsEveryByteValue) {
    Bytes all(256);
    for (int i = 0; i < 256; ++i) all[i] = static_cast<uint8_t>(i);
    EXPECT_EQ(readHex(hexText(all)), all);
}

}  // namespace
}  // namespace ZeltoTouch::Util

#include "Shared/Util/Hex.h"

#include <cstdint>
#include <random>
#include <sstream>
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
    EXPECT_EQ(hexText({0x0a, 0xff}), "0a ff ");
    EXPECT_EQ(hexText({}), "");
    EXPECT_EQ(hexText({0x00, 0x10, 0x9f}), "00 10 9f ");
    EXPECT_TRUE(hexStringFromBytes({}).isString());
}

TEST(HexWriting, AppendKeepsWhatWasThere) {
    std::string text = "x";
    const Bytes bytes{0xab};
    appendHexText(text, bytes);
    EXPECT_EQ(text, "xab ");
}

struct ReadCase {
    std::string text;
    Bytes expected;
};

class HexReading : public testing::TestWithParam<ReadCase> {};

TEST_P(HexReading, ReadsTheBytesBeforeTheFirstFailedExtraction) { EXPECT_EQ(readHex(GetParam().text), GetParam().expected); }

INSTANTIATE_TEST_SUITE_P(
    Texts, HexReading,
    testing::Values(ReadCase{"0a ff ", {0x0a, 0xff}}, ReadCase{"0A\tFF\n", {0x0a, 0xff}}, ReadCase{"", {}},
                    ReadCase{"   \n\t", {}}, ReadCase{"a", {0x0a}}, ReadCase{"1g", {0x01}},
                    ReadCase{"0a0b0c", {}},  // beyond 16 bits: the extraction fails
                    ReadCase{"0a zz 0b", {0x0a}}, ReadCase{"0x1f", {0x1f}}, ReadCase{"0X1F", {0x1f}},
                    ReadCase{"0x", {}}, ReadCase{"0xg", {}}, ReadCase{"0x 1", {}}, ReadCase{"+5", {0x05}},
                    ReadCase{"-0", {0x00}}, ReadCase{"-ffff", {0x01}},  // negation wraps modulo 2^16
                    ReadCase{"0x0x1", {0x00}}, ReadCase{"00x1", {0x00}}, ReadCase{"0 x1", {0x00}},
                    ReadCase{"0", {0x00}}, ReadCase{"\v1\f2\r3", {1, 2, 3}}, ReadCase{"- 1", {}},
                    ReadCase{"00000000000000ff", {0xff}}, ReadCase{"01 02 ,03", {1, 2}}));

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

// The reference: the standard formatted extraction the reading reproduces.
Bytes readWithStream(const std::string& text, bool& threw) {
    std::istringstream stream(text);
    Bytes bytes;
    threw = false;
    for (;;) {
        uint16_t value = 0;
        stream >> std::hex >> value;
        if (stream.fail()) return bytes;
        if (value >= 256) {
            threw = true;
            return bytes;
        }
        bytes.push_back(static_cast<uint8_t>(value));
    }
}

TEST(HexReading, AgreesWithStreamExtractionOnRandomText) {
    const std::string alphabet = "0123456789abcdefABCDEFxXg+- \t\n\v,";
    std::mt19937 random(1234);
    for (int round = 0; round < 20000; ++round) {
        std::string text(random() % 24, ' ');
        for (char& c : text) c = alphabet[random() % alphabet.size()];
        bool streamThrew = false;
        const Bytes expected = readWithStream(text, streamThrew);
        bool threw = false;
        Bytes actual;
        try {
            appendBytesFromHexText(text, actual);
        } catch (const std::invalid_argument&) {
            threw = true;
        }
        ASSERT_EQ(threw, streamThrew) << '"' << text << '"';
        ASSERT_EQ(actual, expected) << '"' << text << '"';
    }
}

}  // namespace
}  // namespace ZeltoTouch::Util

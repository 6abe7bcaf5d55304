#include "Shared/Util/Hex.h"

#include <array>
#include <cstring>
#include <optional>
#include <stdexcept>

namespace ZeltoTouch::Util {

namespace {

constexpr uint8_t kNotADigit = 0xFF;

constexpr std::array<uint8_t, 256> makeDigitValues() {
    std::array<uint8_t, 256> values{};
    values.fill(kNotADigit);
    for (int i = 0; i < 10; ++i) values['0' + i] = static_cast<uint8_t>(i);
    for (int i = 0; i < 6; ++i) {
        values['a' + i] = static_cast<uint8_t>(10 + i);
        values['A' + i] = static_cast<uint8_t>(10 + i);
    }
    return values;
}
constexpr std::array<uint8_t, 256> kDigitValues = makeDigitValues();

// "xx " for every byte value.
constexpr std::array<std::array<char, 3>, 256> makeHexTriples() {
    constexpr char digits[] = "0123456789abcdef";
    std::array<std::array<char, 3>, 256> triples{};
    for (int i = 0; i < 256; ++i) triples[i] = {digits[i >> 4], digits[i & 15], ' '};
    return triples;
}
constexpr std::array<std::array<char, 3>, 256> kHexTriples = makeHexTriples();

uint8_t digitValue(char c) noexcept { return kDigitValues[static_cast<unsigned char>(c)]; }

// What the classic locale counts as whitespace.
bool isStreamSpace(char c) noexcept { return c == ' ' || (c >= '\t' && c <= '\r'); }

// One extraction of an unsigned 16-bit integer in base 16, step for step as the standard
// library's num_get does it: sign, then a leading zero that may open a 0x prefix, then digits.
// A lone "0" is a number; "0x" without digits is not. A negative value wraps modulo 2^16.
// Advances `pos` past what was consumed; returns no value when the extraction fails.
std::optional<uint16_t> extractHex16(std::string_view text, size_t& pos) noexcept {
    const size_t end = text.size();
    while (pos < end && isStreamSpace(text[pos])) ++pos;
    if (pos == end) return std::nullopt;

    bool negative = false;
    if (text[pos] == '+' || text[pos] == '-') {
        negative = text[pos] == '-';
        ++pos;
    }
    bool numberSoFar = false;  // a leading zero is a number on its own
    if (pos < end && text[pos] == '0') {
        numberSoFar = true;
        ++pos;
        if (pos < end && (text[pos] == 'x' || text[pos] == 'X')) {
            numberSoFar = false;
            ++pos;
        }
    }
    uint32_t value = 0;
    bool overflow = false;
    for (uint8_t digit; pos < end && (digit = digitValue(text[pos])) != kNotADigit; ++pos) {
        numberSoFar = true;
        value = (value << 4) | digit;
        if (value > 0xFFFF) {
            overflow = true;
            value &= 0xFFFF;
        }
    }
    if (!numberSoFar || overflow) return std::nullopt;
    return static_cast<uint16_t>(negative ? 0x10000 - value : value);
}

}  // namespace

void appendHexText(std::string& out, std::span<const uint8_t> bytes) {
    const size_t start = out.size();
    out.resize(start + 3 * bytes.size());
    char* cursor = out.data() + start;
    for (uint8_t byte : bytes) {
        std::memcpy(cursor, kHexTriples[byte].data(), 3);
        cursor += 3;
    }
}

PropertyValue hexStringFromBytes(std::span<const uint8_t> bytes) {
    std::string text;
    appendHexText(text, bytes);
    return PropertyValue::string(text);
}

void appendBytesFromHexText(std::string_view text, std::vector<uint8_t>& out) {
    out.reserve(out.size() + text.size() / 3 + 1);
    size_t pos = 0;
    for (;;) {
        // The written form first: two digits that end the text or are followed by whitespace
        // are one byte, exactly as the extraction below would read them, without its steps.
        if (pos + 2 <= text.size()) {
            const uint8_t high = digitValue(text[pos]), low = digitValue(text[pos + 1]);
            const size_t next = pos + 2;
            if ((high | low) < 16 && (next == text.size() || isStreamSpace(text[next]))) {
                out.push_back(static_cast<uint8_t>(high << 4 | low));
                pos = next == text.size() ? next : next + 1;
                continue;
            }
        }
        const std::optional<uint16_t> value = extractHex16(text, pos);
        if (!value) break;
        if (*value > 0xFF) throw std::invalid_argument("invalid hex string");
        out.push_back(static_cast<uint8_t>(*value));
    }
}

std::vector<uint8_t> bytesFromHexString(const PropertyValue& string) {
    std::vector<uint8_t> bytes;
    appendBytesFromHexText(string.stringView(), bytes);
    return bytes;
}

}  // namespace ZeltoTouch::Util

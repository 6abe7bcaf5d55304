// Algs::getState and Algs::setState: the algorithm's parameters and statistics by key.
#include <array>
#include <limits>
#include <optional>
#include <string_view>

#include "Shared/Algs/Algs.h"
#include "Shared/Util/StateKey.h"

namespace ZeltoTouch {

namespace {

constexpr std::string_view kVirtualNormalizationFactorsDomain = "VirtualNormalizationFactors";

bool isStreamSpace(char c) { return c == ' ' || c == '\t' || c == '\n' || c == '\v' || c == '\f' || c == '\r'; }
bool isDigit(char c) { return c >= '0' && c <= '9'; }

// Reads an unsigned 64-bit decimal number the way a standard text stream extracts one:
// leading white space is skipped, an optional sign is taken (a minus negates modulo 2^64),
// digits are read up to the first non-digit and the rest is ignored. No digits read as 0;
// a number beyond 64 bits reads as the largest value.
uint64_t readStreamUInt64(std::string_view text) {
    size_t i = 0;
    while (i < text.size() && isStreamSpace(text[i])) ++i;
    bool negative = false;
    if (i < text.size() && (text[i] == '+' || text[i] == '-')) negative = text[i++] == '-';
    if (i == text.size() || !isDigit(text[i])) return 0;

    constexpr uint64_t kMax = std::numeric_limits<uint64_t>::max();
    uint64_t number = 0;
    bool overflow = false;
    for (; i < text.size() && isDigit(text[i]); ++i) {
        const auto digit = static_cast<uint64_t>(text[i] - '0');
        if (number > (kMax - digit) / 10) overflow = true;
        number = number * 10 + digit;
    }
    if (overflow) return kMax;
    return negative ? 0 - number : number;
}

// The key tables. A read returns the value (none when not readable); a write takes the
// value already coerced to a number (null when the key is not writable).
struct StateKey {
    std::string_view key;
    PropertyValue (*read)(const HandStats&, const EventStats&);
    void (*write)(HandStats&, EventStats&, const PropertyValue& number);
};

const std::array<StateKey, 7> kStateKeys = {{
    {"EnableHoldSuppression",  // boolean; default true
     [](const HandStats& h, const EventStats&) { return PropertyValue::fromBool(h.enableHoldSuppression); },
     [](HandStats& h, EventStats&, const PropertyValue& n) { h.enableHoldSuppression = n.toBool(); }},
    {"EnableTapSuppression",  // boolean; default true
     [](const HandStats& h, const EventStats&) { return PropertyValue::fromBool(h.enableTapSuppression); },
     [](HandStats& h, EventStats&, const PropertyValue& n) { h.enableTapSuppression = n.toBool(); }},
    {"HoldTimeoutMilliseconds",  // unsigned 32-bit; a write stores the low 32 bits; default 500
     [](const HandStats& h, const EventStats&) { return PropertyValue::fromUInt32(h.holdTimeoutMs); },
     [](HandStats& h, EventStats&, const PropertyValue& n) { h.holdTimeoutMs = static_cast<uint32_t>(n.toUInt64()); }},
    {"ActivationThreshold",  // float; default 200.0
     [](const HandStats& h, const EventStats&) { return PropertyValue::fromFloat(h.activationThreshold); },
     [](HandStats& h, EventStats&, const PropertyValue& n) { h.activationThreshold = n.toFloat(); }},
    {"EventStats",  // the event statistics dictionary; read only
     [](const HandStats&, const EventStats& s) { return s.statsDictionary(); },
     nullptr},
    {"ResetEventStats",  // write only: zeroes every counter, whatever the value
     [](const HandStats&, const EventStats&) { return PropertyValue(); },
     [](HandStats&, EventStats& s, const PropertyValue&) { s.Reset(); }},
    {"DebugInfo",  // {"EventStats": the event statistics dictionary}; read only
     [](const HandStats&, const EventStats& s) { return PropertyValue::dictionary({{"EventStats", s.statsDictionary()}}); },
     nullptr},
}};
// Also "VirtualNormalizationFactors.N": entry N (from 0) of the virtual image's factor
// table, a float. A write changes only the table, not the virtual pixels built from it.

const StateKey* findStateKey(std::string_view key) {
    for (const StateKey& entry : kStateKeys) {
        if (entry.key == key) return &entry;
    }
    return nullptr;
}

// The factor table entry a "VirtualNormalizationFactors.N" key names, if it is one.
std::optional<size_t> factorIndexOfKey(const std::string& key, size_t tableSize) {
    std::string rest = key;
    if (!Util::stripDomainFromKey(rest, kVirtualNormalizationFactorsDomain)) return std::nullopt;
    const uint64_t index = readStreamUInt64(rest);
    if (index >= tableSize) return std::nullopt;
    return static_cast<size_t>(index);
}

}  // namespace

PropertyValue Algs::getState(const std::string& key) const {
    if (const StateKey* entry = findStateKey(key)) return entry->read(_handStats, _eventStats);
    const std::vector<float>& factors = _virtualImage.normalizationFactors;
    if (const auto index = factorIndexOfKey(key, factors.size())) return PropertyValue::fromFloat(factors[*index]);
    return {};
}

void Algs::setState(const std::string& key, const PropertyValue& value) {
    const PropertyValue number = value.isNumber() ? value : PropertyValue::fromUInt64(0);
    if (const StateKey* entry = findStateKey(key)) {
        if (entry->write) entry->write(_handStats, _eventStats, number);
        return;
    }
    std::vector<float>& factors = _virtualImage.normalizationFactors;
    if (const auto index = factorIndexOfKey(key, factors.size())) factors[*index] = number.toFloat();
}

}  // namespace ZeltoTouch

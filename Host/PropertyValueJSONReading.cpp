// JSON text form of PropertyValue, reading: RapidJSON's SAX reader builds the tree directly,
// with no intermediate DOM.
//
// The reader scans strings sixteen bytes at a time. Its SIMD paths are switched on here, in the
// only file that includes the reader, so every use of it sees the same definitions (the writer's
// own SIMD path stays off: other files instantiate it too).
#if defined(__SSE2__) && !defined(RAPIDJSON_SSE2)
#define RAPIDJSON_SSE2
#endif

#include <charconv>
#include <clocale>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <locale.h>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

#include <rapidjson/reader.h>

#include "Host/PropertyValueRecord.h"
#include "Host/UTF8.h"

namespace ZeltoTouch {

using Record = PropertyValue::Record;

namespace {

// Integers keep their exact 64-bit value: non-negative ones (and -0) as unsigned, negative ones
// as signed. Everything else, and integers beyond 64 bits, reads as the nearest double; a number
// beyond the double range is refused, one below it reads as zero. `text` is NUL-terminated.
std::optional<PropertyValue> parseNumber(std::string_view text) {
    const char* end = text.data() + text.size();
    if (text.find_first_of(".eE") == std::string_view::npos) {
        if (text.front() == '-') {
            int64_t value = 0;
            if (const auto r = std::from_chars(text.data(), end, value); r.ec == std::errc() && r.ptr == end) {
                if (value == 0) return PropertyValue::fromUInt64(0);
                return value >= INT32_MIN ? PropertyValue::fromInt32(static_cast<int32_t>(value))
                                          : PropertyValue::fromInt64(value);
            }
        } else {
            uint64_t value = 0;
            if (const auto r = std::from_chars(text.data(), end, value); r.ec == std::errc() && r.ptr == end)
                return PropertyValue::fromUInt64(value);
        }
    }
    double value = 0;
    const auto r = std::from_chars(text.data(), end, value);
    if (r.ec == std::errc() && r.ptr == end) return PropertyValue::fromDouble(value);
    if (r.ec != std::errc::result_out_of_range) return std::nullopt;
    // Out of range: the C library tells overflow (infinite) from underflow (zero or subnormal).
    static const locale_t cLocale = newlocale(LC_ALL_MASK, "C", locale_t{});
    value = strtod_l(text.data(), nullptr, cLocale);
    if (!std::isfinite(value)) return std::nullopt;
    return PropertyValue::fromDouble(value);
}

// SAX handler that builds the tree bottom-up: finished values wait on one stack (keys on
// another) until their container ends, and each container takes its children in one move.
class TreeBuilder : public rapidjson::BaseReaderHandler<rapidjson::UTF8<>, TreeBuilder> {
public:
    bool Null() { return push(PropertyValue::null()); }
    bool Bool(bool b) { return push(PropertyValue::fromBool(b)); }
    // Numbers arrive as text: the reader's own conversion misreads some (a zero with a large
    // exponent) and turns numbers beyond the double range into infinities.
    bool RawNumber(const char* text, rapidjson::SizeType length, bool) {
        std::optional<PropertyValue> number = parseNumber(std::string_view(text, length));
        return number && push(std::move(*number));
    }
    // Encoding is checked here rather than by the reader: one pass over the finished string
    // is several times faster than the reader's per-character validation.
    bool String(const char* text, rapidjson::SizeType length, bool) {
        std::string_view view(text, length);
        return isValidUTF8(view) && push(Record::make<std::string>(false, view));
    }
    bool Key(const char* text, rapidjson::SizeType length, bool) {
        std::string_view view(text, length);
        if (!isValidUTF8(view)) return false;
        _keys.emplace_back(view);
        return true;
    }
    bool StartObject() { return open(); }
    bool StartArray() { return open(); }
    bool EndArray(rapidjson::SizeType count) {
        std::vector<PropertyValue> elements(std::make_move_iterator(_values.end() - count),
                                            std::make_move_iterator(_values.end()));
        _values.resize(_values.size() - count);
        return close(Record::make<std::vector<PropertyValue>>(false, std::move(elements)));
    }
    bool EndObject(rapidjson::SizeType count) {
        Record::Entries entries;
        entries.reserve(count);
        size_t firstKey = _keys.size() - count, firstValue = _values.size() - count;
        for (size_t i = 0; i < count; ++i) {
            entries.emplace_back(std::move(_keys[firstKey + i]), std::move(_values[firstValue + i]));
        }
        _keys.resize(firstKey);
        _values.resize(firstValue);
        return close(Record::make<Record::Entries>(false, Record::normalized(std::move(entries))));
    }

    PropertyValue result() { return _values.size() == 1 ? std::move(_values.front()) : PropertyValue(); }

private:
    bool push(PropertyValue value) {
        _values.push_back(std::move(value));
        return true;
    }
    bool open() { return ++_depth <= PropertyValue::kMaxJSONDepth; }
    bool close(PropertyValue container) {
        --_depth;
        return push(std::move(container));
    }

    std::vector<PropertyValue> _values;
    std::vector<std::string> _keys;
    size_t _depth = 0;
};

// The text, NUL-terminated and padded: the reader's aligned sixteen-byte loads may reach up to
// fifteen bytes past the terminating NUL, which must still be memory of ours.
std::unique_ptr<char[]> paddedCopy(std::string_view text) {
    constexpr size_t kPadding = 16;
    auto buffer = std::make_unique_for_overwrite<char[]>(text.size() + kPadding);
    if (!text.empty()) std::memcpy(buffer.get(), text.data(), text.size());
    std::memset(buffer.get() + text.size(), 0, kPadding);
    return buffer;
}

}  // namespace

PropertyValue PropertyValue::fromJSON(std::string_view text) {
    constexpr unsigned kFlags = rapidjson::kParseNumbersAsStringsFlag | rapidjson::kParseIterativeFlag;
    const std::unique_ptr<char[]> buffer = paddedCopy(text);
    rapidjson::StringStream stream(buffer.get());
    TreeBuilder builder;
    rapidjson::Reader reader;
    if (reader.Parse<kFlags>(stream, builder).IsError()) return {};
    // The stream ends at the NUL byte; one inside the text must not end the document early.
    if (stream.Tell() != text.size()) return {};
    return builder.result();
}

PropertyValue PropertyValue::fromJSON(const PropertyValue& data) {
    if (data.isString()) return fromJSON(data.stringView());
    auto bytes = data.bytes();
    if (!data.isData()) return {};
    return fromJSON(std::string_view(reinterpret_cast<const char*>(bytes.data()), bytes.size()));
}

}  // namespace ZeltoTouch

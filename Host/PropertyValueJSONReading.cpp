// JSON reading: RapidJSON's SAX reader hands its events to a JSONEventHandler, and
// JSONValueBuilder builds PropertyValue trees from them directly, with no intermediate DOM.
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

#include "Host/JSONReader.h"
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

// Hands RapidJSON's events to a JSONEventHandler, checking what every handler relies on:
// encoding (one pass over a finished string is several times faster than the reader's
// per-character validation) and depth.
class EventForwarder : public rapidjson::BaseReaderHandler<rapidjson::UTF8<>, EventForwarder> {
public:
    explicit EventForwarder(JSONEventHandler& handler) : _handler(handler) {}

    bool Null() { return _handler.null(); }
    bool Bool(bool b) { return _handler.boolean(b); }
    // Numbers arrive as text: the reader's own conversion misreads some (a zero with a large
    // exponent) and turns numbers beyond the double range into infinities.
    bool RawNumber(const char* text, rapidjson::SizeType length, bool) { return _handler.number({text, length}); }
    bool String(const char* text, rapidjson::SizeType length, bool) {
        const std::string_view view(text, length);
        return isValidUTF8(view) && _handler.string(view);
    }
    bool Key(const char* text, rapidjson::SizeType length, bool) {
        const std::string_view view(text, length);
        return isValidUTF8(view) && _handler.key(view);
    }
    bool StartObject() { return open() && _handler.startObject(); }
    bool StartArray() { return open() && _handler.startArray(); }
    bool EndObject(rapidjson::SizeType count) { return close() && _handler.endObject(count); }
    bool EndArray(rapidjson::SizeType count) { return close() && _handler.endArray(count); }

private:
    bool open() { return ++_depth <= PropertyValue::kMaxJSONDepth; }
    bool close() {
        --_depth;
        return true;
    }

    JSONEventHandler& _handler;
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

bool readJSON(std::string_view text, JSONEventHandler& handler) {
    constexpr unsigned kFlags = rapidjson::kParseNumbersAsStringsFlag | rapidjson::kParseIterativeFlag;
    const std::unique_ptr<char[]> buffer = paddedCopy(text);
    rapidjson::StringStream stream(buffer.get());
    EventForwarder forwarder(handler);
    rapidjson::Reader reader;
    if (reader.Parse<kFlags>(stream, forwarder).IsError()) return false;
    // The stream ends at the NUL byte; one inside the text must not end the document early.
    return stream.Tell() == text.size();
}

// Builds the tree bottom-up: finished values wait on one stack (keys on another) until their
// container ends, and each container takes its children in one move.
bool JSONValueBuilder::null() { return push(PropertyValue::null()); }
bool JSONValueBuilder::boolean(bool value) { return push(PropertyValue::fromBool(value)); }

bool JSONValueBuilder::number(std::string_view text) {
    std::optional<PropertyValue> number = parseNumber(text);
    return number && push(std::move(*number));
}

bool JSONValueBuilder::string(std::string_view text) { return push(Record::make<std::string>(false, text)); }

bool JSONValueBuilder::key(std::string_view text) {
    _keys.emplace_back(text);
    return true;
}

bool JSONValueBuilder::startObject() {
    ++_openContainers;
    return true;
}

bool JSONValueBuilder::startArray() {
    ++_openContainers;
    return true;
}

bool JSONValueBuilder::endArray(size_t count) {
    std::vector<PropertyValue> elements(std::make_move_iterator(_values.end() - static_cast<ptrdiff_t>(count)),
                                        std::make_move_iterator(_values.end()));
    _values.resize(_values.size() - count);
    --_openContainers;
    return push(Record::make<std::vector<PropertyValue>>(false, std::move(elements)));
}

bool JSONValueBuilder::endObject(size_t count) {
    Record::Entries entries;
    entries.reserve(count);
    const size_t firstKey = _keys.size() - count, firstValue = _values.size() - count;
    for (size_t i = 0; i < count; ++i) {
        entries.emplace_back(std::move(_keys[firstKey + i]), std::move(_values[firstValue + i]));
    }
    _keys.resize(firstKey);
    _values.resize(firstValue);
    --_openContainers;
    return push(Record::make<Record::Entries>(false, Record::normalized(std::move(entries))));
}

PropertyValue JSONValueBuilder::takeResult() {
    PropertyValue result = _values.size() == 1 && isBetweenValues() ? std::move(_values.front()) : PropertyValue();
    _values.clear();
    return result;
}

bool JSONValueBuilder::push(PropertyValue value) {
    _values.push_back(std::move(value));
    return true;
}

PropertyValue PropertyValue::fromJSON(std::string_view text) {
    JSONValueBuilder builder;
    return readJSON(text, builder) ? builder.takeResult() : PropertyValue();
}

PropertyValue PropertyValue::fromJSON(const PropertyValue& data) {
    if (data.isString()) return fromJSON(data.stringView());
    auto bytes = data.bytes();
    if (!data.isData()) return {};
    return fromJSON(std::string_view(reinterpret_cast<const char*>(bytes.data()), bytes.size()));
}

}  // namespace ZeltoTouch

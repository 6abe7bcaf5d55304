#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace ZeltoTouch {

// The dynamically typed value exchanged with the host: properties, state keys, metadata,
// statistics and the recording container all travel as PropertyValues.
//
// A PropertyValue is a shared handle: copies share one record, which lives until the last
// holder lets go. A default-constructed handle is "no value", which is distinct from the
// null value (what JSON null parses to). Dictionaries, arrays and strings come immutable
// or mutable; only mutable ones accept the mutating operations (on an immutable or
// non-matching value those operations do nothing and return false).
//
// Immutable records may be shared freely between threads; a mutable record must not be
// mutated while another thread reads it.
class PropertyValue {
public:
    enum class Kind : uint8_t { Null, Number, String, Data, Array, Dictionary };
    enum class NumberKind : uint8_t { UInt64, Int64, Int32, UInt32, Float32, Float64, Boolean };

    PropertyValue() noexcept = default;  // no value

    // Creation.
    static PropertyValue null();
    static PropertyValue fromUInt64(uint64_t value);
    static PropertyValue fromInt64(int64_t value);
    static PropertyValue fromInt32(int32_t value);
    static PropertyValue fromUInt32(uint32_t value);
    static PropertyValue fromFloat(float value);
    static PropertyValue fromDouble(double value);
    static PropertyValue fromBool(bool value);
    static PropertyValue string(std::string_view utf8);
    static PropertyValue mutableString();
    static PropertyValue data(std::span<const uint8_t> bytes);
    static PropertyValue data(std::vector<uint8_t>&& bytes);
    static PropertyValue array(std::vector<PropertyValue> elements);
    static PropertyValue mutableArray();
    // From parallel key and value lists; an entry whose value is "no value" is left out.
    static PropertyValue dictionary(const std::vector<std::string>& keys, const std::vector<PropertyValue>& values);
    static PropertyValue dictionary(std::initializer_list<std::pair<std::string_view, PropertyValue>> entries);
    static PropertyValue mutableDictionary();

    // Type tests; all false for "no value".
    bool hasValue() const noexcept { return _record != nullptr; }
    explicit operator bool() const noexcept { return hasValue(); }
    bool isNull() const noexcept;
    bool isNumber() const noexcept;
    bool isString() const noexcept;
    bool isData() const noexcept;
    bool isArray() const noexcept;
    bool isDictionary() const noexcept;
    bool isMutable() const noexcept;
    Kind kind() const noexcept;  // precondition: hasValue()

    // Numbers. Every reading is defined for every stored number (see PropertyValue.cpp for
    // the conversion rules); a value that is not a number reads as 0 / 0.0f / false.
    NumberKind numberKind() const noexcept;
    uint64_t toUInt64() const noexcept;
    float toFloat() const noexcept;
    double toDouble() const noexcept;
    bool toBool() const noexcept;

    // Strings. stringView() is empty for a value that is not a string.
    std::string_view stringView() const noexcept;
    size_t length() const noexcept;  // UTF-8 bytes
    bool appendString(std::string_view utf8);  // mutable strings only
    // Decodes data bytes as UTF-8; invalid UTF-8 or a non-data value gives no value.
    static PropertyValue stringFromData(const PropertyValue& data);

    // Data. bytes() is empty for a value that is not data.
    std::span<const uint8_t> bytes() const noexcept;

    // Arrays. Enumerating anything that is not an array yields no elements.
    size_t count() const noexcept;                  // arrays and dictionaries
    PropertyValue at(size_t index) const;           // out of range: no value
    std::span<const PropertyValue> elements() const noexcept;
    bool append(PropertyValue element);             // mutable arrays only

    // Dictionaries.
    PropertyValue get(std::string_view key) const;  // missing key: no value
    bool set(std::string_view key, PropertyValue value);  // mutable only; no value removes the key
    bool remove(std::string_view key);              // mutable only
    std::vector<std::string> keys() const;
    PropertyValue mutableCopy() const;              // shallow: mutable copy of a dictionary, array or string

    // The text that "%@" shows in formatted strings and log lines.
    std::string description() const;

    // Deep structural equality (numbers compare by value); "no value" equals only itself.
    friend bool operator==(const PropertyValue& a, const PropertyValue& b) noexcept;

    // JSON text form. Parsing takes a data value (or text) holding UTF-8 JSON and yields no
    // value on any failure: malformed JSON, invalid UTF-8, trailing garbage, nesting deeper
    // than kMaxJSONDepth. Serialising yields a data value with compact UTF-8 JSON text, or
    // no value when the tree holds something JSON cannot represent (data) or is too deep.
    static constexpr size_t kMaxJSONDepth = 512;
    static PropertyValue fromJSON(const PropertyValue& data);
    static PropertyValue fromJSON(std::string_view text);
    PropertyValue toJSON() const;
    bool toJSON(std::string& out) const;  // appends compact JSON text; false on failure

    struct Record;

private:
    explicit PropertyValue(std::shared_ptr<Record> record) noexcept : _record(std::move(record)) {}
    std::shared_ptr<Record> _record;
};

}  // namespace ZeltoTouch

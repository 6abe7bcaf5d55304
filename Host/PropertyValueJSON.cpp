// JSON text form of PropertyValue: RapidJSON's SAX reader builds the tree directly, and its
// writer serialises straight from the tree; no intermediate DOM.

#include <charconv>
#include <cmath>
#include <limits>

#include <rapidjson/memorystream.h>
#include <rapidjson/reader.h>

#include "Host/JSONWriter.h"
#include "Host/PropertyValueRecord.h"
#include "Host/UTF8.h"

namespace ZeltoTouch {

using Record = PropertyValue::Record;

namespace {

// SAX handler that builds the tree bottom-up: finished values wait on one stack (keys on
// another) until their container ends, and each container takes its children in one move.
class TreeBuilder : public rapidjson::BaseReaderHandler<rapidjson::UTF8<>, TreeBuilder> {
public:
    bool Null() { return push(PropertyValue::null()); }
    bool Bool(bool b) { return push(PropertyValue::fromBool(b)); }
    bool Int(int i) { return push(i < 0 ? PropertyValue::fromInt32(i) : PropertyValue::fromUInt64(static_cast<uint64_t>(i))); }
    bool Uint(unsigned u) { return push(PropertyValue::fromUInt64(u)); }
    bool Int64(int64_t i) { return push(i < 0 ? PropertyValue::fromInt64(i) : PropertyValue::fromUInt64(static_cast<uint64_t>(i))); }
    bool Uint64(uint64_t u) { return push(PropertyValue::fromUInt64(u)); }
    bool Double(double d) { return push(PropertyValue::fromDouble(d)); }
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

// Shortest text that reads back as the same float, marked as floating so it does not come
// back as an integer.
bool writeFloat(rapidjson::Writer<rapidjson::StringBuffer>& writer, float value) {
    if (!std::isfinite(value)) return false;
    char buffer[32];
    auto result = std::to_chars(buffer, buffer + sizeof buffer - 2, value);
    std::string_view text(buffer, static_cast<size_t>(result.ptr - buffer));
    if (text.find_first_of(".e") == std::string_view::npos) {
        *result.ptr++ = '.';
        *result.ptr++ = '0';
    }
    return writer.RawValue(buffer, static_cast<size_t>(result.ptr - buffer), rapidjson::kNumberType);
}

bool writeNumber(rapidjson::Writer<rapidjson::StringBuffer>& writer, const Record::Number& n) {
    using K = PropertyValue::NumberKind;
    switch (n.kind) {
        case K::Boolean: return writer.Bool(n.unsignedValue != 0);
        case K::UInt64:
        case K::UInt32: return writer.Uint64(n.unsignedValue);
        case K::Int64:
        case K::Int32: return writer.Int64(n.signedValue);
        case K::Float32: return writeFloat(writer, static_cast<float>(n.floatingValue));
        case K::Float64: return std::isfinite(n.floatingValue) && writer.Double(n.floatingValue);
    }
    return false;
}

bool fitsSizeType(std::string_view text) { return text.size() <= std::numeric_limits<rapidjson::SizeType>::max(); }

bool writeText(rapidjson::Writer<rapidjson::StringBuffer>& writer, std::string_view text, bool isKey) {
    if (!fitsSizeType(text) || !isValidUTF8(text)) return false;
    auto length = static_cast<rapidjson::SizeType>(text.size());
    return isKey ? writer.Key(text.data(), length) : writer.String(text.data(), length);
}

bool writeValue(rapidjson::Writer<rapidjson::StringBuffer>& writer, const PropertyValue& value, size_t depth) {
    const Record* record = Record::of(value);
    if (!record) return false;
    struct Visitor {
        rapidjson::Writer<rapidjson::StringBuffer>& writer;
        size_t depth;
        bool operator()(const Record::Null&) const { return writer.Null(); }
        bool operator()(const Record::Number& n) const { return writeNumber(writer, n); }
        bool operator()(const std::string& s) const { return writeText(writer, s, false); }
        bool operator()(const std::vector<uint8_t>&) const { return false; }
        bool operator()(const std::vector<PropertyValue>& elements) const {
            if (depth >= PropertyValue::kMaxJSONDepth || !writer.StartArray()) return false;
            for (const auto& element : elements) {
                if (!writeValue(writer, element, depth + 1)) return false;
            }
            return writer.EndArray(static_cast<rapidjson::SizeType>(elements.size()));
        }
        bool operator()(const Record::Entries& entries) const {
            if (depth >= PropertyValue::kMaxJSONDepth || !writer.StartObject()) return false;
            for (const auto& [key, entry] : entries) {
                if (!writeText(writer, key, true) || !writeValue(writer, entry, depth + 1)) return false;
            }
            return writer.EndObject(static_cast<rapidjson::SizeType>(entries.size()));
        }
    };
    return std::visit(Visitor{writer, depth}, record->content);
}

}  // namespace

bool writeJSON(rapidjson::Writer<rapidjson::StringBuffer>& writer, const PropertyValue& value, size_t enclosingDepth) {
    return writeValue(writer, value, enclosingDepth);
}

PropertyValue PropertyValue::fromJSON(std::string_view text) {
    constexpr unsigned kFlags = rapidjson::kParseFullPrecisionFlag | rapidjson::kParseIterativeFlag;
    rapidjson::MemoryStream stream(text.data(), text.size());
    TreeBuilder builder;
    rapidjson::Reader reader;
    if (reader.Parse<kFlags>(stream, builder).IsError()) return {};
    // The stream ends at a NUL byte; one inside the text must not end the document early.
    if (stream.Tell() != text.size()) return {};
    return builder.result();
}

PropertyValue PropertyValue::fromJSON(const PropertyValue& data) {
    if (data.isString()) return fromJSON(data.stringView());
    auto bytes = data.bytes();
    if (!data.isData()) return {};
    return fromJSON(std::string_view(reinterpret_cast<const char*>(bytes.data()), bytes.size()));
}

bool PropertyValue::toJSON(std::string& out) const {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    if (!writeValue(writer, *this, 0)) return false;
    out.append(buffer.GetString(), buffer.GetSize());
    return true;
}

PropertyValue PropertyValue::toJSON() const {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    if (!writeValue(writer, *this, 0)) return {};
    const auto* begin = reinterpret_cast<const uint8_t*>(buffer.GetString());
    return data(std::span<const uint8_t>(begin, buffer.GetSize()));
}

}  // namespace ZeltoTouch

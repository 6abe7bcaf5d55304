// JSON text form of PropertyValue, writing: RapidJSON's writer serialises straight from the
// tree, with no intermediate DOM. Reading is in PropertyValueJSONReading.cpp.

#include <charconv>
#include <cmath>
#include <limits>

#include "Host/JSONWriter.h"
#include "Host/PropertyValueRecord.h"
#include "Host/UTF8.h"

namespace ZeltoTouch {

using Record = PropertyValue::Record;

namespace {

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

// Number readings are defined for every stored number:
//  - toUInt64: unsigned kinds as stored; signed integers wrap as two's complement (-1 gives
//    2^64-1); booleans give 0 or 1; floating values: NaN gives 0, values >= 2^64 give
//    UINT64_MAX, [0, 2^64) truncates toward zero, negative values truncate toward zero as int64
//    (saturating at INT64_MIN) and then wrap like a signed integer (-1.5 gives 2^64-1).
//  - toFloat / toDouble: integers convert to the nearest representable value; doubles beyond
//    the float range become +-inf; NaN stays NaN.
//  - toBool: nonzero is true; NaN is true, as in C.
// Equality compares numbers by value across kinds (the integer 1 equals the double 1.0, and
// -0.0 equals 0), with two exceptions: NaN equals NaN, so that every value equals itself, and
// booleans equal only booleans, so that true and 1 stay apart as they do in JSON.

#include "Host/PropertyValue.h"

#include <algorithm>
#include <charconv>
#include <stdexcept>
#include <unordered_set>

#include "Host/NumberConversion.h"
#include "Host/PropertyValueRecord.h"
#include "Host/UTF8.h"

namespace ZeltoTouch {

using Record = PropertyValue::Record;
using Number = Record::Number;
using Entries = Record::Entries;
using Array = std::vector<PropertyValue>;
using Bytes = std::vector<uint8_t>;

namespace {

PropertyValue makeNumber(PropertyValue::NumberKind kind, uint64_t u, int64_t i, double d) {
    return Record::make<Number>(false, Number{kind, u, i, d});
}

template <typename T>
const T* contentAs(const PropertyValue& value) noexcept {
    const Record* record = Record::of(value);
    return record ? std::get_if<T>(&record->content) : nullptr;
}

// Mutating operations reach the content only of a mutable record of the right kind.
template <typename T>
T* mutableContentAs(PropertyValue& value) noexcept {
    Record* record = Record::of(value);
    return record && record->isMutable ? std::get_if<T>(&record->content) : nullptr;
}

bool keyLess(const Record::Entry& entry, std::string_view key) noexcept { return entry.first < key; }

Entries::const_iterator findEntry(const Entries& entries, std::string_view key) noexcept {
    auto it = std::lower_bound(entries.begin(), entries.end(), key, keyLess);
    return it != entries.end() && it->first == key ? it : entries.end();
}

bool isInteger(const Number& n) noexcept {
    using K = PropertyValue::NumberKind;
    return n.kind == K::UInt64 || n.kind == K::UInt32 || n.kind == K::Int64 || n.kind == K::Int32;
}
bool isSigned(const Number& n) noexcept {
    return n.kind == PropertyValue::NumberKind::Int64 || n.kind == PropertyValue::NumberKind::Int32;
}
bool isFloating(const Number& n) noexcept {
    return n.kind == PropertyValue::NumberKind::Float32 || n.kind == PropertyValue::NumberKind::Float64;
}

double asDouble(const Number& n) noexcept {
    if (isFloating(n)) return n.floatingValue;
    return isSigned(n) ? static_cast<double>(n.signedValue) : static_cast<double>(n.unsignedValue);
}

// Exact comparison of an integer with a double: equal only when the double is that integer.
bool integerEqualsDouble(const Number& integer, double d) noexcept {
    if (std::isnan(d) || d != std::trunc(d)) return false;
    if (isSigned(integer)) {
        return d >= -NumberConversion::kTwoPow63 && d < NumberConversion::kTwoPow63 &&
               static_cast<int64_t>(d) == integer.signedValue;
    }
    return d >= 0 && d < NumberConversion::kTwoPow64 && static_cast<uint64_t>(d) == integer.unsignedValue;
}

bool numbersEqual(const Number& a, const Number& b) noexcept {
    using K = PropertyValue::NumberKind;
    if ((a.kind == K::Boolean) != (b.kind == K::Boolean)) return false;
    if (a.kind == K::Boolean) return a.unsignedValue == b.unsignedValue;
    if (isInteger(a) && isInteger(b)) {
        if (isSigned(a) == isSigned(b)) {
            return isSigned(a) ? a.signedValue == b.signedValue : a.unsignedValue == b.unsignedValue;
        }
        const Number& s = isSigned(a) ? a : b;
        const Number& u = isSigned(a) ? b : a;
        return s.signedValue >= 0 && static_cast<uint64_t>(s.signedValue) == u.unsignedValue;
    }
    if (isInteger(a)) return integerEqualsDouble(a, b.floatingValue);
    if (isInteger(b)) return integerEqualsDouble(b, a.floatingValue);
    if (std::isnan(a.floatingValue) && std::isnan(b.floatingValue)) return true;
    return a.floatingValue == b.floatingValue;
}

// Text of a number as "%@" and descriptions show it: shortest round-trip form for floating kinds.
void appendNumber(std::string& out, const Number& n) {
    using K = PropertyValue::NumberKind;
    char buffer[64];
    std::to_chars_result result{};
    switch (n.kind) {
        case K::Boolean: out += n.unsignedValue ? "true" : "false"; return;
        case K::Int64:
        case K::Int32: result = std::to_chars(buffer, buffer + sizeof buffer, n.signedValue); break;
        case K::UInt64:
        case K::UInt32: result = std::to_chars(buffer, buffer + sizeof buffer, n.unsignedValue); break;
        case K::Float32:
            result = std::to_chars(buffer, buffer + sizeof buffer, static_cast<float>(n.floatingValue));
            break;
        case K::Float64: result = std::to_chars(buffer, buffer + sizeof buffer, n.floatingValue); break;
    }
    out.append(buffer, result.ptr);
}

constexpr char kHex[] = "0123456789abcdef";

void appendQuoted(std::string& out, std::string_view text) {
    out += '"';
    // Runs of characters that need no escape go in whole.
    for (size_t start = 0; start < text.size();) {
        const auto special = std::find_if(text.begin() + start, text.end(), [](char c) {
            return c == '"' || c == '\\' || static_cast<unsigned char>(c) < 0x20;
        });
        const size_t end = static_cast<size_t>(special - text.begin());
        out.append(text, start, end - start);
        if (end == text.size()) break;
        switch (const char c = text[end]) {
            case '"': out += "\\\""; break;
            case '\\': out += "\\\\"; break;
            case '\n': out += "\\n"; break;
            case '\r': out += "\\r"; break;
            case '\t': out += "\\t"; break;
            default:
                out += "\\u00";
                out += kHex[(c >> 4) & 0xF];
                out += kHex[c & 0xF];
        }
        start = end + 1;
    }
    out += '"';
}

void appendHexBytes(std::string& out, std::span<const uint8_t> bytes) {
    out += '<';
    for (uint8_t byte : bytes) {
        out += kHex[byte >> 4];
        out += kHex[byte & 0xF];
    }
    out += '>';
}

// JSON-like rendering; strings are quoted inside containers only. Nesting beyond the JSON
// depth limit is elided rather than recursed into.
void appendDescription(std::string& out, const PropertyValue& value, bool quoteStrings, size_t depth) {
    const Record* record = Record::of(value);
    if (!record) {
        out += "(no value)";
        return;
    }
    struct Visitor {
        std::string& out;
        bool quoteStrings;
        size_t depth;
        void operator()(const Record::Null&) const { out += "null"; }
        void operator()(const Number& n) const { appendNumber(out, n); }
        void operator()(const std::string& s) const {
            if (quoteStrings) appendQuoted(out, s);
            else out += s;
        }
        void operator()(const Bytes& bytes) const { appendHexBytes(out, bytes); }
        void operator()(const Array& elements) const {
            if (depth >= PropertyValue::kMaxJSONDepth) {
                out += "[...]";
                return;
            }
            out += '[';
            for (size_t i = 0; i < elements.size(); ++i) {
                if (i) out += ", ";
                appendDescription(out, elements[i], true, depth + 1);
            }
            out += ']';
        }
        void operator()(const Entries& entries) const {
            if (depth >= PropertyValue::kMaxJSONDepth) {
                out += "{...}";
                return;
            }
            out += '{';
            for (size_t i = 0; i < entries.size(); ++i) {
                if (i) out += ", ";
                appendQuoted(out, entries[i].first);
                out += ": ";
                appendDescription(out, entries[i].second, true, depth + 1);
            }
            out += '}';
        }
    };
    std::visit(Visitor{out, quoteStrings, depth}, record->content);
}

// True when `container` is `target` or holds it anywhere below; used to refuse insertions
// that would make a record contain itself (a cycle would never be freed and would make every
// traversal endless). Iterative, and each record is visited once, so shared subtrees and deep
// nesting cost neither time nor stack.
bool reaches(const Record* container, const Record* target) {
    if (container == target) return true;
    std::vector<const Record*> pending{container};
    std::unordered_set<const Record*> visited{container};
    auto visit = [&](const PropertyValue& child) {
        const Record* record = Record::of(child);
        if (!record) return false;
        if (record == target) return true;
        bool isContainer = std::holds_alternative<Array>(record->content) ||
                           std::holds_alternative<Entries>(record->content);
        if (isContainer && visited.insert(record).second) pending.push_back(record);
        return false;
    };
    while (!pending.empty()) {
        const Record* record = pending.back();
        pending.pop_back();
        if (auto* elements = std::get_if<Array>(&record->content)) {
            for (const auto& element : *elements) {
                if (visit(element)) return true;
            }
        } else if (auto* entries = std::get_if<Entries>(&record->content)) {
            for (const auto& entry : *entries) {
                if (visit(entry.second)) return true;
            }
        }
    }
    return false;
}

bool wouldFormCycle(const PropertyValue& container, const PropertyValue& inserted) {
    const Record* record = Record::of(inserted);
    if (!record) return false;
    bool isContainer = std::holds_alternative<Array>(record->content) || std::holds_alternative<Entries>(record->content);
    return isContainer && reaches(record, Record::of(container));
}

}  // namespace

Entries Record::normalized(Entries entries) {
    auto byKey = [](const Entry& a, const Entry& b) { return std::string_view(a.first) < std::string_view(b.first); };
    if (!std::is_sorted(entries.begin(), entries.end(), byKey)) {
        // Objects are small: a stable insertion sort needs no buffer, where stable_sort takes one.
        constexpr size_t kInsertionSortLimit = 16;
        if (entries.size() <= kInsertionSortLimit) {
            for (auto it = entries.begin() + 1; it < entries.end(); ++it) {
                if (!byKey(*it, *(it - 1))) continue;
                Entry moving = std::move(*it);
                auto hole = it;
                for (; hole != entries.begin() && byKey(moving, *(hole - 1)); --hole) *hole = std::move(*(hole - 1));
                *hole = std::move(moving);
            }
        } else {
            std::stable_sort(entries.begin(), entries.end(), byKey);
        }
    }
    // Keep the last of each run of equal keys, and only entries that hold a value.
    size_t kept = 0;
    for (size_t i = 0; i < entries.size(); ++i) {
        bool lastOfRun = i + 1 == entries.size() || entries[i + 1].first != entries[i].first;
        if (!lastOfRun || !entries[i].second.hasValue()) continue;
        if (kept != i) entries[kept] = std::move(entries[i]);
        ++kept;
    }
    entries.resize(kept);
    return entries;
}

// MARK: Creation

PropertyValue PropertyValue::null() {
    static const PropertyValue shared = Record::make<Record::Null>(false);
    return shared;
}
PropertyValue PropertyValue::fromUInt64(uint64_t value) { return makeNumber(NumberKind::UInt64, value, 0, 0); }
PropertyValue PropertyValue::fromInt64(int64_t value) { return makeNumber(NumberKind::Int64, 0, value, 0); }
PropertyValue PropertyValue::fromInt32(int32_t value) { return makeNumber(NumberKind::Int32, 0, value, 0); }
PropertyValue PropertyValue::fromUInt32(uint32_t value) { return makeNumber(NumberKind::UInt32, value, 0, 0); }
PropertyValue PropertyValue::fromFloat(float value) { return makeNumber(NumberKind::Float32, 0, 0, value); }
PropertyValue PropertyValue::fromDouble(double value) { return makeNumber(NumberKind::Float64, 0, 0, value); }
PropertyValue PropertyValue::fromBool(bool value) {
    static const PropertyValue shared[2] = {makeNumber(NumberKind::Boolean, 0, 0, 0),
                                            makeNumber(NumberKind::Boolean, 1, 0, 0)};
    return shared[value ? 1 : 0];
}
PropertyValue PropertyValue::string(std::string_view utf8) { return Record::make<std::string>(false, utf8); }
PropertyValue PropertyValue::mutableString() { return Record::make<std::string>(true); }
PropertyValue PropertyValue::data(std::span<const uint8_t> bytes) {
    return Record::make<Bytes>(false, bytes.begin(), bytes.end());
}
PropertyValue PropertyValue::data(std::vector<uint8_t>&& bytes) { return Record::make<Bytes>(false, std::move(bytes)); }
PropertyValue PropertyValue::array(std::vector<PropertyValue> elements) {
    return Record::make<Array>(false, std::move(elements));
}
PropertyValue PropertyValue::mutableArray() { return Record::make<Array>(true); }

PropertyValue PropertyValue::dictionary(const std::vector<std::string>& keys, const std::vector<PropertyValue>& values) {
    if (keys.size() != values.size()) {
        throw std::invalid_argument("PropertyValue::dictionary: key and value lists differ in length");
    }
    Entries entries;
    entries.reserve(keys.size());
    for (size_t i = 0; i < keys.size(); ++i) entries.emplace_back(keys[i], values[i]);
    return Record::make<Entries>(false, Record::normalized(std::move(entries)));
}

PropertyValue PropertyValue::dictionary(std::initializer_list<std::pair<std::string_view, PropertyValue>> list) {
    Entries entries;
    entries.reserve(list.size());
    for (const auto& [key, value] : list) entries.emplace_back(std::string(key), value);
    return Record::make<Entries>(false, Record::normalized(std::move(entries)));
}

PropertyValue PropertyValue::mutableDictionary() { return Record::make<Entries>(true); }

// MARK: Type tests

bool PropertyValue::isNull() const noexcept { return contentAs<Record::Null>(*this) != nullptr; }
bool PropertyValue::isNumber() const noexcept { return contentAs<Number>(*this) != nullptr; }
bool PropertyValue::isString() const noexcept { return contentAs<std::string>(*this) != nullptr; }
bool PropertyValue::isData() const noexcept { return contentAs<Bytes>(*this) != nullptr; }
bool PropertyValue::isArray() const noexcept { return contentAs<Array>(*this) != nullptr; }
bool PropertyValue::isDictionary() const noexcept { return contentAs<Entries>(*this) != nullptr; }
bool PropertyValue::isMutable() const noexcept { return _record && _record->isMutable; }
PropertyValue::Kind PropertyValue::kind() const noexcept {
    return _record ? static_cast<Kind>(_record->content.index()) : Kind::Null;
}

// MARK: Numbers

PropertyValue::NumberKind PropertyValue::numberKind() const noexcept {
    const Number* n = contentAs<Number>(*this);
    return n ? n->kind : NumberKind::UInt64;
}

uint64_t PropertyValue::toUInt64() const noexcept {
    const Number* n = contentAs<Number>(*this);
    if (!n) return 0;
    if (isFloating(*n)) return NumberConversion::wrappingUInt64(n->floatingValue);
    return isSigned(*n) ? static_cast<uint64_t>(n->signedValue) : n->unsignedValue;
}

float PropertyValue::toFloat() const noexcept {
    const Number* n = contentAs<Number>(*this);
    if (!n) return 0.0f;
    if (isFloating(*n)) return NumberConversion::roundedFloat(n->floatingValue);
    return isSigned(*n) ? static_cast<float>(n->signedValue) : static_cast<float>(n->unsignedValue);
}

double PropertyValue::toDouble() const noexcept {
    const Number* n = contentAs<Number>(*this);
    return n ? asDouble(*n) : 0.0;
}

bool PropertyValue::toBool() const noexcept {
    const Number* n = contentAs<Number>(*this);
    if (!n) return false;
    if (isFloating(*n)) return n->floatingValue != 0;  // NaN compares unequal: true
    return isSigned(*n) ? n->signedValue != 0 : n->unsignedValue != 0;
}

// MARK: Strings and data

std::string_view PropertyValue::stringView() const noexcept {
    const std::string* s = contentAs<std::string>(*this);
    return s ? std::string_view(*s) : std::string_view();
}

size_t PropertyValue::length() const noexcept { return stringView().size(); }

bool PropertyValue::appendString(std::string_view utf8) {
    std::string* s = mutableContentAs<std::string>(*this);
    if (!s) return false;
    s->append(utf8);
    return true;
}

PropertyValue PropertyValue::stringFromData(const PropertyValue& data) {
    const Bytes* bytes = contentAs<Bytes>(data);
    if (!bytes) return {};
    std::string_view text(reinterpret_cast<const char*>(bytes->data()), bytes->size());
    return isValidUTF8(text) ? string(text) : PropertyValue();
}

std::span<const uint8_t> PropertyValue::bytes() const noexcept {
    const Bytes* b = contentAs<Bytes>(*this);
    return b ? std::span<const uint8_t>(*b) : std::span<const uint8_t>();
}

// MARK: Arrays and dictionaries

size_t PropertyValue::count() const noexcept {
    if (const Array* elements = contentAs<Array>(*this)) return elements->size();
    if (const Entries* entries = contentAs<Entries>(*this)) return entries->size();
    return 0;
}

PropertyValue PropertyValue::at(size_t index) const {
    const Array* elements = contentAs<Array>(*this);
    return elements && index < elements->size() ? (*elements)[index] : PropertyValue();
}

std::span<const PropertyValue> PropertyValue::elements() const noexcept {
    const Array* elements = contentAs<Array>(*this);
    return elements ? std::span<const PropertyValue>(*elements) : std::span<const PropertyValue>();
}

bool PropertyValue::append(PropertyValue element) {
    Array* elements = mutableContentAs<Array>(*this);
    if (!elements || !element.hasValue() || wouldFormCycle(*this, element)) return false;
    elements->push_back(std::move(element));
    return true;
}

PropertyValue PropertyValue::get(std::string_view key) const {
    const Entries* entries = contentAs<Entries>(*this);
    if (!entries) return {};
    auto it = findEntry(*entries, key);
    return it != entries->end() ? it->second : PropertyValue();
}

bool PropertyValue::set(std::string_view key, PropertyValue value) {
    if (!value.hasValue()) return remove(key);
    Entries* entries = mutableContentAs<Entries>(*this);
    if (!entries || wouldFormCycle(*this, value)) return false;
    auto it = std::lower_bound(entries->begin(), entries->end(), key, keyLess);
    if (it != entries->end() && it->first == key) it->second = std::move(value);
    else entries->emplace(it, std::string(key), std::move(value));
    return true;
}

bool PropertyValue::remove(std::string_view key) {
    Entries* entries = mutableContentAs<Entries>(*this);
    if (!entries) return false;
    auto it = findEntry(*entries, key);
    if (it != entries->end()) entries->erase(it);
    return true;
}

std::vector<std::string> PropertyValue::keys() const {
    std::vector<std::string> result;
    if (const Entries* entries = contentAs<Entries>(*this)) {
        result.reserve(entries->size());
        for (const auto& entry : *entries) result.push_back(entry.first);
    }
    return result;
}

PropertyValue PropertyValue::mutableCopy() const {
    if (!_record) return {};
    const auto& content = _record->content;
    bool copyable = std::holds_alternative<std::string>(content) || std::holds_alternative<Array>(content) ||
                    std::holds_alternative<Entries>(content);
    return copyable ? Record::copy(*_record, true) : PropertyValue();
}

// MARK: Description and equality

std::string PropertyValue::description() const {
    std::string out;
    appendDescription(out, *this, false, 0);
    return out;
}

bool operator==(const PropertyValue& a, const PropertyValue& b) noexcept {
    const Record* ra = Record::of(a);
    const Record* rb = Record::of(b);
    if (ra == rb) return true;
    if (!ra || !rb || ra->content.index() != rb->content.index()) return false;
    return std::visit(
        [rb](const auto& x) {
            using T = std::decay_t<decltype(x)>;
            const T& y = std::get<T>(rb->content);
            if constexpr (std::is_same_v<T, Record::Null>) return true;
            else if constexpr (std::is_same_v<T, Number>) return numbersEqual(x, y);
            else return x == y;
        },
        ra->content);
}

}  // namespace ZeltoTouch

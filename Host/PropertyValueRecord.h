#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "Host/PropertyValue.h"

namespace ZeltoTouch {

// The shared record behind a PropertyValue handle. Private to Host/.
struct PropertyValue::Record {
    struct Number {
        NumberKind kind = NumberKind::UInt64;
        uint64_t unsignedValue = 0;  // UInt64, UInt32, Boolean
        int64_t signedValue = 0;     // Int64, Int32
        double floatingValue = 0;    // Float32, Float64 (a float is exact as a double)
    };
    struct Null {};
    using Entry = std::pair<std::string, PropertyValue>;
    // Sorted by key, keys unique: lookups are binary searches and enumeration is deterministic.
    using Entries = std::vector<Entry>;

    // Alternatives in the order of Kind, so that kind() is the variant's index.
    using Content = std::variant<Null, Number, std::string, std::vector<uint8_t>, std::vector<PropertyValue>, Entries>;

    Content content;
    bool isMutable = false;

    template <typename T, typename... Args>
    Record(std::in_place_type_t<T> type, bool mutableRecord, Args&&... args)
        : content(type, std::forward<Args>(args)...), isMutable(mutableRecord) {}
    Record(const Content& c, bool mutableRecord) : content(c), isMutable(mutableRecord) {}

    // A new record holding a T built in place from args.
    template <typename T, typename... Args>
    static PropertyValue make(bool isMutable, Args&&... args) {
        return PropertyValue(std::make_shared<Record>(std::in_place_type<T>, isMutable, std::forward<Args>(args)...));
    }
    static PropertyValue copy(const Record& record, bool isMutable) {
        return PropertyValue(std::make_shared<Record>(record.content, isMutable));
    }
    static const Record* of(const PropertyValue& value) noexcept { return value._record.get(); }
    static Record* of(PropertyValue& value) noexcept { return value._record.get(); }

    // Sorts entries by key; of equal keys the last one wins; entries without a value go.
    static Entries normalized(Entries entries);
};

}  // namespace ZeltoTouch

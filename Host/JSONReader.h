#pragma once

#include <cstddef>
#include <string_view>
#include <vector>

#include "Host/PropertyValue.h"

namespace ZeltoTouch {

// The events of a JSON text as it is read, so a reader can build exactly what it needs without
// an intermediate tree. Strings and keys arrive as valid UTF-8, numbers as their text, and
// nesting never goes deeper than PropertyValue::kMaxJSONDepth. Returning false stops the read.
class JSONEventHandler {
public:
    virtual ~JSONEventHandler() = default;

    virtual bool null() = 0;
    virtual bool boolean(bool value) = 0;
    virtual bool number(std::string_view text) = 0;
    virtual bool string(std::string_view text) = 0;
    virtual bool key(std::string_view text) = 0;
    virtual bool startObject() = 0;
    virtual bool endObject(size_t memberCount) = 0;
    virtual bool startArray() = 0;
    virtual bool endArray(size_t elementCount) = 0;
};

// Reads `text` as one JSON document into `handler`. False when the text is not one well-formed
// JSON document (invalid UTF-8, too deep, anything after it included) or the handler stopped.
bool readJSON(std::string_view text, JSONEventHandler& handler);

// Builds PropertyValues from the events of JSON values, as PropertyValue::fromJSON reads them.
// Values may be fed one after another; each completed top-level value waits in the builder.
class JSONValueBuilder final : public JSONEventHandler {
public:
    bool null() override;
    bool boolean(bool value) override;
    bool number(std::string_view text) override;
    bool string(std::string_view text) override;
    bool key(std::string_view text) override;
    bool startObject() override;
    bool endObject(size_t memberCount) override;
    bool startArray() override;
    bool endArray(size_t elementCount) override;

    // True when no object or array is open: the last value fed is complete.
    bool isBetweenValues() const noexcept { return _openContainers == 0; }
    // The one completed value, taken out of the builder; no value unless exactly one is waiting.
    PropertyValue takeResult();

private:
    bool push(PropertyValue value);

    std::vector<PropertyValue> _values;
    std::vector<std::string> _keys;
    size_t _openContainers = 0;
};

}  // namespace ZeltoTouch

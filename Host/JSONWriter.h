#pragma once

#include <cstddef>

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "Host/PropertyValue.h"

namespace ZeltoTouch {

// Writes `value` as one JSON value into a writer that the caller streams into, so large
// documents can be assembled without building a PropertyValue tree for them. `enclosingDepth`
// is how many containers the caller has already opened around the value; the total nesting
// stays within PropertyValue::kMaxJSONDepth. Returns false when the value holds something JSON
// cannot represent (data, NaN, infinities, invalid UTF-8) or nests too deeply; the writer's
// output is then incomplete and must be discarded.
bool writeJSON(rapidjson::Writer<rapidjson::StringBuffer>& writer, const PropertyValue& value,
               size_t enclosingDepth = 0);

}  // namespace ZeltoTouch

#pragma once

#include <ostream>

#include "Host/PropertyValue.h"

namespace ZeltoTouch {

// Lets GoogleTest show a PropertyValue by its description in failure messages.
inline void PrintTo(const PropertyValue& value, std::ostream* os) { *os << value.description(); }

}  // namespace ZeltoTouch

#pragma once

#include <cstdint>
#include <string>

#include <fuzzer/FuzzedDataProvider.h>

#include "Host/PropertyValue.h"

namespace ZeltoTouch::Fuzz {

// Turns fuzzer bytes into the values and keys a hostile property caller would send: every kind
// of PropertyValue, numbers at their edges (NaN, infinities, negatives, the limits of every
// width), and keys that are mostly the algorithm's own, sometimes bent, sometimes arbitrary.
class FuzzedValues {
public:
    explicit FuzzedValues(FuzzedDataProvider& input) : _input(input) {}

    PropertyValue value(int depth = 0);
    PropertyValue number();
    // An algorithm state key without domain ("HoldTimeoutMilliseconds", "VirtualNormalizationFactors.7", ...).
    std::string algsKey();
    std::string text(size_t maxLength = 24);

private:
    FuzzedDataProvider& _input;
};

}  // namespace ZeltoTouch::Fuzz

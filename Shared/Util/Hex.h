#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "Host/PropertyValue.h"

namespace ZeltoTouch::Util {

// Hex text of byte sequences. Written form: "%02x " per byte, a space after the last byte too.
PropertyValue hexStringFromBytes(std::span<const uint8_t> bytes);
void appendHexText(std::string& out, std::span<const uint8_t> bytes);

// Read form: whitespace-separated base-16 tokens, one byte each, read with the semantics of
// the standard formatted extraction of an unsigned 16-bit integer (`std::istream >> std::hex`):
// leading whitespace skipped, either case, optional sign and "0x"/"0X" prefix. A failed
// extraction (no digits, or a value beyond 16 bits) silently ends the text; a value from 0x100
// to 0xFFFF throws std::invalid_argument("invalid hex string").
// Precondition: `string` is a string value.
std::vector<uint8_t> bytesFromHexString(const PropertyValue& string);
// The same reading, appending to `out`; on a throw `out` holds the bytes read before.
void appendBytesFromHexText(std::string_view text, std::vector<uint8_t>& out);

}  // namespace ZeltoTouch::Util

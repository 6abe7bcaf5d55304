// Arbitrary text into hex parsing, checked against the standard text stream whose extraction
// the reader reproduces: the same bytes, or the same "invalid hex string" error. And any bytes
// written as hex text read back as themselves.

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <ios>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "Shared/Util/Hex.h"

using namespace ZeltoTouch;

namespace {

[[noreturn]] void fail(const char* what) {
    fprintf(stderr, "invariant broken: %s\n", what);
    abort();
}

// The reference: unsigned 16-bit base-16 extraction from a stream until it fails. No value
// stands for the "invalid hex string" error.
std::optional<std::vector<uint8_t>> streamBytes(std::string_view text) {
    std::istringstream stream{std::string(text)};
    std::vector<uint8_t> bytes;
    uint16_t value = 0;
    while (stream >> std::hex >> value) {
        if (value > 0xFF) return std::nullopt;
        bytes.push_back(static_cast<uint8_t>(value));
    }
    return bytes;
}

std::optional<std::vector<uint8_t>> readerBytes(std::string_view text) {
    try {
        return Util::bytesFromHexString(PropertyValue::string(text));
    } catch (const std::invalid_argument& error) {
        if (std::string_view(error.what()) != "invalid hex string") fail("unexpected error message");
        return std::nullopt;
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    if (readerBytes(text) != streamBytes(text)) fail("hex reader disagrees with stream extraction");

    const std::vector<uint8_t> bytes(data, data + size);
    if (Util::bytesFromHexString(Util::hexStringFromBytes(bytes)) != bytes) fail("hex round trip changed the bytes");
    return 0;
}

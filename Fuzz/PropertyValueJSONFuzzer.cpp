// Arbitrary text into PropertyValue's JSON parser and back out. A parsed value must serialise
// (it holds only what JSON can say), read back as an equal value, and serialise again to the
// very same text.

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>

#include "Host/PropertyValue.h"

using namespace ZeltoTouch;

namespace {

[[noreturn]] void fail(const char* what) {
    fprintf(stderr, "invariant broken: %s\n", what);
    abort();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const PropertyValue value = PropertyValue::fromJSON(std::string_view(reinterpret_cast<const char*>(data), size));
    if (!value) return 0;
    (void)value.description();

    std::string text;
    if (!value.toJSON(text)) fail("a parsed value does not serialise");
    const PropertyValue reread = PropertyValue::fromJSON(text);
    if (!reread) fail("serialised text does not parse");
    if (!(reread == value)) fail("round trip changed the value");
    std::string again;
    if (!reread.toJSON(again) || again != text) fail("serialisation is not stable");
    return 0;
}

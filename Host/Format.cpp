// printf-style formatting with "%@", over checked arguments.
//
// The format is walked one conversion at a time; each numeric conversion is handed to snprintf
// with a rebuilt conversion directive whose length modifier matches the type actually passed, so a
// mismatched argument can never be undefined behaviour. Rules for mismatches:
//  - Integer conversions (d i u o x X c p) take any integer, reduced to the width of the length
//    modifier (hh 8 bits, h 16, none 32, l ll j z t L 64) and read with the conversion's
//    signedness, as the bits would be; a double is truncated toward zero first (NaN gives 0; out
//    of range saturates for signed conversions and wraps like a negative integer for unsigned).
//  - Floating conversions take integers, converted to the nearest double.
//  - A numeric PropertyValue counts as its number (a boolean as 0 or 1).
//  - Any other argument, and every argument of "%s" and "%@", prints its natural text: strings
//    as themselves, PropertyValues and HIDEvents as their description, numbers in decimal.
//  - A "*" width or precision takes a numeric argument as an int (anything else counts as 0).
//  - A missing argument prints "(missing)"; surplus arguments are ignored.
//  - "%n" prints nothing and writes nowhere; an unknown conversion is copied literally.
// Widths and precisions are capped at kMaxFieldWidth so that a stray argument cannot demand
// gigabytes of padding.

#include "Host/Format.h"

#include <algorithm>
#include <charconv>
#include <climits>
#include <cstdio>
#include <optional>

#include "Host/NumberConversion.h"

namespace ZeltoTouch {

namespace {

constexpr int kMaxFieldWidth = 1 << 20;
constexpr std::string_view kMissing = "(missing)";

enum class Length { None, Char, Short, Long64 };

struct ConversionSpec {
    std::string flags;  // any of "-+ #0", in order given
    bool widthFromArgument = false;
    std::optional<int> width;
    bool precisionFromArgument = false;
    std::optional<int> precision;
    Length length = Length::None;
    char conversion = 0;
    size_t end = 0;  // index just past the conversion character

    bool leftAligned() const { return flags.find('-') != std::string::npos; }
};

// Saturating accumulation of a decimal field in the format text.
int parseDecimal(std::string_view format, size_t& i) {
    int value = 0;
    while (i < format.size() && format[i] >= '0' && format[i] <= '9') {
        int digit = format[i++] - '0';
        value = value > (INT_MAX - digit) / 10 ? INT_MAX : value * 10 + digit;
    }
    return value;
}

Length parseLength(std::string_view format, size_t& i) {
    auto next = [&](char c) { return i < format.size() && format[i] == c; };
    if (next('h')) {
        ++i;
        if (next('h')) {
            ++i;
            return Length::Char;
        }
        return Length::Short;
    }
    if (next('l')) {
        ++i;
        if (next('l')) ++i;
        return Length::Long64;
    }
    if (next('j') || next('z') || next('t') || next('L')) {
        ++i;
        return Length::Long64;
    }
    return Length::None;
}

constexpr std::string_view kConversions = "diuoxXcsfFeEgGaAp%@n";

// Parses the conversion starting at format[start] == '%'; nullopt when it is incomplete or
// names no known conversion.
std::optional<ConversionSpec> parseConversion(std::string_view format, size_t start) {
    ConversionSpec directive;
    size_t i = start + 1;
    while (i < format.size() && std::string_view("-+ #0").find(format[i]) != std::string_view::npos) {
        directive.flags += format[i++];
    }
    if (i < format.size() && format[i] == '*') {
        directive.widthFromArgument = true;
        ++i;
    } else if (i < format.size() && format[i] >= '0' && format[i] <= '9') {
        directive.width = parseDecimal(format, i);
    }
    if (i < format.size() && format[i] == '.') {
        ++i;
        if (i < format.size() && format[i] == '*') {
            directive.precisionFromArgument = true;
            ++i;
        } else {
            directive.precision = parseDecimal(format, i);
        }
    }
    directive.length = parseLength(format, i);
    if (i >= format.size() || kConversions.find(format[i]) == std::string_view::npos) return std::nullopt;
    directive.conversion = format[i];
    directive.end = i + 1;
    return directive;
}

// The numeric reading of an argument, if it has one.
using Numeric = std::variant<int64_t, uint64_t, double>;

std::optional<Numeric> numericValue(const FormatArg& arg) {
    const auto& value = arg.value();
    if (auto* i = std::get_if<int64_t>(&value)) return *i;
    if (auto* u = std::get_if<uint64_t>(&value)) return *u;
    if (auto* d = std::get_if<double>(&value)) return *d;
    auto* property = std::get_if<const PropertyValue*>(&value);
    if (!property || !(*property)->isNumber()) return std::nullopt;
    using K = PropertyValue::NumberKind;
    switch ((*property)->numberKind()) {
        case K::Float32:
        case K::Float64: return (*property)->toDouble();
        case K::Int32:
        case K::Int64: return static_cast<int64_t>((*property)->toUInt64());
        default: return (*property)->toUInt64();
    }
}

void appendShortest(std::string& out, double value) {
    char buffer[64];
    auto result = std::to_chars(buffer, buffer + sizeof buffer, value);
    out.append(buffer, result.ptr);
}

void appendNaturalText(std::string& out, const FormatArg& arg) {
    struct Visitor {
        std::string& out;
        void operator()(int64_t i) const { out += std::to_string(i); }
        void operator()(uint64_t u) const { out += std::to_string(u); }
        void operator()(double d) const { appendShortest(out, d); }
        void operator()(std::string_view s) const { out += s; }
        void operator()(const PropertyValue* p) const { out += p->description(); }
        void operator()(const HIDEvent* e) const { out += e->description(); }
    };
    std::visit(Visitor{out}, arg.value());
}

void appendPadded(std::string& out, std::string_view text, const ConversionSpec& directive) {
    size_t width = directive.width ? static_cast<size_t>(*directive.width) : 0;
    size_t padding = width > text.size() ? width - text.size() : 0;
    if (!directive.leftAligned()) out.append(padding, ' ');
    out += text;
    if (directive.leftAligned()) out.append(padding, ' ');
}

void appendText(std::string& out, const FormatArg& arg, const ConversionSpec& directive) {
    std::string text;
    appendNaturalText(text, arg);
    if (directive.precision && static_cast<size_t>(*directive.precision) < text.size()) text.resize(*directive.precision);
    appendPadded(out, text, directive);
}

// Integer bits of a numeric argument for an integer conversion of the given signedness.
uint64_t integerBits(const Numeric& value, bool isSigned) {
    if (auto* i = std::get_if<int64_t>(&value)) return static_cast<uint64_t>(*i);
    if (auto* u = std::get_if<uint64_t>(&value)) return *u;
    double d = std::get<double>(value);
    return isSigned ? static_cast<uint64_t>(NumberConversion::saturatingInt64(d)) : NumberConversion::wrappingUInt64(d);
}

// Reduces to the length modifier's width and extends back to 64 bits.
uint64_t resized(uint64_t bits, Length length, bool isSigned) {
    switch (length) {
        case Length::Char: return isSigned ? static_cast<uint64_t>(static_cast<int8_t>(bits)) : static_cast<uint8_t>(bits);
        case Length::Short:
            return isSigned ? static_cast<uint64_t>(static_cast<int16_t>(bits)) : static_cast<uint16_t>(bits);
        case Length::None:
            return isSigned ? static_cast<uint64_t>(static_cast<int32_t>(bits)) : static_cast<uint32_t>(bits);
        case Length::Long64: return bits;
    }
    return bits;
}

double floatingValue(const Numeric& value) {
    if (auto* i = std::get_if<int64_t>(&value)) return static_cast<double>(*i);
    if (auto* u = std::get_if<uint64_t>(&value)) return static_cast<double>(*u);
    return std::get<double>(value);
}

// "%<flags><width>.<precision><lengthModifier><conversion>" with only the flags that C defines
// for the conversion.
std::string snprintfSpec(const ConversionSpec& directive, std::string_view allowedFlags, std::string_view lengthModifier,
                         char conversion) {
    std::string text = "%";
    for (char flag : directive.flags) {
        if (allowedFlags.find(flag) != std::string_view::npos) text += flag;
    }
    if (directive.width) text += std::to_string(*directive.width);
    if (directive.precision) text += "." + std::to_string(*directive.precision);
    text += lengthModifier;
    text += conversion;
    return text;
}

template <typename T>
void appendSnprintf(std::string& out, const std::string& cSpec, T value) {
    char buffer[128];
    int length = std::snprintf(buffer, sizeof buffer, cSpec.c_str(), value);
    if (length < 0) {
        out += "(format error)";
    } else if (static_cast<size_t>(length) < sizeof buffer) {
        out.append(buffer, static_cast<size_t>(length));
    } else {
        size_t old = out.size();
        out.resize(old + static_cast<size_t>(length) + 1);
        std::snprintf(out.data() + old, static_cast<size_t>(length) + 1, cSpec.c_str(), value);
        out.resize(old + static_cast<size_t>(length));
    }
}

void appendInteger(std::string& out, const Numeric& value, const ConversionSpec& directive) {
    char conversion = directive.conversion;
    bool isSigned = conversion == 'd' || conversion == 'i';
    uint64_t bits = resized(integerBits(value, isSigned), directive.length, isSigned);
    if (isSigned) {
        appendSnprintf(out, snprintfSpec(directive, "-+ 0", "ll", conversion), static_cast<long long>(bits));
        return;
    }
    std::string_view flags = "-+ #0";
    if (conversion == 'p') {
        if (bits == 0) return appendPadded(out, "(nil)", directive);
        conversion = 'x';
        flags = "-+ 0";
        out += "0x";
    }
    appendSnprintf(out, snprintfSpec(directive, flags, "ll", conversion), static_cast<unsigned long long>(bits));
}

void appendCharacter(std::string& out, const Numeric& value, const ConversionSpec& directive) {
    char c = static_cast<char>(static_cast<unsigned char>(integerBits(value, true)));
    appendPadded(out, std::string_view(&c, 1), directive);
}

// Takes the next argument as a field width or precision; nullopt when there is none left.
std::optional<int> intArgument(const FormatArg* arg) {
    if (!arg) return std::nullopt;
    auto numeric = numericValue(*arg);
    if (!numeric) return 0;
    int64_t value = static_cast<int64_t>(integerBits(*numeric, true));
    if (auto* u = std::get_if<uint64_t>(&*numeric); u && *u > INT_MAX) value = INT_MAX;
    return static_cast<int>(std::clamp<int64_t>(value, -kMaxFieldWidth, kMaxFieldWidth));
}

class ArgumentCursor {
public:
    explicit ArgumentCursor(std::span<const FormatArg> args) : _args(args) {}
    const FormatArg* next() { return _next < _args.size() ? &_args[_next++] : nullptr; }

private:
    std::span<const FormatArg> _args;
    size_t _next = 0;
};

// Fills in widths and precisions given as arguments; false when an argument is missing.
bool resolveFieldArguments(ConversionSpec& directive, ArgumentCursor& cursor) {
    if (directive.widthFromArgument) {
        auto width = intArgument(cursor.next());
        if (!width) return false;
        if (*width < 0) directive.flags += '-';  // a negative width means left alignment
        directive.width = *width < 0 ? -*width : *width;
    }
    if (directive.precisionFromArgument) {
        auto precision = intArgument(cursor.next());
        if (!precision) return false;
        if (*precision >= 0) directive.precision = precision;  // a negative precision counts as none
    }
    if (directive.width) directive.width = std::min(*directive.width, kMaxFieldWidth);
    if (directive.precision) directive.precision = std::min(*directive.precision, kMaxFieldWidth);
    return true;
}

void appendConversion(std::string& out, ConversionSpec& directive, ArgumentCursor& cursor) {
    if (directive.conversion == '%') {
        out += '%';
        return;
    }
    if (directive.conversion == 'n') return;
    if (!resolveFieldArguments(directive, cursor)) {
        out += kMissing;
        return;
    }
    const FormatArg* arg = cursor.next();
    if (!arg) {
        out += kMissing;
        return;
    }
    if (directive.conversion == 's' || directive.conversion == '@') return appendText(out, *arg, directive);
    auto numeric = numericValue(*arg);
    if (!numeric) return appendText(out, *arg, directive);
    switch (directive.conversion) {
        case 'c': return appendCharacter(out, *numeric, directive);
        case 'f':
        case 'F':
        case 'e':
        case 'E':
        case 'g':
        case 'G':
        case 'a':
        case 'A': return appendSnprintf(out, snprintfSpec(directive, "-+ #0", "", directive.conversion), floatingValue(*numeric));
        default: return appendInteger(out, *numeric, directive);
    }
}

}  // namespace

void appendFormatv(std::string& out, std::string_view format, std::span<const FormatArg> args) {
    ArgumentCursor cursor(args);
    size_t i = 0;
    while (i < format.size()) {
        size_t percent = format.find('%', i);
        if (percent == std::string_view::npos) {
            out.append(format.substr(i));
            return;
        }
        out.append(format.substr(i, percent - i));
        auto directive = parseConversion(format, percent);
        if (!directive) {
            // Not a conversion: copy the '%' and carry on with what follows it.
            out += '%';
            i = percent + 1;
            continue;
        }
        appendConversion(out, *directive, cursor);
        i = directive->end;
    }
}

std::string formatv(std::string_view format, std::span<const FormatArg> args) {
    std::string out;
    appendFormatv(out, format, args);
    return out;
}

}  // namespace ZeltoTouch

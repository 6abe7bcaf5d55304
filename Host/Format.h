#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <variant>

#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"

namespace ZeltoTouch {

// One argument of a printf-style format. It remembers what it was given, so the formatter
// can check it against its conversion instead of trusting a va_list.
class FormatArg {
public:
    template <typename T>
        requires(std::is_integral_v<T> && std::is_signed_v<T> && !std::is_same_v<T, char> && !std::is_same_v<T, bool>)
    FormatArg(T value) noexcept : _value(static_cast<int64_t>(value)) {}
    template <typename T>
        requires(std::is_integral_v<T> && std::is_unsigned_v<T> && !std::is_same_v<T, bool>)
    FormatArg(T value) noexcept : _value(static_cast<uint64_t>(value)) {}
    FormatArg(bool value) noexcept : _value(static_cast<int64_t>(value)) {}
    FormatArg(char value) noexcept : _value(static_cast<int64_t>(value)) {}
    FormatArg(double value) noexcept : _value(value) {}
    FormatArg(float value) noexcept : _value(static_cast<double>(value)) {}
    FormatArg(const char* text) noexcept : _value(std::string_view(text ? text : "(null)")) {}
    FormatArg(std::string_view text) noexcept : _value(text) {}
    FormatArg(const std::string& text) noexcept : _value(std::string_view(text)) {}
    FormatArg(const PropertyValue& value) noexcept : _value(&value) {}
    FormatArg(const HIDEvent& event) noexcept : _value(&event) {}

    using Value = std::variant<int64_t, uint64_t, double, std::string_view, const PropertyValue*, const HIDEvent*>;
    const Value& value() const noexcept { return _value; }

private:
    Value _value;
};

// printf-style formatting in which "%@" stands for a value's description. Supported:
// flags, width and precision (also "*"), the length modifiers hh h l ll j z t L, and the
// conversions d i u o x X c s f F e E g G a A p % and @. Every argument is checked against its
// conversion; see Format.cpp for what a mismatch or a missing argument prints.
std::string formatv(std::string_view format, std::span<const FormatArg> args);
void appendFormatv(std::string& out, std::string_view format, std::span<const FormatArg> args);

template <typename... Args>
std::string format(std::string_view fmt, const Args&... args) {
    const FormatArg packed[] = {FormatArg(args)..., FormatArg(int64_t{0})};
    return formatv(fmt, std::span<const FormatArg>(packed, sizeof...(Args)));
}

template <typename... Args>
void appendFormat(std::string& out, std::string_view fmt, const Args&... args) {
    const FormatArg packed[] = {FormatArg(args)..., FormatArg(int64_t{0})};
    appendFormatv(out, fmt, std::span<const FormatArg>(packed, sizeof...(Args)));
}

// A new string PropertyValue built from a format.
template <typename... Args>
PropertyValue formatString(std::string_view fmt, const Args&... args) {
    return PropertyValue::string(format(fmt, args...));
}

}  // namespace ZeltoTouch

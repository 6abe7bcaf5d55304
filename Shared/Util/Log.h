#pragma once

#include <string>
#include <string_view>

#include "Host/Format.h"

namespace ZeltoTouch {

enum class LogLevel : uint8_t { Debug, Default, Error };

// The reverse-domain subsystem every log line of the system is filed under.
inline constexpr std::string_view kLogSubsystem = "dev.zelto.hid.ZeltoTouch";

// Where log lines go. The platform installs one (stderr, a capture buffer in tests); with
// none installed nothing is enabled and nothing is formatted.
class LogSink {
public:
    virtual ~LogSink() = default;
    virtual bool isEnabled(std::string_view category, LogLevel level) const noexcept = 0;
    virtual void write(std::string_view category, LogLevel level, std::string_view message) = 0;
};

// A log handle for one category. Lines are formatted only when their level is enabled, so
// a disabled debug line costs one check.
class Log {
public:
    explicit Log(std::string category) : _category(std::move(category)) {}

    // The process-wide sink; it must outlive every use. nullptr disables logging.
    static void setSink(LogSink* sink) noexcept;
    static LogSink* sink() noexcept;

    const std::string& category() const noexcept { return _category; }
    bool isEnabled(LogLevel level) const noexcept;
    void write(LogLevel level, std::string_view message) const;

    template <typename... Args>
    void debug(std::string_view fmt, const Args&... args) const { emit(LogLevel::Debug, fmt, args...); }
    template <typename... Args>
    void log(std::string_view fmt, const Args&... args) const { emit(LogLevel::Default, fmt, args...); }
    template <typename... Args>
    void error(std::string_view fmt, const Args&... args) const { emit(LogLevel::Error, fmt, args...); }

private:
    template <typename... Args>
    void emit(LogLevel level, std::string_view fmt, const Args&... args) const {
        if (isEnabled(level)) write(level, format(fmt, args...));
    }

    std::string _category;
};

}  // namespace ZeltoTouch

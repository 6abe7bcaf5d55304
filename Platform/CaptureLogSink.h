#pragma once

#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "Platform/LogThreshold.h"

namespace ZeltoTouch::Platform {

// Keeps every line it admits, for tests. Thread-safe. Install it with Log::setSink and
// uninstall it (Log::setSink(nullptr)) before it is destroyed.
class CaptureLogSink final : public LogSink {
public:
    struct Line {
        std::string category;
        LogLevel level;
        std::string message;
    };

    explicit CaptureLogSink(LogThreshold threshold = LogThreshold::Debug) : _threshold(threshold) {}

    bool isEnabled(std::string_view category, LogLevel level) const noexcept override;
    void write(std::string_view category, LogLevel level, std::string_view message) override;

    std::vector<Line> lines() const;
    size_t count() const;
    // Lines whose message equals message exactly.
    size_t countEqual(std::string_view message) const;
    // Lines whose message contains text.
    size_t countContaining(std::string_view text) const;
    size_t countAtLevel(LogLevel level) const;
    void clear();

private:
    template <typename Predicate>
    size_t countWhere(Predicate predicate) const;

    const LogThreshold _threshold;
    mutable std::mutex _lock;
    std::vector<Line> _lines;
};

}  // namespace ZeltoTouch::Platform

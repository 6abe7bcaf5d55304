#pragma once

#include <atomic>
#include <mutex>
#include <string>
#include <string_view>
#include <unistd.h>

#include "Platform/LogThreshold.h"

namespace ZeltoTouch::Platform {

// Writes each line as "<time> <subsystem>[<category>] <level>: message" with one write(2) per
// line, so lines from different threads never interleave. Writes to stderr unless given another
// descriptor (tests use a pipe).
class StderrLogSink final : public LogSink {
public:
    explicit StderrLogSink(LogThreshold threshold = LogThreshold::Default, int fd = STDERR_FILENO);

    // The threshold named by ZELTO_TOUCH_LOG; Default when unset. An unknown value falls back
    // to Default and is reported once on stderr, naming the value.
    static LogThreshold thresholdFromEnvironment();

    void setThreshold(LogThreshold threshold) noexcept { _threshold.store(threshold, std::memory_order_relaxed); }
    LogThreshold threshold() const noexcept { return _threshold.load(std::memory_order_relaxed); }

    bool isEnabled(std::string_view category, LogLevel level) const noexcept override;
    void write(std::string_view category, LogLevel level, std::string_view message) override;

    // The line as written, without the time prefix and with its trailing newline.
    static std::string formatLine(std::string_view category, LogLevel level, std::string_view message);

private:
    std::atomic<LogThreshold> _threshold;
    int _fd;
    std::mutex _writeLock;
};

// Installs a process-wide StderrLogSink with the threshold from ZELTO_TOUCH_LOG as the log sink.
// Idempotent: later calls install the same sink again.
void installDefaultLogging();

}  // namespace ZeltoTouch::Platform

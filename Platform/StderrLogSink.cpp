#include "Platform/StderrLogSink.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <ctime>

namespace ZeltoTouch::Platform {

namespace {

// Local wall-clock time with microseconds, e.g. "2024-05-01 12:34:56.123456".
std::string timePrefix() {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    tm local{};
    localtime_r(&now.tv_sec, &local);
    char text[64];
    const size_t length = strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S", &local);
    std::snprintf(text + length, sizeof text - length, ".%06ld", now.tv_nsec / 1000);
    return text;
}

void writeAll(int fd, std::string_view text) {
    while (!text.empty()) {
        const ssize_t written = ::write(fd, text.data(), text.size());
        if (written < 0) {
            if (errno == EINTR) continue;
            return;  // nowhere left to report a failing log descriptor
        }
        text.remove_prefix(static_cast<size_t>(written));
    }
}

}  // namespace

StderrLogSink::StderrLogSink(LogThreshold threshold, int fd) : _threshold(threshold), _fd(fd) {}

LogThreshold StderrLogSink::thresholdFromEnvironment() {
    const char* value = std::getenv(kLogThresholdVariable);
    if (value == nullptr) return LogThreshold::Default;
    if (auto threshold = parseLogThreshold(value)) return *threshold;
    std::fprintf(stderr, "%s: unknown log level \"%s\" (expected debug, default, error or off); using default\n",
                 kLogThresholdVariable, value);
    return LogThreshold::Default;
}

bool StderrLogSink::isEnabled(std::string_view, LogLevel level) const noexcept {
    return thresholdAdmits(threshold(), level);
}

std::string StderrLogSink::formatLine(std::string_view category, LogLevel level, std::string_view message) {
    std::string line;
    line.reserve(kLogSubsystem.size() + category.size() + message.size() + 16);
    line.append(kLogSubsystem).append("[").append(category).append("] ");
    line.append(logLevelName(level)).append(": ").append(message).append("\n");
    return line;
}

void StderrLogSink::write(std::string_view category, LogLevel level, std::string_view message) {
    if (!isEnabled(category, level)) return;
    const std::string line = timePrefix() + " " + formatLine(category, level, message);
    std::lock_guard lock(_writeLock);
    writeAll(_fd, line);
}

void installDefaultLogging() {
    static StderrLogSink sink(StderrLogSink::thresholdFromEnvironment());
    Log::setSink(&sink);
}

}  // namespace ZeltoTouch::Platform

#include "Shared/Util/Log.h"

#include <atomic>

namespace ZeltoTouch {

namespace {
std::atomic<LogSink*> gSink{nullptr};
}

void Log::setSink(LogSink* sink) noexcept { gSink.store(sink, std::memory_order_release); }

LogSink* Log::sink() noexcept { return gSink.load(std::memory_order_acquire); }

bool Log::isEnabled(LogLevel level) const noexcept {
    LogSink* sink = Log::sink();
    return sink != nullptr && sink->isEnabled(_category, level);
}

void Log::write(LogLevel level, std::string_view message) const {
    if (LogSink* sink = Log::sink()) sink->write(_category, level, message);
}

}  // namespace ZeltoTouch

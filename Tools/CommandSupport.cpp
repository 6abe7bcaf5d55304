#include "Tools/CommandSupport.h"

#include <cstdio>
#include <exception>
#include <unistd.h>

#include "Platform/MonotonicClock.h"
#include "Platform/StderrLogSink.h"

namespace ZeltoTouch::Tools {

void runCommand(const std::function<void()>& work) {
    Platform::installMonotonicClock();
    Platform::installDefaultLogging();
    try {
        work();
    } catch (const std::exception& error) {
        std::fflush(stdout);
        std::fprintf(stderr, "%s\n", error.what());
        throw CLI::RuntimeError(1);
    }
    if (std::fflush(stdout) != 0 || std::ferror(stdout)) {
        std::perror("cannot write the output");
        throw CLI::RuntimeError(1);
    }
}

CLI::Option* addStateWriteOption(CLI::App& command, std::vector<std::string>& assignments) {
    return command
        .add_option("--set", assignments,
                    "Write a state key before the first frame, as the recording would, e.g. "
                    "Algs.EnableTapSuppression=0 (VALUE is read as JSON if it parses, else as a string); "
                    "may be repeated")
        ->type_name("KEY=VALUE")
        ->allow_extra_args(false);
}

ProgressLine::ProgressLine(std::string label, size_t total)
    : _label(std::move(label)), _total(total), _enabled(::isatty(STDERR_FILENO) == 1), _start(Clock::now()) {}

ProgressLine::~ProgressLine() { clear(); }

void ProgressLine::clear() {
    if (!_shown) return;
    std::fputs("\r\033[K", stderr);
    std::fflush(stderr);
    _shown = false;
}

void ProgressLine::update(size_t done) {
    if (!_enabled) return;
    const Clock::time_point now = Clock::now();
    if (now - _start < std::chrono::milliseconds(500)) return;
    if (_shown && now - _lastDrawn < std::chrono::milliseconds(100)) return;
    _lastDrawn = now;
    _shown = true;
    const double percent = _total == 0 ? 100.0 : 100.0 * static_cast<double>(done) / static_cast<double>(_total);
    std::fprintf(stderr, "\r\033[K%s: frame %zu of %zu (%.0f%%)", _label.c_str(), done, _total, percent);
    std::fflush(stderr);
}

}  // namespace ZeltoTouch::Tools

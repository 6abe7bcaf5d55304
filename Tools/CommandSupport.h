#pragma once

#include <chrono>
#include <cstddef>
#include <functional>
#include <string>

#include <CLI/CLI.hpp>

namespace ZeltoTouch::Tools {

// Runs a subcommand's work with the platform's clock and logging installed. Any exception ends
// the command: its message alone goes to stderr (so a container the reader refuses shows
// exactly the reader's message) and the command exits with status 1.
void runCommand(const std::function<void()>& work);

// Adds the --set KEY=VALUE option shared by the commands that replay.
CLI::Option* addStateWriteOption(CLI::App& command, std::vector<std::string>& assignments);

// A one-line progress display on stderr for long work, redrawn in place. It shows only when
// stderr is a terminal and the work has taken longer than half a second, and erases itself
// when destroyed.
class ProgressLine {
public:
    ProgressLine(std::string label, size_t total);
    ~ProgressLine();
    ProgressLine(const ProgressLine&) = delete;
    ProgressLine& operator=(const ProgressLine&) = delete;

    void update(size_t done);
    // Erases the line before other output goes to the same terminal; the next update redraws it.
    void clear();

private:
    using Clock = std::chrono::steady_clock;

    std::string _label;
    size_t _total;
    bool _enabled;
    bool _shown = false;
    Clock::time_point _start;
    Clock::time_point _lastDrawn;
};

}  // namespace ZeltoTouch::Tools

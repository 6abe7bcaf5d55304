#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <sys/types.h>
#include <vector>

namespace ZeltoTouch::Testing {

// A program run for a test, with its stdout and stderr captured. The child inherits
// inheritedFd (if not -1) under the same number; everything else it gets is the pipes.
class ChildProcess {
public:
    ChildProcess(const std::string& program, const std::vector<std::string>& arguments, int inheritedFd = -1);
    ~ChildProcess();  // kills a child still running

    ChildProcess(const ChildProcess&) = delete;
    ChildProcess& operator=(const ChildProcess&) = delete;

    // Collects output until done(stdout, stderr) holds; false when timeout passed first or the
    // child closed both pipes without it.
    bool waitForOutput(const std::function<bool(const std::string& out, const std::string& err)>& done,
                       std::chrono::milliseconds timeout = std::chrono::seconds(10));
    void sendSignal(int signal);
    // Collects the rest of the output and the exit status; nothing when timeout passed first
    // (the child is then killed).
    std::optional<int> wait(std::chrono::milliseconds timeout = std::chrono::seconds(10));

    const std::string& out() const noexcept { return _out; }
    const std::string& err() const noexcept { return _err; }

private:
    bool collect(std::chrono::steady_clock::time_point deadline);  // false once both pipes are closed

    pid_t _pid = -1;
    int _outFd = -1;
    int _errFd = -1;
    std::string _out;
    std::string _err;
};

// Runs program to its end.
struct ProgramResult {
    int status;
    std::string out;
    std::string err;
};
ProgramResult runProgram(const std::string& program, const std::vector<std::string>& arguments);

}  // namespace ZeltoTouch::Testing

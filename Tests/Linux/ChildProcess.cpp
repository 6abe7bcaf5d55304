#include "Tests/Linux/ChildProcess.h"

#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <stdexcept>
#include <sys/wait.h>
#include <unistd.h>

extern char** environ;

namespace ZeltoTouch::Testing {

ChildProcess::ChildProcess(const std::string& program, const std::vector<std::string>& arguments, int inheritedFd) {
    int out[2], err[2];
    if (::pipe2(out, O_CLOEXEC) != 0 || ::pipe2(err, O_CLOEXEC) != 0) throw std::runtime_error("pipe2 failed");
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, out[1], STDOUT_FILENO);
    posix_spawn_file_actions_adddup2(&actions, err[1], STDERR_FILENO);
    // Duplicating a descriptor onto itself clears its close-on-exec flag in the child.
    if (inheritedFd >= 0) posix_spawn_file_actions_adddup2(&actions, inheritedFd, inheritedFd);

    std::vector<char*> argv{const_cast<char*>(program.c_str())};
    for (const auto& argument : arguments) argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);
    const int result = posix_spawn(&_pid, program.c_str(), &actions, nullptr, argv.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    ::close(out[1]);
    ::close(err[1]);
    _outFd = out[0];
    _errFd = err[0];
    if (result != 0) throw std::runtime_error("posix_spawn failed for " + program);
}

ChildProcess::~ChildProcess() {
    if (_pid > 0) {
        ::kill(_pid, SIGKILL);
        ::waitpid(_pid, nullptr, 0);
    }
    if (_outFd >= 0) ::close(_outFd);
    if (_errFd >= 0) ::close(_errFd);
}

bool ChildProcess::collect(std::chrono::steady_clock::time_point deadline) {
    pollfd fds[] = {{_outFd, POLLIN, 0}, {_errFd, POLLIN, 0}};
    std::string* sinks[] = {&_out, &_err};
    if (_outFd < 0 && _errFd < 0) return false;
    const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
    if (::poll(fds, 2, static_cast<int>(std::max<int64_t>(left.count(), 0))) <= 0) return true;
    for (int i = 0; i < 2; ++i) {
        if (fds[i].fd < 0 || fds[i].revents == 0) continue;
        char buffer[4096];
        const ssize_t size = ::read(fds[i].fd, buffer, sizeof buffer);
        if (size > 0) {
            sinks[i]->append(buffer, static_cast<size_t>(size));
        } else if (size == 0 || errno != EINTR) {
            ::close(fds[i].fd);
            (i == 0 ? _outFd : _errFd) = -1;
        }
    }
    return true;
}

bool ChildProcess::waitForOutput(const std::function<bool(const std::string&, const std::string&)>& done,
                                 std::chrono::milliseconds timeout) {
    const auto deadline = std::chrono::steady_clock::now() + timeout;
    while (!done(_out, _err)) {
        if (std::chrono::steady_clock::now() >= deadline || !collect(deadline)) return false;
    }
    return true;
}

void ChildProcess::sendSignal(int signal) { ::kill(_pid, signal); }

std::optional<int> ChildProcess::wait(std::chrono::milliseconds timeout) {
    const auto deadline = std::chrono::steady_clock::now() + timeout;
    while (std::chrono::steady_clock::now() < deadline && collect(deadline)) {
    }
    int status = 0;
    // The pipes close at exit; the exit itself may take a moment longer to show.
    while (::waitpid(_pid, &status, WNOHANG) != _pid) {
        if (std::chrono::steady_clock::now() >= deadline) return std::nullopt;  // the destructor kills it
        ::usleep(2000);
    }
    _pid = -1;
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

ProgramResult runProgram(const std::string& program, const std::vector<std::string>& arguments) {
    ChildProcess child(program, arguments);
    const auto status = child.wait();
    return {status.value_or(-1), child.out(), child.err()};
}

}  // namespace ZeltoTouch::Testing

// What the tests of the zelto-touch tool share: temporary folders, programs run with their output
// captured, and recordings made from gesture scripts.
#pragma once

#include <chrono>
#include <csignal>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <functional>
#include <optional>
#include <spawn.h>
#include <sstream>
#include <stdexcept>
#include <string>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"

extern char** environ;

namespace ZeltoTouch::Testing {

inline std::string readText(const std::string& path) {
    std::ostringstream text;
    text << std::ifstream(path, std::ios::binary).rdbuf();
    return text.str();
}

inline std::vector<std::string> lines(const std::string& text) {
    std::vector<std::string> result;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) result.push_back(line);
    return result;
}

// A fresh folder, removed with everything in it at the end of the test.
class TemporaryDirectory {
public:
    TemporaryDirectory() {
        std::string pattern = (std::filesystem::temp_directory_path() / "zelto-test-XXXXXX").string();
        if (!::mkdtemp(pattern.data())) throw std::runtime_error("mkdtemp failed");
        _path = pattern;
    }
    ~TemporaryDirectory() {
        std::error_code ignored;
        std::filesystem::remove_all(_path, ignored);
    }
    TemporaryDirectory(const TemporaryDirectory&) = delete;
    TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

    std::string path(std::string_view name = "") const { return (_path / name).string(); }
    // Writes NAME, making the folders in it, and returns its path.
    std::string write(std::string_view name, std::string_view contents) const {
        std::filesystem::create_directories((_path / name).parent_path());
        std::ofstream(_path / name, std::ios::binary) << contents;
        return path(name);
    }

private:
    std::filesystem::path _path;
};

// A program run for a test, its stdin empty and its stdout and stderr captured in files. The
// child also inherits inheritedFd (if not -1) under the same number.
class ChildProcess {
public:
    ChildProcess(const std::string& program, const std::vector<std::string>& arguments, int inheritedFd = -1) {
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, _outputs.path("out").c_str(), O_WRONLY | O_CREAT, 0600);
        posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, _outputs.path("err").c_str(), O_WRONLY | O_CREAT, 0600);
        // Duplicating a descriptor onto itself clears its close-on-exec flag in the child.
        if (inheritedFd >= 0) posix_spawn_file_actions_adddup2(&actions, inheritedFd, inheritedFd);
        std::vector<char*> argv{const_cast<char*>(program.c_str())};
        for (const auto& argument : arguments) argv.push_back(const_cast<char*>(argument.c_str()));
        argv.push_back(nullptr);
        const int result = ::posix_spawn(&_pid, program.c_str(), &actions, nullptr, argv.data(), environ);
        posix_spawn_file_actions_destroy(&actions);
        if (result != 0) throw std::runtime_error("posix_spawn failed for " + program);
    }
    ~ChildProcess() {
        if (_status) return;
        ::kill(_pid, SIGKILL);
        ::waitpid(_pid, nullptr, 0);
    }
    ChildProcess(const ChildProcess&) = delete;
    ChildProcess& operator=(const ChildProcess&) = delete;

    // The exit status (128 + signal when killed); nothing when the timeout passed first.
    std::optional<int> wait(std::chrono::milliseconds timeout = std::chrono::seconds(60)) {
        const auto deadline = std::chrono::steady_clock::now() + timeout;
        for (int status = 0; !_status && std::chrono::steady_clock::now() < deadline; ::usleep(1000)) {
            if (::waitpid(_pid, &status, WNOHANG) == _pid) {
                _status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
            }
        }
        return _status;
    }
    // Waits until done(stdout, stderr) holds; false when the timeout or the child's end came first.
    bool waitForOutput(const std::function<bool(const std::string& out, const std::string& err)>& done) {
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
        while (!done(out(), err())) {
            const bool over = std::chrono::steady_clock::now() >= deadline || wait(std::chrono::milliseconds(5));
            if (over) return done(out(), err());
        }
        return true;
    }
    void sendSignal(int signal) { ::kill(_pid, signal); }
    std::string out() const { return readText(_outputs.path("out")); }
    std::string err() const { return readText(_outputs.path("err")); }

private:
    TemporaryDirectory _outputs;
    pid_t _pid = -1;
    std::optional<int> _status;
};

// A program run to its end: its exit status (-1 when it did not end) and output.
struct ToolRun {
    int status = -1;
    std::string out, err;
};
inline ToolRun runProgram(const std::string& program, const std::vector<std::string>& arguments) {
    ChildProcess child(program, arguments);
    const auto status = child.wait();
    return {status.value_or(-1), child.out(), child.err()};
}
inline ToolRun runTool(const std::vector<std::string>& arguments) { return runProgram(ZELTO_TOUCH_BIN, arguments); }

// Headless Chromium, when installed (empty when not), run on a local page in a fresh profile with
// one more argument: --dump-dom prints the DOM as it stands after the page's scripts.
inline std::string chromiumPath() { return ::access("/usr/bin/chromium", X_OK) == 0 ? "/usr/bin/chromium" : ""; }
inline ToolRun runChromium(const std::string& argument, const std::string& pagePath) {
    const TemporaryDirectory profile;
    ToolRun run = runProgram(
        chromiumPath(), {"--headless", "--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run",
                         "--disable-background-networking", "--disable-component-update", "--disable-sync",
                         "--user-data-dir=" + profile.path(), "--window-size=1400,1300", "--hide-scrollbars",
                         "--virtual-time-budget=10000", argument, "file://" + std::filesystem::absolute(pagePath).string()});
    if (run.status != 0) throw std::runtime_error("chromium failed: " + run.err);
    return run;
}

// Recording timestamps: script time 0 is recorded at this many nanoseconds.
inline constexpr uint64_t kRecordingStartNs = 7'000'000'000;
inline uint64_t recordedTimeOf(uint32_t scriptTimeMs) { return kRecordingStartNs + scriptTimeMs * 1'000'000ull; }

struct RecordingExtras {
    struct Write {
        uint32_t scriptTimeMs;
        std::string key;
        PropertyValue value;
    };
    std::vector<Write> stateWrites;
    bool accelerometer = false;  // an "Accel" sample every 10 ms, as the service records them
};

inline std::vector<Platform::SimulatedReport> reportsOf(std::string_view script) {
    return Platform::SensorReportGenerator(Platform::GestureScriptParser::parse(script)).generateAll();
}

// The events a fresh Pipeline makes of the reports fed straight in (no recording, no playback),
// each with the report that produced it.
struct ProducedEvent {
    size_t reportIndex;
    HIDEventRef event;
};
inline std::vector<ProducedEvent> pipelineEvents(const std::vector<Platform::SimulatedReport>& reports,
                                                 const std::string& key = "", const PropertyValue& value = {}) {
    Pipeline pipeline;
    if (!key.empty()) pipeline.setState(0, key, value);
    std::vector<ProducedEvent> events;
    size_t index = 0;
    pipeline.hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
        [&](uint64_t, const HIDEventList& list) {
            for (const HIDEventRef& event : list) events.push_back({index, event});
        });
    for (; index < reports.size(); ++index) {
        pipeline.handleInputReport(index + 1, reports[index].bytes.data(), reports[index].bytes.size());
    }
    return events;
}

// A gesture script (the simulated sensor's text form) played into a PipelineRecording in front
// of a Pipeline, as the service records: the version 2 container text.
inline std::string recordScript(std::string_view script, const RecordingExtras& extras = {}) {
    PipelineRecording recording;
    recording.pipeline = std::make_shared<Pipeline>();
    auto write = extras.stateWrites.begin();
    uint32_t nextAccelMs = 0;
    for (const auto& report : reportsOf(script)) {
        for (; write != extras.stateWrites.end() && write->scriptTimeMs <= report.scriptTimeMs; ++write) {
            recording.setState(recordedTimeOf(write->scriptTimeMs), write->key, write->value);
        }
        for (; extras.accelerometer && nextAccelMs <= report.scriptTimeMs; nextAccelMs += 10) {
            const float wobble = static_cast<float>(nextAccelMs % 70) / 1000.0f;
            recording.handleMetadata(recordedTimeOf(nextAccelMs) + 500'000, "Accel",
                                     PropertyValue::dictionary({{"X", PropertyValue::fromFloat(wobble)},
                                                                {"Y", PropertyValue::fromFloat(-wobble)},
                                                                {"Z", PropertyValue::fromFloat(-1.0f)}}));
        }
        recording.handleInputReport(recordedTimeOf(report.scriptTimeMs), report.bytes.data(), report.bytes.size());
    }
    const PropertyValue container = recording.json();
    const auto bytes = container.bytes();
    return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

inline PipelineRecording recordingOf(std::string_view container) {
    return PipelineRecording(
        PropertyValue::data(std::span(reinterpret_cast<const uint8_t*>(container.data()), container.size())));
}

}  // namespace ZeltoTouch::Testing

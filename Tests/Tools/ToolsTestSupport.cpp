#include "Tests/Tools/ToolsTestSupport.h"

#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <fstream>
#include <memory>
#include <sstream>
#include <spawn.h>
#include <stdexcept>
#include <sys/wait.h>
#include <unistd.h>

#include "Platform/GestureScript.h"
#include "Platform/SensorReportGenerator.h"
#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"

extern char** environ;

namespace ZeltoTouch::Tools::Testing {

std::string recordScript(std::string_view script, const RecordingExtras& extras) {
    PipelineRecording recording;
    recording.pipeline = std::make_shared<Pipeline>();
    const auto reports = Platform::SensorReportGenerator(Platform::GestureScriptParser::parse(script)).generateAll();

    size_t nextWrite = 0;
    uint32_t nextAccelMs = 0;
    for (const Platform::SimulatedReport& report : reports) {
        for (; nextWrite < extras.stateWrites.size() && extras.stateWrites[nextWrite].scriptTimeMs <= report.scriptTimeMs;
             ++nextWrite) {
            const RecordingExtras::Write& write = extras.stateWrites[nextWrite];
            recording.setState(recordedTimeOf(write.scriptTimeMs), write.key, write.value);
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

TemporaryDirectory::TemporaryDirectory() {
    std::string pattern = (std::filesystem::temp_directory_path() / "zelto-tools-XXXXXX").string();
    if (!::mkdtemp(pattern.data())) throw std::runtime_error("mkdtemp failed");
    _path = pattern;
}

TemporaryDirectory::~TemporaryDirectory() {
    std::error_code ignored;
    std::filesystem::remove_all(_path, ignored);
}

std::string TemporaryDirectory::write(std::string_view name, std::string_view contents) const {
    const std::string file = path(name);
    std::ofstream(file, std::ios::binary) << contents;
    return file;
}

std::string readText(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

std::vector<std::string> lines(const std::string& text) {
    std::vector<std::string> result;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) result.push_back(line);
    return result;
}

ToolRun runTool(const std::vector<std::string>& arguments) { return runProgram(ZELTO_TOUCH_BIN, arguments); }

ToolRun runProgram(const std::string& program, const std::vector<std::string>& arguments) {
    const TemporaryDirectory outputs;
    const std::string outPath = outputs.path("stdout");
    const std::string errPath = outputs.path("stderr");

    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, outPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, errPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);

    std::vector<std::string> argv{program};
    argv.insert(argv.end(), arguments.begin(), arguments.end());
    std::vector<char*> pointers;
    for (std::string& argument : argv) pointers.push_back(argument.data());
    pointers.push_back(nullptr);

    pid_t pid = 0;
    const int spawned = ::posix_spawn(&pid, pointers[0], &actions, nullptr, pointers.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    if (spawned != 0) throw std::runtime_error("cannot run " + program);

    int status = 0;
    while (::waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR) throw std::runtime_error("waitpid failed");
    }
    ToolRun run;
    run.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    run.out = readText(outPath);
    run.err = readText(errPath);
    return run;
}

std::string chromiumPath() {
    for (const char* candidate : {"/usr/bin/chromium", "/usr/bin/chromium-browser"}) {
        if (::access(candidate, X_OK) == 0) return candidate;
    }
    return {};
}

namespace {

ToolRun runChromium(const std::vector<std::string>& extraArguments, const std::string& pagePath) {
    const TemporaryDirectory profile;
    std::vector<std::string> arguments{
        "--headless", "--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run",
        "--disable-background-networking", "--disable-component-update", "--disable-sync",
        "--user-data-dir=" + profile.path("profile"), "--window-size=1400,1300", "--hide-scrollbars",
        "--virtual-time-budget=10000"};
    arguments.insert(arguments.end(), extraArguments.begin(), extraArguments.end());
    arguments.push_back("file://" + std::filesystem::absolute(pagePath).string());
    ToolRun run = runProgram(chromiumPath(), arguments);
    if (run.status != 0) throw std::runtime_error("chromium failed: " + run.err);
    return run;
}

}  // namespace

std::string renderedDOM(const std::string& pagePath) { return runChromium({"--dump-dom"}, pagePath).out; }

void screenshot(const std::string& pagePath, const std::string& screenshotPath) {
    runChromium({"--screenshot=" + screenshotPath}, pagePath);
}

}  // namespace ZeltoTouch::Tools::Testing

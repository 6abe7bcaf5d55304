#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "Host/PropertyValue.h"

namespace ZeltoTouch::Tools::Testing {

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

// A gesture script (the simulated sensor's text form) played into a PipelineRecording in front
// of a Pipeline, as the service records: the version 2 container text.
std::string recordScript(std::string_view script, const RecordingExtras& extras = {});

// A fresh folder, removed with everything in it at the end of the test.
class TemporaryDirectory {
public:
    TemporaryDirectory();
    ~TemporaryDirectory();
    TemporaryDirectory(const TemporaryDirectory&) = delete;
    TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

    std::string path(std::string_view name) const { return (_path / name).string(); }
    std::string write(std::string_view name, std::string_view contents) const;  // returns the path

private:
    std::filesystem::path _path;
};

std::string readText(const std::string& path);
std::vector<std::string> lines(const std::string& text);

// The built zelto-touch, run to completion.
struct ToolRun {
    int status = -1;  // exit status; -1 when it did not exit normally
    std::string out;
    std::string err;
};
ToolRun runTool(const std::vector<std::string>& arguments);
ToolRun runProgram(const std::string& program, const std::vector<std::string>& arguments);

// Headless Chromium, when installed (the test setup installs Debian's chromium).
std::string chromiumPath();  // empty when there is none
// Loads a local page in a fresh profile and runs its scripts: the DOM as it stands after them,
// or a screenshot of the page.
std::string renderedDOM(const std::string& pagePath);
void screenshot(const std::string& pagePath, const std::string& screenshotPath);

}  // namespace ZeltoTouch::Tools::Testing

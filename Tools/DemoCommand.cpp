// zelto-touch demo: the whole system on a simulated sensor. The plug-in module is loaded the
// way a host loads it, a simulated sensor plays a gesture session in real time, and every event
// is printed as it lands on the host's queue; then the statistics, and the recording saved.

#include <CLI/CLI.hpp>

#include <chrono>
#include <cstdio>
#include <ctime>
#include <fstream>
#include <iostream>
#include <memory>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "Host/Format.h"
#include "Host/HIDEvent.h"
#include "Host/PropertyValue.h"
#include "Platform/DemoScript.h"
#include "Platform/DeviceRegistry.h"
#include "Platform/GestureScript.h"
#include "Platform/MonotonicClock.h"
#include "Platform/PluginHost.h"
#include "Platform/SimulatedSensor.h"
#include "Platform/StderrLogSink.h"
#include "Shared/Util/HostClock.h"
#include "Shared/Util/MachTime.h"
#include "Tools/Commands.h"
#include "Tools/PluginLocation.h"

namespace ZeltoTouch::Tools {

namespace {

struct DemoOptions {
    std::string pluginPath;
    std::string scriptPath;
    std::string recordPath;
    std::vector<std::string> gets;
    std::vector<std::string> sets;
    std::string logLevel = "error";
};

// A failure the command reports in one line before it ends with status 1.
struct DemoError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

std::string_view eventKind(const HIDEvent& event) {
    if (event.type() != kHIDEventTypeDigitizer) return "reset";  // the firmware reset's vendor event
    switch (event.phase()) {
        case kHIDEventPhaseMayBegin: return "may-begin";
        case kHIDEventPhaseBegan: return "hold start";
        case kHIDEventPhaseChanged: return "hold change";
        case kHIDEventPhaseEnded: return "hold end";
        case kHIDEventPhaseCancelled: return "cancel";
        default: return "tap";  // the only event without a phase
    }
}

std::string_view regionName(const HIDEvent& event) {
    if (event.type() != kHIDEventTypeDigitizer) return "";
    switch (static_cast<uint32_t>(event.y())) {
        case 1: return "play/pause";
        case 2: return "volume down";
        case 3: return "volume up";
        default: return "";
    }
}

// Strings as they are; everything else as compact JSON (or its description when it has none).
std::string valueText(const PropertyValue& value) {
    if (!value) return "(no value)";
    if (value.isString()) return std::string(value.stringView());
    std::string json;
    return value.toJSON(json) ? json : value.description();
}

// "KEY=VALUE": VALUE as JSON when it parses, as a string otherwise.
std::pair<std::string, PropertyValue> parseAssignment(const std::string& text) {
    const size_t equals = text.find('=');
    if (equals == std::string::npos || equals == 0) {
        throw DemoError(format("--set %s: expected KEY=VALUE", text));
    }
    const std::string valueText = text.substr(equals + 1);
    PropertyValue value = PropertyValue::fromJSON(valueText);
    if (!value) value = PropertyValue::string(valueText);
    return {text.substr(0, equals), value};
}

std::string readFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    if (!file) throw DemoError(format("cannot read %s", path));
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

Platform::GestureScript loadScript(const std::string& path) {
    if (path.empty()) return Platform::GestureScriptParser::parse(Platform::kDemoScript);
    try {
        return Platform::GestureScriptParser::parse(readFile(path));
    } catch (const std::invalid_argument& error) {
        throw DemoError(format("%s: %s", path, error.what()));
    }
}

std::string defaultRecordPath() {
    const std::time_t now = std::time(nullptr);
    std::tm local{};
    localtime_r(&now, &local);
    char name[64];
    std::strftime(name, sizeof name, "zelto-demo-%Y%m%d-%H%M%S.json", &local);
    return name;
}

void printDictionary(const char* title, const PropertyValue& value) {
    std::printf("\n%s:\n", title);
    if (!value.isDictionary()) {
        std::printf("  %s\n", valueText(value).c_str());
        return;
    }
    for (const std::string& key : value.keys()) {
        std::printf("  %-28s %s\n", key.c_str(), valueText(value.get(key)).c_str());
    }
}

// Prints each event as it lands, with its time since the session began.
class EventPrinter {
public:
    // Times count from here; call before the events can come.
    void start() { _startMach = Util::hostClock().machTimeNow(); }

    void print(const HIDEvent& event) {
        const uint64_t sinceStartNs = Util::nanosecondsFromMachTime(event.timestamp() - _startMach);
        std::printf("  %6.3f s  %-12s %s\n", static_cast<double>(sinceStartNs) / 1e9,
                    std::string(eventKind(event)).c_str(), std::string(regionName(event)).c_str());
        std::fflush(stdout);
        ++_count;
    }
    uint64_t count() const noexcept { return _count; }

private:
    uint64_t _startMach = 0;
    uint64_t _count = 0;  // the host's queue only
};

void waitForPlayback(const Platform::SimulatedSensor& sensor, uint32_t durationMs) {
    const auto deadline =
        std::chrono::steady_clock::now() + std::chrono::milliseconds(durationMs) + std::chrono::seconds(10);
    while (!sensor.playbackFinished()) {
        if (std::chrono::steady_clock::now() > deadline) {
            throw DemoError("the simulated sensor stopped sending reports");
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
}

void saveRecording(Platform::PluginHost& host, const std::string& path) {
    const PropertyValue recording = host.copyProperty(PropertyValue::string("Recording"));
    if (!recording.isString()) throw DemoError("the service returned no recording");
    std::ofstream file(path, std::ios::binary | std::ios::trunc);
    file.write(recording.stringView().data(), static_cast<std::streamsize>(recording.length()));
    file.close();
    if (!file) throw DemoError(format("cannot write the recording to %s", path));
    std::printf("\nRecording saved to %s (%zu bytes); replay it with: zelto-touch replay %s\n", path.c_str(),
                recording.length(), path.c_str());
}

void runDemo(const DemoOptions& options) {
    const auto threshold = Platform::parseLogThreshold(options.logLevel);
    static Platform::StderrLogSink logSink(threshold.value_or(Platform::LogThreshold::Error));
    Log::setSink(&logSink);
    Platform::installMonotonicClock();

    const Platform::GestureScript script = loadScript(options.scriptPath);
    std::vector<std::pair<std::string, PropertyValue>> assignments;
    for (const std::string& text : options.sets) assignments.push_back(parseAssignment(text));
    const std::string pluginPath = options.pluginPath.empty() ? pluginModulePath().string() : options.pluginPath;
    const std::string recordPath = options.recordPath.empty() ? defaultRecordPath() : options.recordPath;

    EventPrinter printer;  // outlives the host, whose teardown may still deliver events
    auto sensor = std::make_shared<Platform::SimulatedSensor>(script);
    Platform::ScopedDeviceService deviceService([sensor] { return sensor; });
    const std::unique_ptr<Platform::PluginHost> host = Platform::PluginHost::load(pluginPath);
    if (const ZeltoReturn status = host->start(deviceService.handle()); status != kZeltoSuccess) {
        throw DemoError(format("the service did not start: 0x%x", static_cast<uint32_t>(status)));
    }
    if (!host->open()) throw DemoError("the service could not open the simulated sensor");

    for (const auto& [key, value] : assignments) {
        const bool accepted = host->setProperty(PropertyValue::string(key), value);
        std::printf("set %s = %s: %s\n", key.c_str(), valueText(value).c_str(), accepted ? "accepted" : "refused");
    }

    std::printf("Playing %s (%.1f s) on a simulated sensor through %s\n\n",
                options.scriptPath.empty() ? "the built-in demo session" : options.scriptPath.c_str(),
                script.durationMs() / 1000.0, pluginPath.c_str());
    std::printf("  %7s  %-12s %s\n", "time", "event", "region");
    printer.start();
    host->schedule([&printer](const HIDEvent& event) { printer.print(event); });
    waitForPlayback(*sensor, script.durationMs());
    host->unschedule();  // the events already sent have landed once this returns
    std::printf("\n%ju events\n", static_cast<uintmax_t>(printer.count()));

    printDictionary("Event statistics", host->copyProperty(PropertyValue::string("Pipeline.Algs.EventStats")));
    printDictionary("Debug info", host->copyProperty(PropertyValue::string("Pipeline.DebugInfo")));
    for (const std::string& key : options.gets) {
        std::printf("\n%s = %s\n", key.c_str(), valueText(host->copyProperty(PropertyValue::string(key))).c_str());
    }
    saveRecording(*host, recordPath);
}

}  // namespace

void addDemoCommand(CLI::App& app) {
    auto options = std::make_shared<DemoOptions>();
    auto* demo = app.add_subcommand("demo", "Run the plug-in on a simulated sensor playing a gesture session");
    demo->footer(
        "Script format (--script): one step per line, '#' starts a comment, durations like 120ms or 2s,\n"
        "regions play-pause, volume-up, volume-down:\n"
        "  tap REGION DURATION | hold REGION DURATION [reset-after TIME] | slide FROM TO DURATION\n"
        "  brush REGION DURATION | palm DURATION | idle DURATION | reset");
    demo->add_option("--plugin", options->pluginPath, "The plug-in module (default: the one built with this binary)");
    demo->add_option("--script", options->scriptPath, "A gesture script to play instead of the built-in session");
    demo->add_option("--record", options->recordPath, "Where to save the recording (default: zelto-demo-<time>.json)");
    demo->add_option("--get", options->gets, "Print a property at the end (repeatable)")->allow_extra_args(false);
    demo->add_option("--set", options->sets, "Write a property before the session, KEY=VALUE; VALUE is JSON or text")
        ->allow_extra_args(false);
    demo->add_option("--log-level", options->logLevel, "Log to stderr from this level on")
        ->check(CLI::IsMember({"debug", "default", "error", "off"}))
        ->capture_default_str();
    demo->callback([options] {
        try {
            runDemo(*options);
        } catch (const std::exception& error) {
            std::fflush(stdout);
            std::cerr << "zelto-touch demo: " << error.what() << "\n";
            throw CLI::RuntimeError(1);
        }
    });
}

}  // namespace ZeltoTouch::Tools

// zelto-touch replay: plays a recording through a fresh pipeline and prints its events.
#include <cstdio>
#include <string>
#include <vector>

#include "Tools/CommandSupport.h"
#include "Tools/Commands.h"
#include "Tools/EventLines.h"
#include "Tools/RecordingFile.h"
#include "Tools/ReplaySession.h"

namespace ZeltoTouch::Tools {
namespace {

struct ReplaySettings {
    std::string path;
    float speed = 1.0f;
    bool fast = false;
    std::string format = "text";  // or "jsonl"
    bool stats = false;
    bool describe = false;
    std::vector<std::string> stateWrites;
};

void printLine(const std::string& line) {
    std::fwrite(line.data(), 1, line.size(), stdout);
    std::fputc('\n', stdout);
}

std::string jsonText(const PropertyValue& value) {
    std::string json;
    return value.toJSON(json) ? json : "null";
}

// "key value, key value" for a dictionary of numbers; nested dictionaries as "key: {...}".
std::string readableCounters(const PropertyValue& dictionary) {
    std::string text;
    for (const std::string& key : dictionary.keys()) {
        const PropertyValue value = dictionary.get(key);
        if (!text.empty()) text += ", ";
        text += key + (value.isDictionary() ? ": {" + readableCounters(value) + "}" : " " + jsonText(value));
    }
    return text;
}

// Prints what one delivered frame produced, in the chosen format.
class ReplayPrinter {
public:
    ReplayPrinter(const ReplaySettings& settings, Pipeline& pipeline) : _settings(settings), _pipeline(pipeline) {}

    void frame(const DeliveredFrame& delivered) {
        if (delivered.index == 0) _firstTimestampNs = delivered.frame.timestamp;
        for (const HIDEventRef& event : delivered.events) {
            if (!event) continue;
            printLine(json() ? eventJSONLine(*event, delivered.frame.timestamp)
                             : eventTextLine(*event, delivered.frame.timestamp - _firstTimestampNs));
        }
        if (_settings.describe && delivered.image) describe(*delivered.image);
    }

    void stats() {
        const PropertyValue eventStats = _pipeline.getState("Algs.EventStats");
        const PropertyValue debugInfo = _pipeline.getState("DebugInfo");
        if (json()) {
            printLine("{\"stats\": {\"EventStats\": " + jsonText(eventStats) + ", \"DebugInfo\": " +
                      jsonText(debugInfo) + "}}");
        } else {
            printLine("Event statistics: " + readableCounters(eventStats));
            printLine("Debug info: " + readableCounters(debugInfo));
        }
    }

private:
    bool json() const { return _settings.format == "jsonl"; }

    void describe(const InputReport::Image& image) {
        const Algs& algs = _pipeline.algs();
        const std::string touch = algs.touchStateDescription(image.signedPixels, image.timestampMs);
        const std::string virtualState = algs.virtualStateDescription(image.signedPixels, image.timestampMs);
        if (json()) {
            printLine("{\"describe\": {\"frame\": " + std::to_string(image.frameNumber) +
                      ", \"timeMs\": " + std::to_string(image.timestampMs) +
                      ", \"touch\": " + jsonText(PropertyValue::string(touch)) +
                      ", \"virtual\": " + jsonText(PropertyValue::string(virtualState)) + "}}");
        } else {
            const std::string prefix =
                "frame " + std::to_string(image.frameNumber) + " @" + std::to_string(image.timestampMs) + "ms";
            printLine(prefix + " touch:   " + touch);
            printLine(prefix + " virtual: " + virtualState);
        }
    }

    const ReplaySettings& _settings;
    Pipeline& _pipeline;
    uint64_t _firstTimestampNs = 0;
};

void replay(const ReplaySettings& settings) {
    ReplayOptions options{settings.speed, settings.fast, {}};
    for (const std::string& assignment : settings.stateWrites) options.stateWrites.push_back(StateWrite::parse(assignment));

    ReplaySession session(loadRecordingFile(settings.path).recording, std::move(options));
    ReplayPrinter printer(settings, session.pipeline());
    ProgressLine progress("replaying " + settings.path, session.frameCount());
    session.run([&](const DeliveredFrame& delivered) {
        if (!delivered.events.empty() || (settings.describe && delivered.image)) progress.clear();
        printer.frame(delivered);
        progress.update(delivered.index + 1);
    });
    if (settings.stats) printer.stats();
}

}  // namespace

void addReplayCommand(CLI::App& app) {
    auto settings = std::make_shared<ReplaySettings>();
    CLI::App* command = app.add_subcommand(
        "replay",
        "Play a recording through a fresh pipeline, paced as it was recorded, and print the gesture events "
        "it produces");
    command->add_option("FILE", settings->path, "Recording container (JSON, version 0, 1 or 2)")->required();
    CLI::Option* speed = command->add_option("--speed", settings->speed,
                                             "Playback speed factor (2 plays twice as fast); default 1")
                             ->check(CLI::PositiveNumber);
    command->add_flag("--fast", settings->fast, "Play every frame at once, without waiting")->excludes(speed);
    command
        ->add_option("--format", settings->format,
                     "Output: text (one readable line per event) or jsonl (one JSON object per event, for scripts)")
        ->check(CLI::IsMember({"text", "jsonl"}))
        ->capture_default_str();
    command->add_flag("--stats", settings->stats,
                      "End with the final event statistics and the pipeline's debug counters");
    command->add_flag("--describe", settings->describe,
                      "After each image frame, print the touch and virtual state descriptions");
    addStateWriteOption(*command, settings->stateWrites);
    command->callback([settings] { runCommand([&] { replay(*settings); }); });
}

}  // namespace ZeltoTouch::Tools

// zelto-touch info: what a recording holds.
#include <cstdio>
#include <string>

#include "Tools/CommandSupport.h"
#include "Tools/Commands.h"
#include "Tools/RecordingFile.h"
#include "Tools/RecordingSummary.h"

namespace ZeltoTouch::Tools {
namespace {

struct InfoSettings {
    std::string path;
    std::string format = "text";  // or "json"
};

void info(const InfoSettings& settings) {
    const RecordingFile file = loadRecordingFile(settings.path);
    const RecordingSummary summary = RecordingSummary::of(file.recording.frames(), file.containerVersion);
    const std::string text = settings.format == "json" ? summary.json() + "\n" : summary.text();
    std::fwrite(text.data(), 1, text.size(), stdout);
}

}  // namespace

void addInfoCommand(CLI::App& app) {
    auto settings = std::make_shared<InfoSettings>();
    CLI::App* command = app.add_subcommand(
        "info",
        "Summarise a recording: container version, frame counts by kind, time span, image frame-number gaps, "
        "state keys written and firmware events");
    command->add_option("FILE", settings->path, "Recording container (JSON, version 0, 1 or 2)")->required();
    command
        ->add_option("--format", settings->format,
                     "Output: text (readable) or json (one object with every gap, state write and firmware event)")
        ->check(CLI::IsMember({"text", "json"}))
        ->capture_default_str();
    command->callback([settings] { runCommand([&] { info(*settings); }); });
}

}  // namespace ZeltoTouch::Tools

// zelto-touch inspect: a self-contained visual HTML report of a recording.
#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include "Tools/CommandSupport.h"
#include "Tools/Commands.h"
#include "Tools/InspectPage.h"
#include "Tools/InspectTrace.h"
#include "Tools/RecordingFile.h"
#include "Tools/RecordingSummary.h"
#include "Tools/ReplaySession.h"

namespace ZeltoTouch::Tools {
namespace {

struct InspectSettings {
    std::string path;
    std::string output;
    std::vector<std::string> stateWrites;
};

// FILE with its extension replaced by .html, never FILE itself.
std::string defaultOutputPath(const std::string& input) {
    std::filesystem::path output(input);
    output.replace_extension(".html");
    return output == std::filesystem::path(input) ? input + ".html" : output.string();
}

void inspect(const InspectSettings& settings) {
    ReplayOptions options{1.0f, true, {}};
    for (const std::string& assignment : settings.stateWrites) options.stateWrites.push_back(StateWrite::parse(assignment));
    RecordingFile file = loadRecordingFile(settings.path);

    RecordingSummary summary(file.containerVersion);
    InspectTrace trace;
    ReplaySession session(std::move(file.recording), std::move(options));
    ProgressLine progress("inspecting " + settings.path, session.frameCount());
    session.run([&](const DeliveredFrame& delivered) {
        summary.add(delivered.frame);
        trace.addEvents(delivered.frame.timestamp, delivered.events);
        if (delivered.image) trace.addImage(delivered.frame.timestamp, *delivered.image, session.pipeline().algs());
        if (delivered.frame.type == PipelineRecording::Frame::Type::Metadata) {
            trace.addMetadata(delivered.frame.timestamp, delivered.frame.key, delivered.frame.value);
        }
        progress.update(delivered.index + 1);
    });
    progress.clear();

    const PropertyValue finalStats = PropertyValue::dictionary({
        {"EventStats", session.pipeline().getState("Algs.EventStats")},
        {"DebugInfo", session.pipeline().getState("DebugInfo")},
    });
    const std::string source = std::filesystem::path(settings.path).filename().string();
    const std::string output = settings.output.empty() ? defaultOutputPath(settings.path) : settings.output;
    writeFileAtomically(output, inspectPage("ZeltoTouch recording " + source, trace.json(source, summary, finalStats)));
    std::printf("Report written to %s\n", output.c_str());
}

}  // namespace

void addInspectCommand(CLI::App& app) {
    auto settings = std::make_shared<InspectSettings>();
    CLI::App* command = app.add_subcommand(
        "inspect",
        "Replay a recording (as replay --fast does) and write a self-contained HTML report: channels, the "
        "algorithm's trace, gestures, parameter writes and resets on one zoomable time axis");
    command->add_option("FILE", settings->path, "Recording container (JSON, version 0, 1 or 2)")->required();
    command->add_option("-o,--output", settings->output, "The report to write (default: FILE with .html)")
        ->type_name("OUT.html");
    addStateWriteOption(*command, settings->stateWrites);
    command->callback([settings] { runCommand([&] { inspect(*settings); }); });
}

}  // namespace ZeltoTouch::Tools

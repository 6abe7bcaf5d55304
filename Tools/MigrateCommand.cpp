// zelto-touch migrate: rewrites a recording container of any version as version 2.
#include <stdexcept>
#include <string>
#include <sys/stat.h>

#include "Tools/CommandSupport.h"
#include "Tools/Commands.h"
#include "Tools/RecordingFile.h"

namespace ZeltoTouch::Tools {
namespace {

struct MigrateSettings {
    std::string input;
    std::string output;
    bool force = false;
};

bool exists(const std::string& path) {
    struct stat status {};
    return ::lstat(path.c_str(), &status) == 0;
}

// The output is written in one piece (temporary file, then rename), so a failure never leaves
// a half-written OUT; an existing OUT, the input included, is replaced only with --force.
void migrate(const MigrateSettings& settings) {
    if (!settings.force && exists(settings.output)) {
        throw std::runtime_error(settings.output + " already exists; use --force to replace it");
    }
    RecordingFile file = loadRecordingFile(settings.input);
    const PropertyValue container = file.recording.jsonOrThrow();
    const auto bytes = container.bytes();
    writeFileAtomically(settings.output, std::string_view(reinterpret_cast<const char*>(bytes.data()), bytes.size()));
}

}  // namespace

void addMigrateCommand(CLI::App& app) {
    auto settings = std::make_shared<MigrateSettings>();
    CLI::App* command = app.add_subcommand(
        "migrate",
        "Read a recording container of any version (0, 1 or 2) and write it as version 2, frames in timestamp "
        "order");
    command->add_option("IN", settings->input, "Recording container to read")->required();
    command->add_option("OUT", settings->output, "Where to write the version 2 container")->required();
    command->add_flag("--force", settings->force, "Replace OUT if it exists (IN itself included)");
    command->callback([settings] { runCommand([&] { migrate(*settings); }); });
}

}  // namespace ZeltoTouch::Tools

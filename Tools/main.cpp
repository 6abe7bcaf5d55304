#include <CLI/CLI.hpp>

#include "Tools/Commands.h"

int main(int argc, char** argv) {
    using namespace ZeltoTouch::Tools;

    CLI::App app{"zelto-touch: run, record, replay and inspect the ZeltoTouch gesture pipeline"};
    app.require_subcommand(1);
    app.set_help_all_flag("--help-all", "Show the help of every subcommand");

    addDemoCommand(app);
    addRunCommand(app);
    addDevicesCommand(app);
    addReplayCommand(app);
    addRenderCommand(app);
    addInfoCommand(app);
    addMigrateCommand(app);
    addInspectCommand(app);

    CLI11_PARSE(app, argc, argv);
    return 0;
}

#pragma once

#include <CLI/CLI.hpp>

namespace ZeltoTouch::Tools {

// Each subcommand adds itself to the application; its callback runs the command and throws
// CLI::RuntimeError(status) to end with a non-zero status after printing its own error.
void addReplayCommand(CLI::App& app);
void addRenderCommand(CLI::App& app);
void addInfoCommand(CLI::App& app);
void addMigrateCommand(CLI::App& app);
void addInspectCommand(CLI::App& app);
void addDemoCommand(CLI::App& app);
void addRunCommand(CLI::App& app);
void addDevicesCommand(CLI::App& app);

}  // namespace ZeltoTouch::Tools

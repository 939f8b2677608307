/// The program's commands. Each function adds its commands to the command line; a command that
/// runs leaves its exit status in `status`. `options` is complete when a command runs.
#pragma once

namespace CLI {
class App;
}

namespace ctl {

struct Options;

/// query, agents, events, status
void addInformationCommands(CLI::App& app, const Options& options, int& status);

/// start, stop, restart, install, complete-install, uninstall, remove-instance
void addTaskCommands(CLI::App& app, const Options& options, int& status);

/// config get, config set, config edit, ua-config
void addConfigurationCommands(CLI::App& app, const Options& options, int& status);

/// push
void addTransferCommands(CLI::App& app, const Options& options, int& status);

}  // namespace ctl

/// A command that a task has run, as the task's details tell of it: {"command", "pid", "started",
/// "ended", "exit" | "signal" | "error", "stdout", "stderr"}. Any member may be missing.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

namespace ctl {

/// The commands in the "details" of a task's record; an empty list if there are none.
nlohmann::json commandsOf(const nlohmann::json& record);

/// "exit code 3", "killed by signal 9", "could not be run: ..." or "not known".
std::string endText(const nlohmann::json& command);

/// Whether it ended in a way that no exit code tells: killed by a signal, or never run.
bool diedUnnoticed(const nlohmann::json& command);

/// Whether it ended with anything but exit code 0. One whose end is not known did not.
bool endedBadly(const nlohmann::json& command);

/// The command, its end and the last ten lines of each of its outputs, indented.
std::string commandReport(const nlohmann::json& command);

/// The reports of the commands that ended badly; of the last one if none did. `commands` is a list.
std::string failureReport(const nlohmann::json& commands);

}  // namespace ctl

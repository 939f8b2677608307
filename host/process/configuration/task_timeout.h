/// How long one command of a task may run.
#pragma once

#include <optional>
#include <string>

#include "host/process/configuration/environment.h"

namespace host {

/// The environment variable in which the plug-in finds the time-out, in seconds.
inline constexpr const char* kTimeoutVariable = "TIMEOUT";
/// What the plug-in takes without that variable.
inline constexpr int kUsualTimeout = 300;

/// The number of seconds that a text says, at least 1. Throws StartError, which calls the text's
/// origin `name`, when it says none. The largest number is the largest that the plug-in takes.
int taskTimeoutOf(const std::string& name, const std::string& text);

/// The time-out that TIMEOUT says; nothing if it is not set or says none.
std::optional<int> taskTimeoutIn(const Environment& environment);

/// The seconds that the plug-in will take after chooseTaskTimeout() with the same arguments. Throws
/// StartError where that does.
int timeoutThatHolds(std::optional<int> given, bool guarded, const Environment& environment);

/// Makes the plug-in use the time-out of the command line, if `given` is one. Otherwise, in a
/// guarded host, throws StartError when TIMEOUT is set to what is no time-out: the plug-in takes
/// such a text for 0 and gives up every command at once. Changes the process's environment: call it
/// before the plug-in starts, while there is one thread.
void chooseTaskTimeout(std::optional<int> given, bool guarded, const Environment& environment);

}  // namespace host

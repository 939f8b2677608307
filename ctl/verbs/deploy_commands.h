/// Installs: the commands whose outcome may have to be fetched after the host was restarted.
#pragma once

#include <string>

#include "ctl/client/options.h"
#include "ctl/client/task_request.h"

namespace ctl {

/// Sends COMPLETE_INSTALL and prints its result; returns the exit status.
int runCompleteInstall(const Options& options, const std::string& transid);

/// Runs an install that restarts the host. Ends with its first outcome, which says no more than
/// that the install was begun; with `complete` it then waits until the install is over (the host
/// came back, or a second outcome came) and fetches the real outcome.
int runRestartInstall(const Options& options, const QueuedCommand& command, bool complete);

}  // namespace ctl

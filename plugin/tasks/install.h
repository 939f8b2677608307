/// The commands INSTALL and COMPLETE_INSTALL.
///
/// An installation that restarts the agent process cannot report its own end. It runs in a script
/// in the depot, `runcmd.sh`, which leaves the exit code in `rc.txt`. INSTALL reports success
/// before the script starts, and COMPLETE_INSTALL, sent after the restart, reports what `rc.txt`
/// says.
#pragma once

#include "base/zavstr.h"
#include "tasks/return_codes.h"

class TaskQueueElem;

/// Runs the install command line in the task's context. With the optional text "REQUIRES_RESTART"
/// the command runs in the script described above, and a first outcome of 0 is published
/// beforehand. With any other optional text the two-way translator then adopts the product into the
/// server's configuration. On failure puts the message id and its parameter into the task. Runs on
/// the executor and blocks until the command has ended.
TASK_RC install(TaskQueueElem& task);

/// Writes `runcmd.sh` into the depot. The script runs its arguments and then, unless it is empty,
/// `translatorCommand`. Changes `command` into the command line that runs the script with the old
/// `command` as its arguments. A script that cannot be written is only traced.
void setupForRestart(ZAV::String& command, ZAV::String& translatorCommand, TaskQueueElem& task);

/// Reports the outcome of an installation that restarted the agent process. Sleeps ten seconds
/// first, to let its script finish; runs on the thread of the request.
TASK_RC completeInstallAfterRestart(TaskQueueElem& task);

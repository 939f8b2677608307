/// The commands INSTALL and COMPLETE_INSTALL.
///
/// An installation that restarts the agent process cannot report its own end. It runs inside a
/// script of the depot, `runcmd.sh`, that leaves the exit code in `rc.txt`; INSTALL reports success
/// before it starts, and COMPLETE_INSTALL, sent after the restart, reports what `rc.txt` says.
#pragma once

#include "base/zavstr.h"
#include "tasks/return_codes.h"

class TaskQueueElem;

/// Runs the install command line that the task's context holds. Optional "REQUIRES_RESTART" runs it
/// by the script above and publishes a first outcome of 0 beforehand; any other optional text has
/// the two-way translator take the product over into the server's configuration afterwards. On
/// failure the task carries the message id and its parameter. Blocks until the command has ended;
/// runs on the executor.
TASK_RC install(TaskQueueElem& task);

/// Writes `runcmd.sh` into the depot, for a run of `translatorCommand` behind the install command
/// unless it is empty, and turns `command` into the command line that runs the script with the old
/// `command` as its arguments. A script that cannot be written is only traced.
void setupForRestart(ZAV::String& command, ZAV::String& translatorCommand, TaskQueueElem& task);

/// Reports the outcome of an installation that restarted the agent process. Sleeps ten seconds
/// first, to let its script finish; runs on the thread of the request.
TASK_RC completeInstallAfterRestart(TaskQueueElem& task);

/// SETCONFIG of the universal agent.
#pragma once

#include "tasks/return_codes.h"

class TaskQueueElem;

/// Brings the task's metafile and scripts from the depot into the universal agent's directories,
/// adds the metafile's data provider to the instance's start-up parameters when the task's context
/// says "RESTART=Y" (which restarts the instance), and has the agent's console import the metafile.
/// On failure the task carries the message id and its parameter; what was copied by then stays.
/// Runs on the executor.
TASK_RC setUaconfig(TaskQueueElem& task);

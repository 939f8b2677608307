/// SETCONFIG of the universal agent.
#pragma once

#include "tasks/return_codes.h"

class TaskQueueElem;

/// Copies the task's metafile and scripts from the depot into the universal agent's directories.
/// When the task's context says "RESTART=Y", adds the metafile's data provider to the instance's
/// start-up parameters, which restarts the instance. Then has the agent's console import the
/// metafile. On failure puts the message id and its parameter into the task; files that have been
/// copied stay. Runs on the executor.
TASK_RC setUaconfig(TaskQueueElem& task);

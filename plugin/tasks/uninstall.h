/// The commands UNINSTALL and REMOVEINSTANCE. Both run on the executor and block until their
/// program has ended. On failure they put the message id and its parameter into the task.
#pragma once

#include "tasks/return_codes.h"

class TaskQueueElem;

/// Removes the task's product, for the architecture that best matches the variable QVS_BINARCH.
TASK_RC uninstall(TaskQueueElem& task);

/// Has the two-way translator remove the instance named by the task's target. The translator reads
/// the task's context from its standard input.
TASK_RC removeInstance(TaskQueueElem& task);

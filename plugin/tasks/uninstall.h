/// The commands UNINSTALL and REMOVEINSTANCE. Both run on the executor, block until their program
/// has ended and, on failure, leave the message id and its parameter in the task.
#pragma once

#include "tasks/return_codes.h"

class TaskQueueElem;

/// Removes the task's product, of the architecture that goes best with "QVS_BINARCH".
TASK_RC uninstall(TaskQueueElem& task);

/// Has the two-way translator remove the instance that the task's target names. The task's context
/// is the translator's standard input.
TASK_RC removeInstance(TaskQueueElem& task);

/// From a task to its handler: on the thread of the request, or later on the executor.
#pragma once

#include "tasks/return_codes.h"

class TaskQueueElem;

/// Checks a request, runs its command or queues a copy of it, and fills the request's answer (see
/// TaskQueueElem::ReturnStatus). Returns the code that is in the answer. Any thread; a command that
/// runs at once blocks until it has ended. An exception from its handler is traced and becomes the
/// command's failure.
TASK_RC runTask(TaskQueueElem& task);

/// Runs a queued command; the executor calls it. Returns the task's code and leaves the message of
/// a failure in the task. After an exception from the handler, which is traced, the message
/// parameter is the command's name. Publishes nothing.
TASK_RC processAsyncTask(TaskQueueElem& task);

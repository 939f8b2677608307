/// The check that a request has a value that its command requires.
#pragma once

#include "base/zavstr.h"
#include "tasks/return_codes.h"

class TaskQueueElem;

/// Returns `current` when `value` is not empty. Otherwise traces it, puts the message id of
/// `failure` and an empty message parameter into the task, and returns `failure`. `name` is the
/// parameter's name, for the trace. Checks are chained by handing each result on as the next
/// `current`, so the last missing parameter is the one that is reported.
TASK_RC requiredParameterOk(const ZAV::String& name, const ZAV::String& value, TaskQueueElem& task,
                            TASK_RC current, TASK_RC failure);

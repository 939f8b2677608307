/// Starts and stops an installed agent, or one of its instances, with the home's agent script.
///
/// `product` is the product code; `instance` is the instance's name, empty for an agent without
/// instances. On failure the message id and its parameter are put into `task`, which may be null.
/// All functions block until the script has ended; the agent itself keeps running. They return 0,
/// 1024 when the script failed, or 1025 when it could not be run.
#pragma once

#include "base/zavstr.h"
#include "tasks/return_codes.h"

class TaskQueueElem;

TASK_RC startAgent(const ZAV::String& product, const ZAV::String& instance, TaskQueueElem* task);
TASK_RC stopAgent(const ZAV::String& product, const ZAV::String& instance, TaskQueueElem* task);
/// Stops the agent, then starts it even if the stop failed. Returns the result of the start. When
/// only the stop failed, its message stays in the task.
TASK_RC restartAgent(const ZAV::String& product, const ZAV::String& instance, TaskQueueElem* task);

/// The function behind the three above; `action` is "START" or "STOP".
TASK_RC startstopAgent(const ZAV::String& action, const ZAV::String& product,
                       const ZAV::String& instance, TaskQueueElem* task);

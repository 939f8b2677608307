/// Starting and stopping an installed agent, or one of its instances, by the home's agent script.
///
/// `product` is the product code and `instance` the instance's name, empty for an agent without
/// instances. `task`, which may be null, gets the message id and parameter of a failure. All
/// operations block until the script has ended; the agent itself goes on running. Results: 0, 1024
/// when the script failed, 1025 when it could not be run.
#pragma once

#include "base/zavstr.h"
#include "tasks/return_codes.h"

class TaskQueueElem;

TASK_RC startAgent(const ZAV::String& product, const ZAV::String& instance, TaskQueueElem* task);
TASK_RC stopAgent(const ZAV::String& product, const ZAV::String& instance, TaskQueueElem* task);
/// Stops and then starts, whatever became of the stop. The result is the start's; after a stop that
/// failed and a start that did not, the task keeps the message of the stop.
TASK_RC restartAgent(const ZAV::String& product, const ZAV::String& instance, TaskQueueElem* task);

/// What the three above do; `action` is "START" or "STOP".
TASK_RC startstopAgent(const ZAV::String& action, const ZAV::String& product,
                       const ZAV::String& instance, TaskQueueElem* task);

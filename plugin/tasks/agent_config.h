/// The configuration of an agent, through the two-way translator.
#pragma once

#include "base/zavstr.h"
#include "tasks/return_codes.h"

class TaskQueueElem;

/// SETCONFIG of any product but the universal agent: hands the task's context to the translator. On
/// failure the task carries the message id and its parameter. Runs on the executor.
TASK_RC setConfig(TaskQueueElem& task);

/// GETCONFIG: the task's context becomes what the translator prints, from "INSTANCE=" on, or empty
/// without that marker. On failure the task carries the message id and its parameter. Runs on the
/// thread of the request.
TASK_RC getConfig(TaskQueueElem& task);

/// The instance of `product` that a managed system name stands for, trimmed; empty when there is
/// none or it cannot be found out. Runs a program unless the name is empty or the product is "um".
ZAV::String getInstanceName(const ZAV::String& product, const ZAV::String& managedSystemName);

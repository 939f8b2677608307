/// Reads and writes the configuration of an agent with the two-way translator.
#pragma once

#include "base/zavstr.h"
#include "tasks/return_codes.h"

class TaskQueueElem;

/// SETCONFIG of any product except the universal agent: passes the task's context to the
/// translator. On failure puts the message id and its parameter into the task. Runs on the
/// executor.
TASK_RC setConfig(TaskQueueElem& task);

/// GETCONFIG: sets the task's context to what the translator prints from "INSTANCE=" on, or to an
/// empty text when that marker is missing. On failure puts the message id and its parameter into
/// the task. Runs on the thread of the request.
TASK_RC getConfig(TaskQueueElem& task);

/// The instance of `product` that a managed system name denotes, trimmed; empty when there is none
/// or it cannot be determined. Runs a program unless the name is empty or the product is "um".
ZAV::String getInstanceName(const ZAV::String& product, const ZAV::String& managedSystemName);

/// How task handlers report failures.
#pragma once

#include <initializer_list>

#include "base/zavstr.h"
#include "base/zavtrace.h"
#include "tasks/return_codes.h"
#include "tasks/zavtqelm.h"

/// Joins the values with ",", the form of message parameters.
ZAV::String joinValues(std::initializer_list<ZAV::String> values);

/// A number in decimal digits.
ZAV::String decimal(int number);

/// A text of one character, whose code is the low 16 bits of `number`. Two message parameters carry
/// an exit code in this form.
ZAV::String asCharacter(int number);

/// The task's command and product, joined: the beginning of many message parameters.
ZAV::String commandAndProduct(const TaskQueueElem& task);

/// Puts the message id of `rc` and the message parameter into the task. Returns `rc`.
TASK_RC setFailure(TaskQueueElem& task, TASK_RC rc, const ZAV::String& parameter);

/// Does the same, and writes a line at error level; its first argument is the message id.
///
///     return failTask(trace(), task, rc, command, "%s Failed to start command [%s]", command);
template <typename... Arguments>
TASK_RC failTask(const ZAV::Trace::Place& place, TaskQueueElem& task, TASK_RC rc,
                 const ZAV::String& parameter, const char* format, const Arguments&... arguments) {
    place.error(format, rcToMsgId(rc), arguments...);
    return setFailure(task, rc, parameter);
}

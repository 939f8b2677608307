#include "tasks/dispatch.h"

#include "base/zavtrace.h"
#include "tasks/command_table.h"
#include "tasks/failure.h"
#include "tasks/required_parameter.h"
#include "tasks/supported_commands.h"
#include "tasks/task_queue.h"
#include "util/exceptions.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

/// Fails the task after an exception has left its handler; called in the catch block. The code is
/// returned even when there is no memory for the message.
TASK_RC endWithException(TaskQueueElem& task, TASK_RC rc) noexcept {
    try {
        Trace trace(traceUnit);
        const String command = task.getCommand();
        return trace.exit(failTask(trace(), task, rc, command,
                                   "%s Command [%s] ended by an exception: %s", command,
                                   ZAV::currentExceptionText()));
    } catch (...) {
        return rc;
    }
}

TASK_RC refuseUnsupported(TaskQueueElem& task) {
    Trace trace(traceUnit);
    const String command = task.getCommand();
    failTask(trace(), task, TASK_NOT_SUPPORTED, command,
             "%s Command [%s] is not a supported command", command);
    getSupportedTasks();
    return trace.exit(TASK_NOT_SUPPORTED);
}

TASK_RC refuseForUniversalAgent(TaskQueueElem& task) {
    Trace trace(traceUnit);
    const String command = task.getCommand();
    return trace.exit(failTask(trace(), task, TASK_NOT_SUPPORTED, command,
                               "%s Command [%s] is not a supported command for UA", command));
}

TASK_RC checkRequired(const Command& command, TaskQueueElem& task) {
    TASK_RC rc = TASK_OK;
    for (const RequiredParameter& parameter : command.required) {
        if (parameter.name == nullptr) break;
        rc = requiredParameterOk(parameter.name, (task.*parameter.value)(), task, rc,
                                 parameter.failure);
    }
    return rc;
}

TASK_RC runNow(const Command& command, TaskQueueElem& task) {
    try {
        return command.runNow(task);
    } catch (...) {
        return endWithException(task, command.notStarted);
    }
}

bool isRefused(const Command& command, const TaskQueueElem& task) {
    return command.universalAgent == UniversalAgent::Refused && isUniversalAgent(task);
}

bool needsChecks(const Command& command, const TaskQueueElem& task) {
    return command.universalAgent != UniversalAgent::RequiresNothing || !isUniversalAgent(task);
}

/// Checks a supported command's parameters, then runs or queues it.
TASK_RC runCommand(const Command& command, TaskQueueElem& task) {
    if (isRefused(command, task)) return refuseForUniversalAgent(task);
    if (needsChecks(command, task)) {
        const TASK_RC rc = checkRequired(command, task);
        if (rc != TASK_OK) return rc;
    }
    if (command.runNow != nullptr) return runNow(command, task);
    queueTask(task);
    return TASK_OK;
}

}  // namespace

TASK_RC runTask(TaskQueueElem& task) {
    Trace trace(traceUnit);
    const String name = task.getCommand();
    TASK_RC rc = requiredParameterOk("COMMAND", name, task, TASK_OK, TASK_NO_COMMAND);
    rc = requiredParameterOk("TRANSID", task.getTransid(), task, rc, TASK_NO_TRANSID);
    if (rc == TASK_OK && !isSupportedTask(name)) rc = refuseUnsupported(task);
    if (rc == TASK_OK) {
        trace().detail("Going to run command %s", name);
        const Command* const command = findCommand(name);
        if (command != nullptr) rc = runCommand(*command, task);
    }
    task.ReturnStatus(rc);
    return trace.exit(rc);
}

TASK_RC processAsyncTask(TaskQueueElem& task) {
    Trace trace(traceUnit);
    TASK_RC rc = TASK_OK;
    const Command* const command = findCommand(task.getCommand());
    if (command != nullptr && command->runQueued != nullptr) {
        try {
            rc = command->runQueued(task);
        } catch (...) {
            rc = endWithException(task, command->notStarted);
        }
    }
    trace().detail("Return code is %d", rc);
    return trace.exit(rc);
}

/// The commands: the parameters that each requires, where it runs and its handler.
#pragma once

#include <array>

#include "base/zavstr.h"
#include "tasks/return_codes.h"
#include "tasks/zavtqelm.h"

/// A value that a request must have. An entry without a name ends the list.
struct RequiredParameter {
    const char* name = nullptr;  ///< for the trace
    ZAV::String (TaskQueueElem::*value)() const = nullptr;
    TASK_RC failure = TASK_OK;  ///< the code when the value is missing
};

/// How a command treats the universal agent.
enum class UniversalAgent {
    Likewise,         ///< like any other product
    RequiresNothing,  ///< no parameter is checked
    Refused,
};

using TaskHandler = TASK_RC (*)(TaskQueueElem& task);

struct Command {
    const char* name;
    std::array<RequiredParameter, 3> required;  ///< in the order of checking
    UniversalAgent universalAgent;
    TaskHandler runNow;     ///< on the thread of the request; null for a queued command
    TaskHandler runQueued;  ///< on the executor; null for a command that runs at once
    TASK_RC notStarted;     ///< the code when the handler throws
};

/// All commands, in the order in which requesters see them.
extern const std::array<Command, 9> commandTable;

/// Finds a command by its exact name; null when there is none.
const Command* findCommand(const ZAV::String& name);

/// Whether the task's product is the universal agent's code, in upper or lower case.
bool isUniversalAgent(const TaskQueueElem& task);

/// The commands: what each requires, when it runs and what runs it.
#pragma once

#include <array>

#include "base/zavstr.h"
#include "tasks/return_codes.h"
#include "tasks/zavtqelm.h"

/// A value that a request must have. An entry without a name ends a list.
struct RequiredParameter {
    const char* name = nullptr;  ///< as it is traced
    ZAV::String (TaskQueueElem::*value)() const = nullptr;
    TASK_RC failure = TASK_OK;  ///< the code when it is missing
};

/// What a command does when its product is the universal agent.
enum class UniversalAgent {
    Likewise,         ///< the same as for any product
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

/// All commands, in the order in which they are listed to requesters.
extern const std::array<Command, 9> commandTable;

/// The command of exactly that name, or null.
const Command* findCommand(const ZAV::String& name);

/// Whether the product is the universal agent's, in upper or lower case.
bool isUniversalAgent(const TaskQueueElem& task);

/// task wait: the outcome of a task that the host has already.
#pragma once

#include "ctl/client/tasks/task_result.h"
#include "ctl/show/page.h"

namespace ctl {

struct Invocation;

/// The output and the status are those of the verb that asked for the task.
Page showAwaited(const TaskResult& result, Format format);

}  // namespace ctl

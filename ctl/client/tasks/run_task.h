/// Runs a command that the host queues.
#pragma once

#include "ctl/client/address/host_address.h"
#include "ctl/client/tasks/task_request.h"
#include "ctl/client/tasks/task_result.h"

namespace ctl {

/// Runs a queued command as far as it is to be awaited. A host that keeps tasks accepts it on its
/// journal, and it is followed across restarts of the host until the time-out. Any other host gets
/// it as a query and has to stay there. Throws Failure as HostClient does. The request has a
/// transaction identifier.
TaskResult runTask(const HostAddress& host, const TaskRequest& request, Await await,
                   const TaskWatch& watch = {});

/// The same for a task that the host has already; `name` is its identifier or TRANSID.
TaskResult followTask(const HostAddress& host, const std::string& name, const TaskWatch& watch);

}  // namespace ctl

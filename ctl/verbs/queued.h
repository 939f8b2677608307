/// Shared by the verbs whose command the host queues: they send it, wait for its outcome and show
/// both.
#pragma once

#include <string>

#include "ctl/client/task.h"
#include "ctl/show/page.h"
#include "ctl/verbs/invocation.h"

namespace ctl {

/// Sends a request and, unless --no-wait is given, waits for its outcome. As text, the reply is
/// shown as soon as it is there. The verb must declare kNoWait and kTransid.
TaskResult askQueued(const Invocation& invocation, TaskRequest request, const std::string& title);

/// The same, without reading the verb's arguments.
TaskResult askQueued(const HostAddress& host, Format format, const TaskRequest& request,
                     const std::string& title, bool wait);

/// askQueued(), then shows how it ended.
ExitStatus runQueued(const Invocation& invocation, const TaskRequest& request,
                     const std::string& title);

}  // namespace ctl

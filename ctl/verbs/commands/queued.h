/// Shared by the verbs whose command the host queues: they send it, wait for its outcome and show
/// both.
#pragma once

#include <functional>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/interruption.h"
#include "ctl/client/tasks/task_request.h"
#include "ctl/client/tasks/task_result.h"
#include "ctl/show/page.h"
#include "ctl/verbs/invocation.h"

namespace ctl {

/// A command as a verb asks for it.
struct QueuedCommand {
    TaskRequest request;
    std::string title;  ///< such as "start ux"
    Await await = Await::End;
    bool isVerified = false;  ///< look afterwards whether a success is one
};

/// The command with what the user said about it. The verb must declare kNoWait, kTransid and kOnce.
/// A transaction identifier that the user has chosen becomes part of the title.
QueuedCommand queuedCommand(const Invocation& invocation, TaskRequest request, std::string title);

/// Called when the host has accepted the command or has refused it, which may be long before the
/// outcome; see TaskWatch.
using OnReply = std::function<void(const nlohmann::json& reply)>;

/// Shows the line that the reply is, for people only.
OnReply replyShown(const std::string& title, Format format);

/// Sends a command and waits for its outcome if it is to be awaited, with a clock on a terminal.
TaskResult askQueued(const Invocation& invocation, const QueuedCommand& command,
                     const OnReply& onReply);

/// askQueued(), and shows the reply as soon as it is there and how the command ended.
ExitStatus runQueued(const Invocation& invocation, const QueuedCommand& command);

}  // namespace ctl

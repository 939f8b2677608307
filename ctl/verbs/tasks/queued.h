/// Shared by the verbs whose command the host queues: they send it, wait for its outcome and show
/// both.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/interruption.h"
#include "ctl/client/task.h"
#include "ctl/show/page.h"
#include "ctl/verbs/invocation.h"

namespace ctl {

/// A command as a verb asks for it.
struct QueuedCommand {
    TaskRequest request;
    std::string title;  ///< such as "start ux"
    bool isAwaited = true;
    bool isVerified = false;  ///< look afterwards whether a success is one
};

/// The command with what the user said about it. The verb must declare kNoWait and kTransid. A
/// transaction identifier that the user has chosen becomes part of the title.
QueuedCommand queuedCommand(const Invocation& invocation, TaskRequest request, std::string title);

/// As long as the object exists, Ctrl-C names the task and says how to find its outcome.
InterruptNote interruptNote(const std::string& transid, Format format);

/// Called when the reply is there, which may be long before the outcome.
using OnReply = std::function<void(const nlohmann::json& reply)>;

/// Shows the line that the reply is, for people only.
OnReply replyShown(const std::string& title, Format format);

/// Sends a command and waits for its outcome if it is to be awaited, with a clock on a terminal.
TaskResult askQueued(const Invocation& invocation, const QueuedCommand& command,
                     const OnReply& onReply);

/// askQueued(), and shows the reply as soon as it is there and how the command ended.
ExitStatus runQueued(const Invocation& invocation, const QueuedCommand& command);

}  // namespace ctl

#include "ctl/verbs/commands/queued.h"

#include <utility>

#include "ctl/client/tasks/run_task.h"
#include "ctl/show/tasks/task_page.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/commands/verification.h"
#include "ctl/verbs/tasks/waiting.h"

using nlohmann::json;

namespace ctl {

QueuedCommand queuedCommand(const Invocation& invocation, TaskRequest request, std::string title) {
    const Values& given = invocation.given;
    request.isOnce = given.has(kOnce);
    request.transid = given.text(request.isOnce ? kOnce : kTransid);
    if (!request.transid.empty()) title += " (" + request.transid + ")";
    const Await await = given.flag(kNoWait) ? Await::Reply : Await::End;
    return {std::move(request), std::move(title), await};
}

OnReply replyShown(const std::string& title, Format format) {
    if (format == Format::Json) return {};
    return [title](const json& reply) { print({replyLine(title, reply), {}}); };
}

TaskResult askQueued(const Invocation& invocation, const QueuedCommand& command,
                     const OnReply& onReply) {
    const bool isVerified = command.isVerified && command.await == Await::End;
    const Verification verification(invocation.host, command.request, isVerified);
    TaskRequest request = command.request;
    request.isUnique = request.transid.empty();
    if (request.isUnique) request.transid = makeTransid();
    Waiting waiting(invocation, command.title, request.transid);
    TaskWatch watch = waiting.watch();
    watch.onReply = [&](const json& reply) {
        waiting.show({});
        if (onReply) onReply(reply);
    };
    if (invocation.format == Format::Text) {
        watch.onBegun = [&] { waiting.show({command.title + ": begun\n", {}}); };
    }
    TaskResult result = runTask(invocation.host, request, command.await, watch);
    verification.check(result);
    return result;
}

ExitStatus runQueued(const Invocation& invocation, const QueuedCommand& command) {
    const TaskResult result =
        askQueued(invocation, command, replyShown(command.title, invocation.format));
    return print(showTask(command.title, result, invocation.format));
}

}  // namespace ctl

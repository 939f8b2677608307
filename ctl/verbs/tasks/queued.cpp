#include "ctl/verbs/tasks/queued.h"

#include <utility>

#include "ctl/client/failure.h"
#include "ctl/show/running_clock.h"
#include "ctl/show/task_page.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/tasks/verification.h"

using nlohmann::json;

namespace ctl {

QueuedCommand queuedCommand(const Invocation& invocation, TaskRequest request, std::string title) {
    request.transid = invocation.given.text(kTransid);
    if (!request.transid.empty()) title += " (" + request.transid + ")";
    return {std::move(request), std::move(title), !invocation.given.flag(kNoWait)};
}

InterruptNote interruptNote(const std::string& transid, Format format) {
    const Failure interrupted(kInterrupted, "interrupted; the host goes on with task " + transid,
                              laterText(transid));
    const Page page = failurePage(interrupted, format);
    return InterruptNote(page.err, page.out);
}

OnReply replyShown(const std::string& title, Format format) {
    if (format == Format::Json) return {};
    return [title](const json& reply) { print({replyLine(title, reply), {}}); };
}

TaskResult askQueued(const Invocation& invocation, const QueuedCommand& command,
                     const OnReply& onReply) {
    const Verification verification(invocation.host, command.request,
                                    command.isVerified && command.isAwaited);
    TaskRequest request = command.request;
    if (request.transid.empty()) request.transid = makeTransid();
    const InterruptNote note = interruptNote(request.transid, invocation.format);
    RunningClock clock(command.title, invocation.format == Format::Text);
    TaskWatch watch;
    watch.tick = [&clock] { clock.tick(); };
    watch.onReply = [&](const json& reply) {
        clock.erase();
        if (onReply) onReply(reply);
    };
    TaskResult result = runTask(invocation.host, request, command.isAwaited, watch);
    verification.check(result);
    return result;
}

ExitStatus runQueued(const Invocation& invocation, const QueuedCommand& command) {
    const TaskResult result =
        askQueued(invocation, command, replyShown(command.title, invocation.format));
    return print(showTask(command.title, result, invocation.format));
}

}  // namespace ctl

#include "ctl/verbs/queued.h"

#include <utility>

#include "ctl/show/running_clock.h"
#include "ctl/show/task_page.h"
#include "ctl/verbs/common_arguments.h"

using nlohmann::json;

namespace ctl {

TaskResult askQueued(const HostAddress& host, Format format, const TaskRequest& request,
                     const std::string& title, bool wait) {
    RunningClock clock(title, format == Format::Text);
    TaskWatch watch;
    watch.tick = [&clock] { clock.tick(); };
    if (format == Format::Text) {
        watch.onReply = [&](const json& reply) {
            clock.erase();
            print({replyLine(title, reply), {}});
        };
    }
    return runTask(host, request, wait, watch);
}

TaskResult askQueued(const Invocation& invocation, TaskRequest request, const std::string& title) {
    request.transid = invocation.given.text(kTransid);
    return askQueued(invocation.host, invocation.format, request, title,
                     !invocation.given.flag(kNoWait));
}

ExitStatus runQueued(const Invocation& invocation, const TaskRequest& request,
                     const std::string& title) {
    return print(showTask(title, askQueued(invocation, request, title), invocation.format));
}

}  // namespace ctl

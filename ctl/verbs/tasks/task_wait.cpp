#include "ctl/verbs/tasks/task_wait.h"

#include <nlohmann/json.hpp>

#include "ctl/client/tasks/run_task.h"
#include "ctl/show/tasks/task_page.h"
#include "ctl/show/tasks/task_table.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/tasks/task_argument.h"
#include "ctl/verbs/tasks/waiting.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kTask};

ExitStatus run(const Invocation& invocation) {
    const std::string& name = invocation.given.text(kTask);
    Waiting waiting(invocation, "task " + name, name);
    const TaskResult result = followTask(invocation.host, name, waiting.watch());
    waiting.show({});
    return print(showAwaited(result, invocation.format));
}

}  // namespace

constexpr Verb kTaskWaitVerb = {
    "task wait", "Wait for the outcome of a task",
    kArguments,  {"zavctl task wait deploy-7", "zavctl --timeout 60 task wait deploy-7"},
    run,
};

Page showAwaited(const TaskResult& result, Format format) {
    const std::string title = taskTitle(result.record);
    TaskResult timed = result;
    timed.elapsed = timeTaken(result.record);
    Page page = showTask(title, timed, format);
    const bool isRefused = result.end == TaskResult::End::Refused;
    if (isRefused && format == Format::Text) page.out = replyLine(title, result.reply);
    return page;
}

}  // namespace ctl

#include "ctl/verbs/tasks/task_cancel.h"

#include <nlohmann/json.hpp>

#include "ctl/client/host_client.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/row.h"
#include "ctl/client/tasks/run_task.h"
#include "ctl/show/tasks/running_clock.h"
#include "ctl/show/tasks/task_table.h"
#include "ctl/show/terminal.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/tasks/task_argument.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kTask};

/// The record of the task once it is over. Its commands may take some seconds to end.
json cancelled(const Invocation& invocation, const std::string& name) {
    RunningClock clock("task cancel " + name, invocation.format == Format::Text);
    TaskWatch watch;
    watch.tick = [&clock] { clock.tick(); };
    const std::string target = "/v1/tasks/" + percentEncoded(name) + "/cancel";
    const Answer answer =
        HostClient(invocation.host.socket).post(target, nullptr, invocation.deadline(), watch.tick);
    json record = answer.document();
    const std::string id = textOf(record, "id");
    if (id.empty() || !textOf(record, "ended").empty()) return record;
    return followTask(invocation.host, id, watch).record;
}

ExitStatus run(const Invocation& invocation) {
    return print(
        showCancelled(cancelled(invocation, invocation.given.text(kTask)), invocation.format));
}

}  // namespace

constexpr Verb kTaskCancelVerb = {
    "task cancel", "Take a task back, or end what runs of it",
    kArguments,    {"zavctl task cancel deploy-7", "zavctl --json task cancel deploy-7"},
    run,
};

Page showCancelled(const json& record, Format format) {
    const std::string state = textOf(record, "state");
    const std::string title = taskTitle(record);
    const bool isCancelled = state == "cancelled";
    Page page;
    if (isCancelled) {
        page.out = title + ": " + toned("cancelled", Tone::Good, standardOutput()) + "\n";
    } else if (state == "running" || state == "queued") {
        page.err = complaint(title + ": it has not ended within the time-out");
        page.status = kNoOutcome;
    } else {
        page.err = complaint(title + ": too late, it is " + state);
        page.status = kHostReportedFailure;
    }
    if (format == Format::Json) page.out = jsonText(record);
    return page;
}

}  // namespace ctl

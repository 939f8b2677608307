#include "ctl/verbs/commands/complete_install.h"

#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/client/tasks/install_outcome.h"
#include "ctl/client/tasks/queried_task.h"
#include "ctl/show/tasks/command_report.h"
#include "ctl/show/tasks/running_clock.h"
#include "ctl/show/tasks/task_page.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/tasks/waiting.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr const char* kTitle = "complete-install";
constexpr Argument kArguments[] = {kTransid};

ExitStatus run(const Invocation& invocation) {
    const std::string& given = invocation.given.text(kTransid);
    const std::string title = given.empty() ? kTitle : kTitle + (" (" + given + ")");
    const std::string transid = given.empty() ? makeTransid() : given;
    const InterruptNote note = interruptNote(transid, invocation.format);
    RunningClock clock(title, invocation.format == Format::Text);
    Task task(invocation.host, completeInstallRequest(transid), [&clock] { clock.tick(); });
    const json row = task.askNow().rows.front();
    const json record = returnCodeOf(row) == 0 ? json() : task.record();
    clock.erase();
    return print(showFetchedOutcome(title, row, record, task.elapsed(), invocation.format));
}

}  // namespace

constexpr Verb kCompleteInstallVerb = {
    kTitle,     "Fetch the outcome of an install that restarted the host",
    kArguments, {"zavctl complete-install", "zavctl --json complete-install"},
    run,
};

Page showFetchedOutcome(const std::string& title, const json& row, const json& record,
                        std::chrono::milliseconds elapsed, Format format) {
    const json commands = commandsOf(record);
    if (format == Format::Text) {
        Page page = showOutcome(title, row, elapsed, format);
        if (page.status != kSuccess) page.out += failureReport(commands);
        return page;
    }
    json document = row;
    if (!commands.empty()) document["details"] = {{"commands", commands}};
    return jsonPage(document, statusOf(row));
}

}  // namespace ctl

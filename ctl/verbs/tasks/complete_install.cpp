// complete-install: the outcome of an install that restarted the host.

#include "ctl/client/install_outcome.h"
#include "ctl/client/task.h"
#include "ctl/show/running_clock.h"
#include "ctl/show/task_page.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr const char* kTitle = "complete-install";
constexpr Argument kArguments[] = {kTransid};

ExitStatus run(const Invocation& invocation) {
    RunningClock clock(kTitle, invocation.format == Format::Text);
    Task task(invocation.host, completeInstallRequest(invocation.given.text(kTransid)),
              [&clock] { clock.tick(); });
    const nlohmann::json row = task.askNow().rows.front();
    clock.erase();
    return print(showOutcome(kTitle, row, task.elapsed(), invocation.format));
}

}  // namespace

constexpr Verb kCompleteInstallVerb = {
    kTitle,     "Fetch the outcome of an install that restarted the host",
    kArguments, {"zavctl complete-install", "zavctl --json complete-install"},
    run,
};

}  // namespace ctl

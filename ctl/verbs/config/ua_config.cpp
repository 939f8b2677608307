// ua-config: imports a metafile and its scripts from the depot into the universal agent.

#include "ctl/client/failure.h"
#include "ctl/client/guarded.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/commands/queued.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kMetafile =
    textOption("--metafile", "Metafile in the depot").completedBy(Completion::DepotFile);
constexpr Argument kScripts =
    textOption("--scripts", "Scripts in the depot, separated by commas").called("A,B");
constexpr Argument kPort = numberOption("--port", "Port of the agent's console").between(1, 65535);
constexpr Argument kRestart =
    flag("--restart",
         "Add the metafile's data provider to those that are started, which restarts\n"
         "the agent when it is not among them yet");
constexpr Argument kArguments[] = {kMetafile, kScripts, kPort,    kRestart, kTarget,
                                   kForce,    kNoWait,  kTransid, kOnce};

std::string contextOf(const Values& given) {
    std::string text;
    if (given.number(kPort) != 0) text = "PORT=" + std::to_string(given.number(kPort));
    if (given.flag(kRestart)) text += std::string(text.empty() ? "" : ",") + "RESTART=Y";
    return text;
}

/// The host takes scripts alone for done, and copies none.
void refuseMissingMetafile(const Values& given) {
    if (!given.text(kMetafile).empty()) return;
    throw Failure(kWrongUsage, "ua-config imports nothing without a metafile",
                  "Name one of the depot with --metafile.");
}

TaskRequest requestOf(const Values& given) {
    TaskRequest request;
    request.command = "SETCONFIG";
    request.product = "um";
    request.isForced = given.flag(kForce);
    request.context = contextOf(given);
    request.uaconfig = given.text(kMetafile);
    request.uascript = given.text(kScripts);
    request.targetmsn = given.text(kTarget);
    return request;
}

TaskRequest checkedRequest(const Values& given) {
    refuseMissingMetafile(given);
    return requestOf(given);
}

ExitStatus run(const Invocation& invocation) {
    const Values& given = invocation.given;
    if (given.text(kMetafile).empty() && isGuarded(invocation.host, invocation.deadline())) {
        refuseMissingMetafile(given);
    }
    return runQueued(invocation, queuedCommand(invocation, requestOf(given), "ua-config"));
}

}  // namespace

constexpr Verb kUaConfigVerb = {
    "ua-config",
    "Import a metafile and its scripts from the depot into the universal agent",
    kArguments,
    {"zavctl ua-config --metafile disks.mdl --scripts disks.sh --restart",
     "zavctl ua-config --metafile disks.mdl --port 7700"},
    run,
    checkedRequest,
};

}  // namespace ctl

// uninstall: removes a product.

#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/commands/queued.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kProduct, kForce, kNoVerify, kNoWait, kTransid, kOnce};

ExitStatus run(const Invocation& invocation) {
    TaskRequest request;
    request.command = "UNINSTALL";
    request.product = invocation.given.text(kProduct);
    request.isForced = invocation.given.flag(kForce);
    QueuedCommand command = queuedCommand(invocation, request, "uninstall " + request.product);
    command.isVerified = !invocation.given.flag(kNoVerify);
    return runQueued(invocation, command);
}

}  // namespace

constexpr Verb kUninstallVerb = {
    "uninstall", "Remove a product",
    kArguments,  {"zavctl uninstall ux", "zavctl uninstall ux --no-wait --transid cleanup-7"},
    run,
};

}  // namespace ctl

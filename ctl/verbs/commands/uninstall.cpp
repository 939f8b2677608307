// uninstall: removes a product.

#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/commands/queued.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kProduct, kForce, kNoVerify, kNoWait, kTransid, kOnce};

TaskRequest requestOf(const Values& given) {
    TaskRequest request;
    request.command = "UNINSTALL";
    request.product = given.text(kProduct);
    request.isForced = given.flag(kForce);
    return request;
}

ExitStatus run(const Invocation& invocation) {
    const TaskRequest request = requestOf(invocation.given);
    QueuedCommand command = queuedCommand(invocation, request, "uninstall " + request.product);
    command.isVerified = !invocation.given.flag(kNoVerify);
    return runQueued(invocation, command);
}

}  // namespace

constexpr Verb kUninstallVerb = {
    "uninstall", "Remove a product",
    kArguments,  {"zavctl uninstall ux", "zavctl uninstall ux --no-wait --transid cleanup-7"},
    run,         requestOf,
};

}  // namespace ctl

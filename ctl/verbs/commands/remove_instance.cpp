// remove-instance: removes one instance of a product.

#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/commands/queued.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kTargetName =
    positional("TARGET", "Managed system name").required().completedBy(Completion::Instance);
constexpr Argument kContext = textOption("--context", "Text for the translator's standard input");
constexpr Argument kArguments[] = {kProduct, kTargetName, kContext, kNoWait, kTransid, kOnce};

TaskRequest requestOf(const Values& given) {
    TaskRequest request;
    request.command = "REMOVEINSTANCE";
    request.product = given.text(kProduct);
    request.targetmsn = given.text(kTargetName);
    request.context = given.text(kContext);
    return request;
}

ExitStatus run(const Invocation& invocation) {
    const TaskRequest request = requestOf(invocation.given);
    const std::string title = "remove-instance " + request.product + " " + request.targetmsn;
    return runQueued(invocation, queuedCommand(invocation, request, title));
}

}  // namespace

constexpr Verb kRemoveInstanceVerb = {
    "remove-instance",
    "Remove one instance of a product",
    kArguments,
    {"zavctl remove-instance ux db1:myhost:UX",
     "zavctl remove-instance ux db1:myhost:UX --context INSTANCE=db1"},
    run,
    requestOf,
};

}  // namespace ctl

// start, stop, restart.

#include "ctl/client/failure.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/commands/queued.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kInstance = textOption("--instance", "Name of the instance itself")
                                   .without("--target")
                                   .completedBy(Completion::Instance);
constexpr Argument kStartArguments[] = {
    kProduct, kTarget.without("--instance"), kInstance, kForce, kNoVerify, kNoWait, kTransid,
    kOnce};
/// --instance is known only to say that --target takes its place.
constexpr Argument kArguments[] = {kProduct,  kTarget, kInstance.hidden(), kForce,
                                   kNoVerify, kNoWait, kTransid,           kOnce};

TaskRequest requestOf(const Values& given, const std::string& command) {
    TaskRequest request;
    request.command = command;
    request.product = given.text(kProduct);
    request.targetmsn = given.text(kTarget);
    request.isForced = given.flag(kForce);
    return request;
}

ExitStatus send(const Invocation& invocation, const TaskRequest& request, const std::string& name) {
    QueuedCommand command = queuedCommand(invocation, request, name + " " + request.product);
    command.isVerified = !invocation.given.flag(kNoVerify);
    return runQueued(invocation, command);
}

TaskRequest startRequest(const Values& given) {
    TaskRequest request = requestOf(given, "START");
    if (const std::string& instance = given.text(kInstance); !instance.empty()) {
        request.optional = "INSTANCE";
        request.targetmsn = instance;
    }
    return request;
}

ExitStatus start(const Invocation& invocation) {
    return send(invocation, startRequest(invocation.given), "start");
}

/// Only START has a way to name an instance outright. The others resolve a managed system name.
TaskRequest targetRequest(const Values& given, const std::string& command,
                          const std::string& name) {
    if (!given.text(kInstance).empty()) {
        throw Failure(kWrongUsage, name + " takes --target, not --instance");
    }
    return requestOf(given, command);
}

TaskRequest stopRequest(const Values& given) {
    return targetRequest(given, "STOP", "stop");
}

TaskRequest restartRequest(const Values& given) {
    return targetRequest(given, "RESTART", "restart");
}

ExitStatus stop(const Invocation& invocation) {
    return send(invocation, stopRequest(invocation.given), "stop");
}

ExitStatus restart(const Invocation& invocation) {
    return send(invocation, restartRequest(invocation.given), "restart");
}

}  // namespace

constexpr Verb kStartVerb = {
    "start",         "Start an agent",
    kStartArguments, {"zavctl start ux", "zavctl start ux --instance db1"},
    start,           startRequest,
};

constexpr Verb kStopVerb = {
    "stop",     "Stop an agent",
    kArguments, {"zavctl stop ux", "zavctl stop ux --target db1:myhost:UX"},
    stop,       stopRequest,
};

constexpr Verb kRestartVerb = {
    "restart",  "Stop an agent and start it again",
    kArguments, {"zavctl restart ux", "zavctl --timeout 120 restart ux"},
    restart,    restartRequest,
};

}  // namespace ctl

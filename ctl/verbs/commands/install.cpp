#include "ctl/verbs/commands/install.h"

#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/tasks/task_page.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/commands/queued.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kDeployed = kProduct.completedBy(Completion::DepotProduct);
constexpr Argument kVersion = positional("VERSION", "Version, as in the depot")
                                  .required()
                                  .completedBy(Completion::DepotVersion);
constexpr Argument kCommand =
    positionals("COMMAND",
                "The install command, after --; |DEPLOYDIR|, |DEPOTDIR| and |TOVRINHOME|\n"
                "stand for the host's directories")
        .required()
        .foreign();
constexpr Argument kOptional =
    textOption("--optional", "Qualifier; any text asks for the translator's -setCMS step")
        .without("--restart");
constexpr Argument kRestart =
    flag("--restart", "The install restarts the host's agent process").without("--optional");
constexpr Argument kComplete =
    flag("--complete", "With --restart: wait for the host to come back and fetch the final outcome")
        .with("--restart");
constexpr Argument kArguments[] = {kDeployed, kVersion,  kCommand, kOptional, kRestart,
                                   kComplete, kNoVerify, kNoWait,  kTransid,  kOnce};

TaskRequest requestOf(const Values& given) {
    TaskRequest request;
    request.command = "INSTALL";
    request.product = given.text(kProduct);
    request.version = given.text(kVersion);
    request.context = joinedCommand(given.texts(kCommand));
    request.optional = given.flag(kRestart) ? "REQUIRES_RESTART" : given.text(kOptional);
    return request;
}

ExitStatus runWithRestart(const Invocation& invocation, const QueuedCommand& command) {
    const TaskResult result =
        askQueued(invocation, command, replyShown(command.title, invocation.format));
    Page page = showTask(command.title, result, invocation.format);
    const bool hasBegun =
        result.end == TaskResult::End::Outcome && returnCodeOf(result.events.back()) == 0;
    if (hasBegun && invocation.format == Format::Text) {
        page.out += "The install has begun; fetch its outcome with: zavctl complete-install\n";
    }
    return print(page);
}

ExitStatus run(const Invocation& invocation) {
    const Values& given = invocation.given;
    QueuedCommand command =
        queuedCommand(invocation, requestOf(given), "install " + given.text(kProduct));
    command.isVerified = !given.flag(kNoVerify);
    // The first outcome of an install that restarts the host says only that it has begun.
    const bool isSeenToItsEnd = !given.flag(kRestart) || given.flag(kComplete);
    if (isSeenToItsEnd || command.await == Await::Reply) return runQueued(invocation, command);
    command.await = Await::FirstOutcome;
    return runWithRestart(invocation, command);
}

}  // namespace

constexpr Verb kInstallVerb = {
    "install",
    "Install a product from the depot",
    kArguments,
    {"zavctl install ux 7.1 -- /bin/sh '|DEPLOYDIR|/install.sh' -h '|TOVRINHOME|'",
     "zavctl install ux 7.1 --restart --complete -- '|DEPLOYDIR|/setup.sh'"},
    run,
    requestOf,
};

std::string joinedCommand(const std::vector<std::string>& words) {
    std::string text;
    for (const std::string& word : words) {
        const bool quote = words.size() > 1 && word.find(' ') != std::string::npos &&
                           word.find_first_of("\"'\\") == std::string::npos;
        if (!text.empty()) text += ' ';
        text += quote ? '"' + word + '"' : word;
    }
    return text;
}

}  // namespace ctl

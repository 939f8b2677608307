#include "ctl/verbs/tasks/install.h"

#include "ctl/client/failure.h"
#include "ctl/client/install_outcome.h"
#include "ctl/client/row.h"
#include "ctl/show/running_clock.h"
#include "ctl/show/task_page.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/tasks/queued.h"
#include "ctl/verbs/tasks/verification.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kVersion =
    positional("VERSION", "Version, as in the depot").required().completedBy(Completion::DepotFile);
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
constexpr Argument kArguments[] = {kProduct,  kVersion,  kCommand, kOptional, kRestart,
                                   kComplete, kNoVerify, kNoWait,  kTransid};

TaskRequest requestOf(const Values& given) {
    TaskRequest request;
    request.command = "INSTALL";
    request.product = given.text(kProduct);
    request.version = given.text(kVersion);
    request.context = joinedCommand(given.texts(kCommand));
    request.optional = given.flag(kRestart) ? "REQUIRES_RESTART" : given.text(kOptional);
    return request;
}

TaskResult resultOf(const Task& task, TaskResult::End end) {
    TaskResult result{end, task.reply(), task.events(), task.elapsed()};
    if (end == TaskResult::End::Outcome) result.record = task.record();
    return result;
}

/// Waits for the first outcome. It must come: without it nothing is known of the install.
void awaitBegin(Task& task) {
    switch (task.awaitOutcome()) {
        case EventStream::Result::Event:
            return;
        case EventStream::Result::Ended:
            throw Failure(kNoHost, "the host went away");
        case EventStream::Result::TimedOut:
            throw Failure(kNoOutcome, "no outcome within the time-out");
    }
}

/// Either the install restarts the host, which ends the stream, or it leaves it running and a
/// second outcome comes. Both mean that the install's own result is on record, or soon will be.
void awaitRestart(Task& task) {
    if (task.awaitOutcome() == EventStream::Result::TimedOut) {
        throw Failure(kNoOutcome, "the install was not over within the time-out");
    }
}

CompletedInstall askCompleted(const Invocation& invocation, const QueuedCommand& command) {
    const std::string& title = command.title;
    const Verification verification(invocation.host, command.request, command.isVerified);
    TaskRequest request = command.request;
    if (request.transid.empty()) request.transid = makeTransid();
    const InterruptNote note = interruptNote(request.transid, invocation.format);
    RunningClock clock(title, invocation.format == Format::Text);
    const Ticker tick = [&clock] { clock.tick(); };
    Task task(invocation.host, request, tick);
    if (!task.submit(true)) return {resultOf(task, TaskResult::End::Refused), {}};
    awaitBegin(task);
    if (returnCodeOf(task.events().back()) != 0) {
        return {resultOf(task, TaskResult::End::Outcome), {}};
    }
    if (invocation.format == Format::Text) {
        clock.erase();
        print({title + ": begun\n", {}});
    }
    awaitRestart(task);
    json completion = fetchInstallOutcome(invocation.host.socket, task.deadline(), tick);
    CompletedInstall install{resultOf(task, TaskResult::End::Outcome), std::move(completion)};
    if (returnCodeOf(install.completion) == 0) verification.check(install.task);
    return install;
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
    // The first outcome of an install that restarts the host says only that it has begun.
    const bool isSeenToItsEnd = !given.flag(kRestart) || given.flag(kComplete);
    command.isVerified = isSeenToItsEnd && !given.flag(kNoVerify);
    if (!given.flag(kRestart)) return runQueued(invocation, command);
    if (!given.flag(kComplete) || given.flag(kNoWait)) return runWithRestart(invocation, command);
    return print(
        showCompletedInstall(command.title, askCompleted(invocation, command), invocation.format));
}

}  // namespace

constexpr Verb kInstallVerb = {
    "install",
    "Install a product from the depot",
    kArguments,
    {"zavctl install ux 7.1 -- /bin/sh '|DEPLOYDIR|/install.sh' -h '|TOVRINHOME|'",
     "zavctl install ux 7.1 --restart --complete -- '|DEPLOYDIR|/setup.sh'"},
    run,
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

Page showCompletedInstall(const std::string& title, const CompletedInstall& install,
                          Format format) {
    const TaskResult& task = install.task;
    if (install.completion.is_null()) {
        Page page = showTask(title, task, format);
        if (format == Format::Text && task.end == TaskResult::End::Refused) {
            page.out = replyLine(title, task.reply);
        }
        return page;
    }
    Page page = showOutcome(title, install.completion, task.elapsed, Format::Text);
    addDoubts(page, title, task);
    if (format == Format::Text) return page;
    json document = taskDocument(task);
    document["completion"] = install.completion;
    page.out = jsonText(document);
    return page;
}

}  // namespace ctl

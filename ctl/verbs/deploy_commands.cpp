#include "ctl/verbs/deploy_commands.h"

#include <cstdio>
#include <thread>

#include "ctl/client/failure.h"
#include "ctl/show/rows.h"

using nlohmann::json;

namespace ctl {
namespace {

TaskRequest completeRequest(const std::string& transid) {
    TaskRequest request;
    request.command = "COMPLETE_INSTALL";
    request.transid = transid;
    return request;
}

/// The wrapper script writes its result last, so while it runs there is none to be found.
bool isNotThereYet(const json& row) {
    const std::string parameter = textOf(row, "RETMSGPARM");
    const std::string ending = ",NOTFOUND";
    return parameter.size() >= ending.size() &&
           parameter.compare(parameter.size() - ending.size(), ending.size(), ending) == 0;
}

/// Asks until the host is there and knows the outcome, or the deadline passes.
json fetchOutcome(const Options& options, Deadline deadline) {
    RunningClock clock("complete-install", !options.json);
    const HostClient client(options.socket);
    json last;
    while (std::chrono::steady_clock::now() < deadline) {
        try {
            const json rows = client.query("KAGREQT", completeRequest(makeTransid()).conditions(),
                                           deadline, [&clock] { clock.tick(); });
            if (!rows.empty()) last = rows.front();
            if (!last.is_null() && !isNotThereYet(last)) return last;
        } catch (const Failure& failure) {
            if (failure.status() != kNoHost)
                throw;  // a host that restarts is not there for a while
        }
        clock.tick();
        std::this_thread::sleep_for(std::chrono::milliseconds(500));
    }
    if (last.is_null()) throw Failure(kNoOutcome, "the host did not come back within the time-out");
    return last;
}

int complete(const Options& options, Task& task, const std::string& title) {
    // Either the install restarts the host, which ends the stream, or it leaves it running and a
    // second outcome comes. Both mean that the install's own result is, or soon will be, on record.
    if (task.awaitOutcome() == EventStream::Result::TimedOut) {
        throw Failure(kNoOutcome, "the install was not over within the time-out");
    }
    const json row = fetchOutcome(options, task.deadline());
    const int status = reportOutcome(options, title, row, task.clock().elapsed());
    if (options.json) {
        printJson({{"reply", task.reply()}, {"events", task.events()}, {"completion", row}});
    }
    return status;
}

}  // namespace

int runCompleteInstall(const Options& options, const std::string& transid) {
    Task task(options, completeRequest(transid), "complete-install");
    const json row = task.askNow();
    if (options.json) {
        printJson(row);
        return returnCodeOf(row) == 0 ? kSuccess : kHostReportedFailure;
    }
    return reportOutcome(options, "complete-install", row, task.clock().elapsed());
}

int runRestartInstall(const Options& options, const QueuedCommand& command, bool wantsCompletion) {
    if (!command.wait) return runQueued(options, command);
    if (!wantsCompletion) {
        const int status = runQueued(options, command);
        if (status == kSuccess && !options.json) {
            std::printf("The install has begun; fetch its outcome with: zavctl complete-install\n");
        }
        return status;
    }
    Task task(options, command.request, command.title);
    if (!task.submit(true)) {
        if (options.json) {
            printTaskDocument(task);
        } else {
            std::printf("%s: refused; %s\n", command.title.c_str(),
                        describeRow(task.reply()).c_str());
        }
        return kHostReportedFailure;
    }
    const auto first = task.awaitOutcome();
    if (first == EventStream::Result::TimedOut) {
        throw Failure(kNoOutcome, "no outcome within the time-out");
    }
    if (first == EventStream::Result::Ended) throw Failure(kNoHost, "the host went away");
    if (returnCodeOf(task.lastEvent()) != 0) {
        if (options.json) printTaskDocument(task);
        return reportOutcome(options, command.title, task.lastEvent(), task.clock().elapsed());
    }
    if (!options.json) std::printf("%s: begun\n", command.title.c_str());
    std::fflush(stdout);
    return complete(options, task, command.title);
}

}  // namespace ctl

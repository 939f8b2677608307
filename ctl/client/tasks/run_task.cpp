#include "ctl/client/tasks/run_task.h"

#include "ctl/client/failure.h"
#include "ctl/client/row.h"
#include "ctl/client/tasks/install_outcome.h"
#include "ctl/client/tasks/journal_task.h"
#include "ctl/client/tasks/queried_task.h"

using nlohmann::json;

namespace ctl {
namespace {

using Wait = JournalTask::Wait;
using End = TaskResult::End;

json memberOf(const json& record, const char* name, const json& otherwise) {
    const auto found = record.find(name);
    return found != record.end() && found->type() == otherwise.type() ? *found : otherwise;
}

json replyOf(const json& record) {
    const auto reply = record.find("reply");
    return reply != record.end() ? *reply : json();
}

bool isRefusal(const json& reply) {
    return reply.is_object() && returnCodeOf(reply) != 0;
}

/// How a task ended that is over.
End endOf(const json& record, const json& events) {
    const std::string state = textOf(record, "state");
    if (state == "refused" && isRefusal(replyOf(record))) return End::Refused;
    if ((state != "done" && state != "failed") || events.empty()) return End::Over;
    // A row may say no more than that an install has begun; why it failed stands elsewhere then.
    const bool isBelied =
        state == "failed" && returnCodeOf(events.back()) == 0 && !textOf(record, "reason").empty();
    return isBelied ? End::Over : End::Outcome;
}

TaskResult resultOf(const JournalTask& task, Wait wait) {
    TaskResult result;
    result.record = task.record();
    result.reply = replyOf(result.record);
    result.events = memberOf(result.record, "events", json::array());
    result.elapsed = task.elapsed();
    if (task.isOver()) {
        result.end = endOf(result.record, result.events);
    } else if (wait == Wait::Reached) {
        result.end = result.events.empty() ? End::Accepted : End::Outcome;
    } else {
        result.end = wait == Wait::TimedOut ? End::TimedOut : End::HostGone;
    }
    return result;
}

/// Tells of the reply once, and again if what had been accepted is refused later.
class ReplyTeller {
public:
    ReplyTeller(const JournalTask& task, const TaskWatch& watch) : task_(task), watch_(watch) {}

    void tell() {
        if (!watch_.onReply) return;
        const json reply = replyOf(task_.record());
        const bool isRefused = isRefusal(reply);
        if (isTold_ && (!isRefused || isRefusalTold_)) return;
        // A guard that refused it when its turn came leaves no reply.
        const bool isHeldBack = !isTold_ && reply.is_null() && task_.isOver() &&
                                textOf(task_.record(), "state") == "refused";
        if (!isHeldBack) watch_.onReply(reply);
        isTold_ = true;
        isRefusalTold_ = isRefused;
    }

private:
    const JournalTask& task_;
    const TaskWatch& watch_;
    bool isTold_ = false;
    bool isRefusalTold_ = false;
};

/// Waits for the end. Most commands are over within the first second, and whether such a one was
/// refused is known when its first line is shown.
Wait awaitEnd(JournalTask& task, ReplyTeller& reply, const TaskWatch& watch) {
    Wait wait = task.glance();
    reply.tell();
    while (watch.onOutput && wait == Wait::Reached && !task.streamOutput() && !task.isOver())
        wait = task.glance();
    if (wait == Wait::Reached) wait = task.awaitEnd();
    reply.tell();
    return wait;
}

/// What is said of a task that nobody waits for, however far it is.
TaskResult acceptanceOf(const JournalTask& task) {
    TaskResult result = resultOf(task, Wait::Reached);
    if (textOf(result.record, "state") == "refused") return result;
    result.end = End::Accepted;
    result.events = json::array();
    return result;
}

bool hasBegun(const json& record) {
    const json events = memberOf(record, "events", json::array());
    return !events.empty() && returnCodeOf(events.front()) == 0;
}

TaskResult awaitFirstOutcome(JournalTask& task, ReplyTeller& reply) {
    const Wait wait = task.awaitFirstOutcome();
    reply.tell();
    return resultOf(task, wait);
}

/// The row with the own result of an install that ended while the host was away, which the host
/// keeps no row of. Asking for it changes nothing. One that says otherwise than the host is of
/// another install, or of none.
void takeCompletion(const HostAddress& host, std::chrono::milliseconds time, TaskResult& result) {
    const std::string state = textOf(result.record, "state");
    if (state != "done" && state != "failed") return;
    try {
        const TaskRequest request = completeInstallRequest(makeTransid());
        const json rows = HostClient(host.socket).query(request.query(), deadlineIn(time)).rows;
        if (rows.empty() || (returnCodeOf(rows.front()) == 0) != (state == "done")) return;
        result.completion = rows.front();
        result.end = End::Outcome;
    } catch (const Failure&) {
        // How the install ended is known without it.
    }
}

/// An install that restarts the host, to its own end.
TaskResult awaitCompletion(const HostAddress& host, JournalTask& task, ReplyTeller& reply,
                           const TaskWatch& watch) {
    TaskResult result = awaitFirstOutcome(task, reply);
    if (result.end != End::Outcome || !hasBegun(result.record)) return result;
    if (watch.onBegun) watch.onBegun();
    result = resultOf(task, awaitEnd(task, reply, watch));
    if (result.events.size() > 1) {
        result.completion = result.events.back();
    } else if (task.isOver()) {
        takeCompletion(host, task.left(), result);
    }
    return result;
}

TaskResult awaitAccepted(const HostAddress& host, JournalTask& task, Await await, bool isRestart,
                         const TaskWatch& watch) {
    if (watch.onAccepted) watch.onAccepted(textOf(task.record(), "id"));
    ReplyTeller reply(task, watch);
    switch (await) {
        case Await::Reply:
            task.awaitReply();
            reply.tell();
            return acceptanceOf(task);
        case Await::FirstOutcome:
            return isRestart ? awaitFirstOutcome(task, reply)
                             : resultOf(task, awaitEnd(task, reply, watch));
        case Await::End:
            break;
    }
    return isRestart ? awaitCompletion(host, task, reply, watch)
                     : resultOf(task, awaitEnd(task, reply, watch));
}

}  // namespace

TaskResult runTask(const HostAddress& host, const TaskRequest& request, Await await,
                   const TaskWatch& watch) {
    JournalTask task(host, watch);
    if (task.submit(request, await != Await::Reply)) {
        return awaitAccepted(host, task, await, restartsHost(request), watch);
    }
    if (request.isOnce) {
        throw Failure(kHostReportedFailure,
                      "this host keeps no tasks, so it would not know a repetition again",
                      "Nothing was sent. Leave --once out to send it all the same.");
    }
    return runQueried(host, request, await, watch);
}

TaskResult followTask(const HostAddress& host, const std::string& name, const TaskWatch& watch) {
    JournalTask task(host, watch);
    task.find(name);
    if (watch.onAccepted) watch.onAccepted(textOf(task.record(), "id"));
    ReplyTeller reply(task, watch);
    return resultOf(task, awaitEnd(task, reply, watch));
}

}  // namespace ctl

#include "ctl/client/tasks/queried_task.h"

#include <utility>

#include "ctl/client/failure.h"
#include "ctl/client/http/bounded_json.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/row.h"
#include "ctl/client/tasks/install_outcome.h"

using nlohmann::json;

namespace ctl {
namespace {

TaskResult::End endOf(EventStream::Result result) {
    switch (result) {
        case EventStream::Result::Event:
            return TaskResult::End::Outcome;
        case EventStream::Result::Ended:
            return TaskResult::End::HostGone;
        case EventStream::Result::TimedOut:
            break;
    }
    return TaskResult::End::TimedOut;
}

TaskResult resultOf(const Task& task, TaskResult::End end) {
    TaskResult result;
    result.end = end;
    result.reply = task.reply();
    result.events = task.events();
    result.elapsed = task.elapsed();
    if (end == TaskResult::End::Outcome) result.record = task.record();
    return result;
}

/// Either the install restarts the host, which ends the stream, or it leaves it running and a
/// second outcome comes. Both mean that the install's own result is on record, or soon will be.
void awaitRestart(Task& task) {
    if (task.awaitOutcome() == EventStream::Result::TimedOut) {
        throw Failure(kNoOutcome, "the install was not over within the time-out");
    }
}

}  // namespace

Task::Task(const HostAddress& host, TaskRequest request, Ticker tick)
    : socket_(host.socket),
      deadline_(deadlineIn(host.timeout)),
      request_(std::move(request)),
      tick_(std::move(tick)) {
    if (request_.transid.empty()) request_.transid = makeTransid();
}

QueryAnswer Task::askNow() {
    QueryAnswer answer = HostClient(socket_).query(request_.query(), deadline_, tick_);
    if (answer.rows.empty()) {
        // The reply repeats the request's values and is filtered by them like any row.
        throw Failure(kHostReportedFailure,
                      "the host's reply holds another value than the request, so it is not known "
                      "what became of it: the host cuts text with many characters beyond ASCII");
    }
    return answer;
}

bool Task::submit(bool subscribe) {
    if (subscribe) {
        stream_ = std::make_unique<EventStream>(
            socket_, "KAGDYST",
            std::vector<std::pair<std::string, std::string>>{{"TRANSID", request_.transid}},
            deadline_);
    }
    reply_ = std::move(askNow().rows.front());
    return returnCodeOf(reply_) == 0;
}

EventStream::Result Task::awaitOutcome() {
    ServerEvent event;
    for (;;) {
        const auto result = stream_->next(deadline_, event, tick_);
        if (result != EventStream::Result::Event) return result;
        json row = objectIn(event.data);
        if (event.type != "message" || !row.is_object()) continue;
        events_.push_back(std::move(row));
        return result;
    }
}

json Task::record() const {
    // The outcome may be seen here before the host has closed its record. An install that restarts
    // the host stays open after its first outcome, so it is not waited for.
    const bool staysOpen = restartsHost(request_);
    const std::string path =
        "/v1/tasks/" + percentEncoded(request_.transid) + (staysOpen ? "" : "?wait=5");
    try {
        json record = HostClient(socket_).getIfThere(path, deadline_);
        return record.is_object() ? record : json();
    } catch (const Failure&) {
        return nullptr;  // how the task ended is known without it
    }
}

std::chrono::milliseconds Task::elapsed() const {
    return std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() -
                                                                 begin_);
}

TaskResult runQueried(const HostAddress& host, const TaskRequest& request, Await await,
                      const TaskWatch& watch) {
    Task task(host, request, watch.tick);
    const bool accepted = task.submit(await != Await::Reply);
    if (watch.onReply) watch.onReply(task.reply());
    if (!accepted) return resultOf(task, TaskResult::End::Refused);
    if (await == Await::Reply) return resultOf(task, TaskResult::End::Accepted);
    TaskResult result = resultOf(task, endOf(task.awaitOutcome()));
    const bool hasBegun = await == Await::End && restartsHost(request) &&
                          result.end == TaskResult::End::Outcome &&
                          returnCodeOf(result.events.back()) == 0;
    if (!hasBegun) return result;
    if (watch.onBegun) watch.onBegun();
    awaitRestart(task);
    json completion = fetchInstallOutcome(host.socket, task.deadline(), watch.tick);
    result = resultOf(task, TaskResult::End::Outcome);
    result.completion = std::move(completion);
    return result;
}

}  // namespace ctl

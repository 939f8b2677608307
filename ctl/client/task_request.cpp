#include "ctl/client/task_request.h"

#include <unistd.h>

#include <cstdio>
#include <random>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/show/rows.h"

using nlohmann::json;

namespace ctl {
namespace {

Deadline deadlineOf(const Options& options) {
    return std::chrono::steady_clock::now() + options.timeout();
}

void say(const Options& options, const std::string& line) {
    if (options.json) return;
    std::printf("%s\n", line.c_str());
    std::fflush(stdout);
}

}  // namespace

std::vector<Condition> TaskRequest::conditions() const {
    const std::pair<const char*, const std::string*> columns[] = {
        {"COMMAND", &command},   {"TRANSID", &transid},   {"PRODUCT", &product},
        {"CONTEXT", &context},   {"OPTIONAL", &optional}, {"UACONFIG", &uaconfig},
        {"UASCRIPT", &uascript}, {"VERSION", &version},   {"TARGETMSN", &targetmsn},
    };
    std::vector<Condition> where;
    for (const auto& [column, value] : columns) {
        if (!value->empty()) where.push_back({column, "=", *value});
    }
    return where;
}

std::string makeTransid() {
    std::random_device random;
    char text[80];
    std::snprintf(text, sizeof text, "zavctl-%ld-%08x%08x", static_cast<long>(::getpid()), random(),
                  random());
    return text;
}

Task::Task(const Options& options, TaskRequest request, std::string title)
    : options_(options),
      request_(std::move(request)),
      deadline_(deadlineOf(options)),
      clock_(std::move(title), !options.json),
      client_(options.socket) {
    if (request_.transid.empty()) request_.transid = makeTransid();
}

json Task::askNow() {
    const json rows =
        client_.query("KAGREQT", request_.conditions(), deadline_, [this] { clock_.tick(); });
    clock_.erase();
    if (rows.empty()) {
        // The reply repeats the request's values and passes only when they are the same.
        throw Failure(kHostReportedFailure,
                      "the host's reply holds another value than the request, so it is not known "
                      "what became of it: the host cuts text with many characters beyond ASCII");
    }
    return rows.front();
}

bool Task::submit(bool subscribe) {
    if (subscribe) {
        stream_ = std::make_unique<EventStream>(
            options_.socket, "KAGDYST",
            std::vector<std::pair<std::string, std::string>>{{"TRANSID", request_.transid}},
            deadline_);
    }
    reply_ = askNow();
    return returnCodeOf(reply_) == 0;
}

EventStream::Result Task::awaitOutcome() {
    ServerEvent event;
    for (;;) {
        const auto result = stream_->next(deadline_, event, [this] { clock_.tick(); });
        clock_.erase();
        if (result != EventStream::Result::Event) return result;
        json row = json::parse(event.data, nullptr, false);
        if (event.type != "message" || !row.is_object()) continue;
        events_.push_back(std::move(row));
        return result;
    }
}

int reportOutcome(const Options& options, const std::string& title, const json& row,
                  const std::string& elapsed) {
    const bool ok = returnCodeOf(row) == 0;
    std::string line = title + (ok ? ": done after " : ": failed after ") + elapsed;
    // A restart whose stop failed and whose start succeeded is a success with a message.
    if (!ok || !textOf(row, "RETMSGID").empty()) line += "; " + describeRow(row);
    say(options, line);
    return ok ? kSuccess : kHostReportedFailure;
}

void printTaskDocument(const Task& task) {
    printJson({{"reply", task.reply()}, {"events", task.events()}});
}

int runQueued(const Options& options, const QueuedCommand& command) {
    Task task(options, command.request, command.title);
    int status = kSuccess;
    if (!task.submit(command.wait)) {
        say(options, command.title + ": refused; " + describeRow(task.reply()));
        status = kHostReportedFailure;
    } else {
        say(options, command.title + ": accepted");
        if (command.wait) {
            switch (task.awaitOutcome()) {
                case EventStream::Result::Event:
                    status = reportOutcome(options, command.title, task.lastEvent(),
                                           task.clock().elapsed());
                    break;
                case EventStream::Result::Ended:
                    std::fprintf(stderr, "zavctl: the host went away before the outcome came\n");
                    status = kNoHost;
                    break;
                case EventStream::Result::TimedOut:
                    std::fprintf(stderr, "zavctl: no outcome within the time-out\n");
                    status = kNoOutcome;
                    break;
            }
        }
    }
    if (options.json) printTaskDocument(task);
    return status;
}

}  // namespace ctl

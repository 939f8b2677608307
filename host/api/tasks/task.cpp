// GET /v1/tasks/{id}

#include <algorithm>
#include <atomic>
#include <memory>

#include "host/api/route.h"
#include "host/api/services.h"
#include "host/api/tasks/task_document.h"
#include "http/responder.h"

namespace host {
namespace {

constexpr long long kLongestTaskWait = 24 * 60 * 60;  // seconds

http::Reply replyAbout(const std::string& name, const Services& services, Outputs outputs) {
    const std::optional<Task> task = services.tasks.find(name);
    if (!task)
        return http::errorReply(404, "there is no task \"" + services.codePage.toUtf8(name) + '"');
    return taskReply(200, *task, services, outputs);
}

/// Answers when the task is over or the time is.
http::Later waitFor(const std::string& id, std::chrono::seconds time, Services& services,
                    Outputs outputs) {
    const auto waiter = std::make_shared<std::atomic<std::uint64_t>>(0);
    const auto begin = [id, waiter, &services, outputs](const http::Responder& responder) {
        *waiter = services.tasks.awaitEnd(id, [responder, &services, outputs](const Task& task) {
            responder(taskReply(200, task, services, outputs));
        });
    };
    const auto atLimit = [id, waiter, &services, outputs]() -> http::Answer {
        services.tasks.cancel(*waiter);
        return replyAbout(id, services, outputs);
    };
    return {begin, time, atLimit};
}

}  // namespace

Endpoint getTask;

http::Answer getTask(Services& services, const Call& call) {
    const std::string& given = call.required("id");
    const std::string name = services.codePage.fromUtf8(given).value_or(given);
    const std::optional<Task> task = services.tasks.find(name);
    const long long seconds = std::min(call.number("wait", 0), kLongestTaskWait);
    const Outputs outputs = outputsFor(call.peer());
    if (!task || isOver(task->state) || seconds == 0) return replyAbout(name, services, outputs);
    return waitFor(task->id, std::chrono::seconds(seconds), services, outputs);
}

}  // namespace host

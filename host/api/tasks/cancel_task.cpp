// POST /v1/tasks/{id}/cancel

#include <atomic>
#include <memory>

#include "host/api/route.h"
#include "host/api/services.h"
#include "host/api/tasks/task_document.h"
#include "http/responder.h"

namespace host {
namespace {

/// Commands have ten seconds to end, and the plug-in may take a moment between two of them.
constexpr std::chrono::seconds kLongestCancelWait{30};

http::Reply noSuchTask(const std::string& given) {
    return http::errorReply(404, "there is no task \"" + given + '"');
}

http::Reply overAlready(const Task& task) {
    return http::errorReply(
        409, "task " + task.id + " is over already: " + std::string(nameOf(task.state)));
}

http::Reply inPlugin(const Task& task) {
    return http::errorReply(409,
                            "task " + task.id +
                                " waits in the plug-in, which cannot be told to forget it; once it "
                                "runs it can be cancelled");
}

/// The end of a task that was to be cancelled.
http::Reply endReply(const Task& task, const Services& services) {
    if (task.state == TaskState::Cancelled) return taskReply(200, task, services, Outputs::Shown);
    return http::errorReply(409, "too late: no signal reached a command of task " + task.id +
                                     ", which ended as " + std::string(nameOf(task.state)));
}

/// Answers with the end of the task; when that takes too long, with the task as it is.
http::Later endInHand(const Task& task, Services& services) {
    const auto waiter = std::make_shared<std::atomic<std::uint64_t>>(0);
    const auto begin = [id = task.id, waiter, &services](const http::Responder& responder) {
        *waiter = services.tasks.awaitEnd(
            id, [responder, &services](const Task& over) { responder(endReply(over, services)); });
    };
    const auto atLimit = [task, waiter, &services]() -> http::Answer {
        services.tasks.cancel(*waiter);
        const std::optional<Task> now = services.tasks.find(task.id);
        if (!now) return noSuchTask(task.id);
        return isOver(now->state) ? endReply(*now, services)
                                  : taskReply(202, *now, services, Outputs::Shown);
    };
    return {begin, kLongestCancelWait, atLimit};
}

}  // namespace

Endpoint cancelTask;

http::Answer cancelTask(Services& services, const Call& call) {
    const std::string& given = call.required("id");
    const std::string name = services.codePage.fromUtf8(given).value_or(given);
    const std::optional<Task> found = services.tasks.find(name);
    if (!found) return noSuchTask(given);
    const Journal::Cancel result = services.journal.cancel(found->number);
    if (result == Journal::Cancel::Asked) {
        services.tasks.endCommandsOf(found->number);
        return endInHand(*found, services);
    }
    const std::optional<Task> task = services.tasks.find(found->id);
    if (!task || result == Journal::Cancel::Unknown) return noSuchTask(given);
    if (result == Journal::Cancel::InPlugin) return inPlugin(*task);
    if (result == Journal::Cancel::Over) return overAlready(*task);
    services.tasks.hasEnded(*task);
    return taskReply(200, *task, services, Outputs::Shown);
}

}  // namespace host

// POST /v1/tasks/{id}/cancel

#include "host/api/call.h"
#include "host/api/services.h"
#include "host/api/task_document.h"

namespace host {
namespace {

/// Why a task that does not wait in the journal cannot be cancelled.
std::string hindrance(const Task& task) {
    if (isOver(task.state)) {
        return "task " + task.id + " is over already: " + std::string(nameOf(task.state));
    }
    return "task " + task.id + " has been handed to the plug-in, which cannot be told to forget it";
}

}  // namespace

Endpoint cancelTask;

Answer cancelTask(Services& services, const Call& call) {
    const std::string& given = call.required("id");
    const std::string name = services.codePage.fromUtf8(given).value_or(given);
    const std::optional<Task> task = services.tasks.find(name);
    if (!task) return errorReply(404, "there is no task \"" + given + '"');
    const bool cancelled = services.journal.cancel(task->number);
    const std::optional<Task> now = services.tasks.find(task->id);
    if (!now) return errorReply(404, "there is no task \"" + given + '"');
    if (!cancelled) return errorReply(409, hindrance(*now));
    services.tasks.hasEnded(*now);
    return jsonReply(200, taskDocument(*now, services));
}

}  // namespace host

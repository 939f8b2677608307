// GET /v1/tasks

#include <algorithm>
#include <nlohmann/json.hpp>

#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/api/tasks/task_document.h"
#include "host/api/time_text.h"
#include "routes/bad_request.h"

namespace host {
namespace {

constexpr long long kUsualListed = 100;
constexpr long long kMostTasks = 1000;

TaskState stateNamed(const std::string& name) {
    std::string known;
    for (const auto& [state, text] : kTaskStates) {
        if (text == name) return state;
        known += known.empty() ? "" : ", ";
        known += text;
    }
    throw routes::BadRequest("there is no state \"" + name + "\" but " + known);
}

/// The value in the code page of the tables. What that cannot say, no task has been asked with.
std::optional<std::string> valueOf(const Call& call, const char* name, const CodePage& codePage) {
    const std::string* const text = call.text(name);
    if (text == nullptr) return std::nullopt;
    return codePage.fromUtf8(*text).value_or(std::string("\xFF"));
}

TaskFilter filterOf(const Call& call, const CodePage& codePage) {
    TaskFilter filter;
    if (const std::string* const state = call.text("state")) filter.state = stateNamed(*state);
    filter.product = valueOf(call, "product", codePage);
    filter.command = valueOf(call, "command", codePage);
    if (const std::string* const since = call.text("since")) filter.since = timeOf(*since);
    if (call.text("after") != nullptr) filter.before = call.number("after", 0);
    filter.limit =
        static_cast<std::size_t>(std::min(call.number("limit", kUsualListed), kMostTasks));
    return filter;
}

}  // namespace

Endpoint getTasks;
Schema taskListSchema, taskSummarySchema;

http::Answer getTasks(Services& services, const Call& call) {
    TaskFilter filter = filterOf(call, services.codePage);
    const std::size_t limit = filter.limit++;  // one more shows whether there is more
    std::vector<Task> found = services.tasks.newest(filter);
    nlohmann::ordered_json next = nullptr;
    if (found.size() > limit) {
        found.resize(limit);
        if (!found.empty()) next = found.back().number;
    }
    nlohmann::ordered_json tasks = nlohmann::ordered_json::array();
    for (const Task& task : found)
        tasks.push_back(taskSummary(task, services.codePage));
    const nlohmann::ordered_json document = {{"tasks", std::move(tasks)}, {"next", next}};
    return http::jsonReply(200,
                           document.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace));
}

nlohmann::ordered_json taskListSchema(Components& components) {
    const nlohmann::ordered_json tasks =
        shape::listOf("the tasks, newest first", components.ref(taskSummarySchema));
    return shape::object(
        "TaskList", "Some of the tasks.",
        {{"tasks", tasks},
         {"next", shape::orNull(shape::wholeNumber("the cursor for what follows; null if nothing "
                                                   "does"))}});
}

}  // namespace host

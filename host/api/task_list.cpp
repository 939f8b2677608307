// GET /v1/tasks

#include <nlohmann/json.hpp>

#include "host/api/call.h"
#include "host/api/services.h"
#include "host/api/task_document.h"
#include "host/tables/bad_request.h"

namespace host {
namespace {

constexpr long long kUsualLimit = 100;

TaskState stateNamed(const std::string& name) {
    std::string known;
    for (const auto& [state, text] : kTaskStates) {
        if (text == name) return state;
        known += known.empty() ? "" : ", ";
        known += text;
    }
    throw BadRequest("there is no state \"" + name + "\" but " + known);
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
    filter.limit = static_cast<std::size_t>(call.number("limit", kUsualLimit));
    return filter;
}

}  // namespace

Endpoint getTasks;

Answer getTasks(Services& services, const Call& call) {
    nlohmann::ordered_json tasks = nlohmann::ordered_json::array();
    for (const Task& task : services.tasks.newest(filterOf(call, services.codePage)))
        tasks.push_back(taskSummary(task, services.codePage));
    const nlohmann::ordered_json document = {{"tasks", std::move(tasks)}, {"next", nullptr}};
    return jsonReply(200, document.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace));
}

}  // namespace host

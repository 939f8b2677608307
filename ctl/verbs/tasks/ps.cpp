#include "ctl/verbs/tasks/ps.h"

#include <nlohmann/json.hpp>
#include <vector>

#include "ctl/client/host_client.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/row.h"
#include "ctl/client/tasks/task_list.h"
#include "ctl/show/tasks/task_record.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

/// More than any host lets wait.
constexpr std::size_t kMost = 1'000'000;

std::vector<json> oldestFirst(const HostClient& client, const char* state, Deadline deadline) {
    const json list = listTasks(client, {state, {}, kMost}, deadline);
    const json& tasks = list.at("tasks");
    return {tasks.rbegin(), tasks.rend()};
}

ExitStatus run(const Invocation& invocation) {
    return print(
        showWork(askWork(invocation), std::chrono::system_clock::now(), invocation.format));
}

}  // namespace

constexpr Verb kPsVerb = {
    "ps", "Show what the host works at, and what waits for it",
    {},   {"zavctl ps", "zavctl --json ps"},
    run,
};

json askWork(const Invocation& invocation) {
    const HostClient client(invocation.host.socket);
    const Deadline deadline = invocation.deadline();
    json tasks = json::array();
    for (const json& summary : oldestFirst(client, "running", deadline)) {
        // The list has no processes. A task that is forgotten meanwhile is not at work any more.
        const std::string path = "/v1/tasks/" + percentEncoded(textOf(summary, "id"));
        json record = client.getIfThere(path, deadline);
        if (record.is_object()) tasks.push_back(std::move(record));
    }
    for (json& summary : oldestFirst(client, "queued", deadline))
        tasks.push_back(std::move(summary));
    return tasks;
}

Page showWork(const json& tasks, WallTime now, Format format) {
    if (format == Format::Json) return jsonPage({{"tasks", tasks}});
    if (tasks.empty()) return {"Nothing is at work.\n", {}};
    std::string text;
    for (const json& task : tasks)
        text += workText(task, now);
    return {text, {}};
}

}  // namespace ctl

#include "ctl/verbs/tasks/ps.h"

#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/row.h"
#include "ctl/show/task_record.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

ExitStatus run(const Invocation& invocation) {
    return print(
        showWork(askWork(invocation), std::chrono::system_clock::now(), invocation.format));
}

}  // namespace

constexpr Verb kPsVerb = {
    "ps", "Show what is at work on the host now", {}, {"zavctl ps", "zavctl --json ps"}, run,
};

json askWork(const Invocation& invocation) {
    const HostClient client(invocation.host.socket);
    const Deadline deadline = invocation.deadline();
    const json answer = client.getIfThere("/v1/tasks?state=running", deadline);
    const auto list = answer.find("tasks");
    if (list == answer.end() || !list->is_array()) {
        throw Failure(kHostReportedFailure, "this host does not list its tasks");
    }
    json tasks = json::array();
    for (auto summary = list->rbegin(); summary != list->rend(); ++summary) {
        // The list has no processes. A task that is forgotten meanwhile is not at work any more.
        const std::string path = "/v1/tasks/" + percentEncoded(textOf(*summary, "id"));
        json record = client.getIfThere(path, deadline);
        if (record.is_object()) tasks.push_back(std::move(record));
    }
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

#include "ctl/verbs/tasks/tasks.h"

#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/client/tasks/task_list.h"
#include "ctl/show/tasks/task_table.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"
#include "ctl/verbs/watched.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kState =
    textOption("--state",
               "Only those in this state: queued, running, done, failed, refused, cancelled,\n"
               "expired or interrupted")
        .completedBy(Completion::State);
constexpr Argument kOfProduct =
    textOption("--product", "Only those for this product").completedBy(Completion::Product);
constexpr Argument kLimit =
    numberOption("--limit", "At most so many").between(1, 1e6).otherwise("20");
constexpr Argument kArguments[] = {kState, kOfProduct, kLimit, kWatch};

TaskFilter filterOf(const Values& given) {
    return {given.text(kState), given.text(kOfProduct), given.number(kLimit)};
}

json askTasks(const Invocation& invocation) {
    return listTasks(HostClient(invocation.host.socket), filterOf(invocation.given),
                     invocation.deadline());
}

ExitStatus run(const Invocation& invocation) {
    const auto look = [&invocation] {
        json list = askTasks(invocation);
        Page page = showTasks(list, std::chrono::system_clock::now(), invocation.format);
        return Look{std::move(list), std::move(page)};
    };
    return invocation.given.flag(kWatch) ? watch(invocation, look) : print(look().page);
}

}  // namespace

constexpr Verb kTasksVerb = {
    "tasks",    "List what the host was asked for, and how it ended",
    kArguments, {"zavctl tasks --state failed", "zavctl tasks --product ux --limit 5 --watch"},
    run,
};

Page showTasks(const json& list, WallTime now, Format format) {
    if (format == Format::Json) return jsonPage(list);
    const json& tasks = list.at("tasks");
    if (tasks.empty()) return {"There are no such tasks.\n", {}};
    std::string text = taskTable(tasks, now);
    if (!list.at("next").is_null()) text += "There are more; see --limit.\n";
    return {text, {}};
}

}  // namespace ctl

#include "fleet/operator/verbs/looks/fleet_tasks.h"

#include <nlohmann/json.hpp>
#include <string>

#include "ctl/show/printable.h"
#include "ctl/show/tasks/task_table.h"
#include "ctl/verbs/invocation.h"
#include "fleet/bus/messages/question.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr ctl::Argument kTaskState = ctl::textOption("--state", "Only those in this state");
constexpr ctl::Argument kTaskProduct = ctl::textOption("--product", "Only those for this product");
constexpr ctl::Argument kTaskLimit =
    ctl::numberOption("--limit", "At most so many of each host").between(1, 1000).otherwise("20");
constexpr ctl::Argument kFleetTasksArguments[] = {kTaskState, kTaskProduct, kTaskLimit};

ctl::ExitStatus runFleetTasks(const ctl::Invocation& invocation) {
    const ctl::Values& given = invocation.given;
    OperatorSide side(invocation);
    Inquiry inquiry{kAsksTasks, {{"limit", given.number(kTaskLimit)}}};
    if (given.has(kTaskState)) inquiry.body["state"] = given.text(kTaskState);
    if (given.has(kTaskProduct)) inquiry.body["product"] = given.text(kTaskProduct);
    const Choice choice = chooseHosts(side.centre, given.text(kOn));
    const auto answers = askHosts(side.centre, side.identity, choice, inquiry, side.deadline);
    return ctl::print(showFleetTasks(answers, std::chrono::system_clock::now(), invocation.format));
}

/// A list of tasks as its table takes it.
json tasksIn(const json& answer) {
    json tasks = json::array();
    const auto found = answer.is_object() ? answer.find("tasks") : answer.end();
    if (found == answer.end() || !found->is_array()) return tasks;
    for (const json& task : *found) {
        if (task.is_object()) tasks.push_back(task);
    }
    return tasks;
}

}  // namespace

constexpr ctl::Verb kFleetTasksVerb = {
    "tasks",
    "List what many hosts were asked for, and how it ended",
    kFleetTasksArguments,
    {"zavctl --fleet https://centre.example tasks --on env=test --state failed",
     "zavctl --fleet https://centre.example --json tasks --on 'web-*' --limit 5"},
    runFleetTasks,
};

std::string troubleLines(const std::vector<HostAnswer>& answers) {
    std::string text;
    for (const HostAnswer& answer : answers) {
        if (!answer.trouble.empty())
            text += ctl::complaint(answer.host.name + ": " + answer.trouble);
    }
    return text;
}

ctl::Page showFleetTasks(const std::vector<HostAnswer>& answers, ctl::WallTime now,
                         ctl::Format format) {
    ctl::Page page;
    page.err = troubleLines(answers);
    if (!page.err.empty()) page.status = ctl::kHostReportedFailure;
    json hosts = json::array();
    for (const HostAnswer& answer : answers) {
        if (!answer.trouble.empty()) {
            hosts.push_back({{"host", answer.host.name}, {"error", answer.trouble}});
            continue;
        }
        const json tasks = tasksIn(answer.answer);
        hosts.push_back({{"host", answer.host.name}, {"tasks", tasks}});
        page.out += (page.out.empty() ? "" : "\n") + ctl::printable(answer.host.name) + "\n" +
                    (tasks.empty() ? "There are no such tasks.\n" : ctl::taskTable(tasks, now));
    }
    if (format == ctl::Format::Json) {
        return ctl::jsonPage({{"hosts", hosts}}, page.status);
    }
    return page;
}

}  // namespace fleet

#include "host/outcomes/task_counts.h"

#include "host/tables/plugin_facts.h"

namespace host {
namespace {

/// The plug-in's own, so that a made-up command makes no series of its own.
std::vector<std::string> commandNames() {
    std::vector<std::string> names;
    for (const plugin::QueuedCommand& command : plugin::kQueuedCommands)
        names.emplace_back(command.name);
    names.insert(names.end(), plugin::kCommandsAtOnce.begin(), plugin::kCommandsAtOnce.end());
    return names;
}

std::vector<std::string> endNames() {
    std::vector<std::string> names;
    for (const auto& [state, name] : kTaskStates) {
        if (isOver(state)) names.emplace_back(name);
    }
    return names;
}

/// From a start that finds the agent running to an install that takes an hour.
std::vector<metrics::Histogram::Duration> taskBounds() {
    using std::chrono::milliseconds;
    using std::chrono::seconds;
    return {milliseconds(100), milliseconds(500), seconds(1),    seconds(5),
            seconds(10),       seconds(30),       seconds(60),   seconds(120),
            seconds(300),      seconds(600),      seconds(1800), seconds(3600)};
}

}  // namespace

TaskCounts::TaskCounts()
    : ends_(commandNames(), endNames()), durations_(commandNames(), taskBounds()) {}

void TaskCounts::add(const Task& task) {
    const std::string_view command = task.value(plugin::kCommandColumn);
    ends_.at(command).at(nameOf(task.state)).add();
    if (task.started && task.ended) durations_.at(command).observe(*task.ended - *task.started);
}

}  // namespace host

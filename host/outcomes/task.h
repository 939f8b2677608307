/// A task: one request that the plug-in was given, and what became of it.
#pragma once

#include <array>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/commands/command.h"

namespace host {

enum class TaskState {
    Queued,
    Running,
    Done,
    Failed,   ///< RETVAL is not 0, or a command of it failed without the plug-in noticing
    Refused,  ///< by the plug-in's reply
};

inline constexpr std::array<std::pair<TaskState, std::string_view>, 5> kTaskStates = {
    {{TaskState::Queued, "queued"},
     {TaskState::Running, "running"},
     {TaskState::Done, "done"},
     {TaskState::Failed, "failed"},
     {TaskState::Refused, "refused"}}};

constexpr bool isOver(TaskState state) {
    return state != TaskState::Queued && state != TaskState::Running;
}

/// Texts and rows are in the local code page.
struct Task {
    std::string id;     ///< no two tasks have the same, not even of two runs of the host
    std::string asker;  ///< the user who asked
    /// The request table's columns that were asked with, by name, without what may be a secret.
    /// Long values are cut.
    std::vector<std::pair<std::string, std::string>> request;
    TaskState state = TaskState::Queued;
    WallClock::time_point accepted{};
    std::optional<WallClock::time_point> started;
    std::optional<WallClock::time_point> ended;
    std::string reply;                  ///< a row of the request table; empty: there is none
    std::vector<std::string> outcomes;  ///< rows of the outcome table
    std::vector<Command> commands;

    /// What was asked with in this column; empty if it was not given.
    std::string_view value(std::string_view column) const {
        for (const auto& [name, text] : request) {
            if (name == column) return text;
        }
        return {};
    }
};

}  // namespace host

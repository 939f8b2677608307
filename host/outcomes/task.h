/// A task: one request that was accepted, and what became of it.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "embedded/oxa_host.h"
#include "host/commands/command.h"

namespace host {

/// A task goes forward only: from Queued to Running or to an end, from Running to an end. The one
/// way back is a new start of the host, for what the plug-in had in its queue but did not begin.
/// The numbers are those of the journal.
enum class TaskState {
    Queued = 0,
    Running = 1,
    Done = 2,
    Failed = 3,       ///< RETVAL is not 0, or a command of it failed without the plug-in noticing
    Refused = 4,      ///< by the plug-in's reply, or by a guard at hand-over
    Cancelled = 5,    ///< never ran, or a signal ended its commands
    Expired = 6,      ///< its turn came too late
    Interrupted = 7,  ///< the host ended in the middle of it: it may have run in part
};

inline constexpr std::array<std::pair<TaskState, std::string_view>, 8> kTaskStates = {
    {{TaskState::Queued, "queued"},
     {TaskState::Running, "running"},
     {TaskState::Done, "done"},
     {TaskState::Failed, "failed"},
     {TaskState::Refused, "refused"},
     {TaskState::Cancelled, "cancelled"},
     {TaskState::Expired, "expired"},
     {TaskState::Interrupted, "interrupted"}}};

constexpr std::string_view nameOf(TaskState state) {
    return kTaskStates[static_cast<std::size_t>(state)].second;
}

constexpr bool isOver(TaskState state) {
    return state != TaskState::Queued && state != TaskState::Running;
}

/// How a task came to the plug-in. The numbers are those of the journal.
enum class TaskWay {
    Journal = 0,  ///< the host hands it over when its turn has come
    Query = 1,    ///< a query on the request table: the plug-in got it at once
    AtOnce = 2,   ///< a query whose command had been carried out with its answer
};

/// Texts and rows are in the local code page. Except for `conditions` of a task that is not over
/// there are no secrets in it: a configuration is left out, and what follows "password=" and the
/// like is "***".
struct Task {
    std::int64_t number = 0;  ///< in the order of acceptance; 0: not entered yet
    std::string id;           ///< no two tasks have the same, not even of two runs of the host
    std::string transid;      ///< as the outcome will have it
    std::string asker;        ///< the user who asked
    TaskWay way = TaskWay::Query;
    /// The request as it came; when the task is over, without what may be a secret and cut.
    std::vector<oxa::Predicate> conditions;
    /// The request table's columns that were asked with, by name, without what may be a secret.
    /// Long values are cut.
    std::vector<std::pair<std::string, std::string>> request;
    TaskState state = TaskState::Queued;
    bool answered = true;  ///< false: whether the plug-in accepts it is not known yet
    WallClock::time_point accepted{};
    std::optional<WallClock::time_point> started;
    std::optional<WallClock::time_point> ended;
    std::optional<WallClock::time_point> expires;  ///< it must have been handed over by then
    bool forced = false;                           ///< the guard on the inventory was passed by
    std::optional<std::int64_t> run;  ///< the run of the host that handed it to the plug-in
    std::string boot;                 ///< names the start of the machine in which that run was
    /// An install that may restart the host has begun; its second outcome is its end.
    bool begun = false;
    bool cancel = false;                ///< somebody wants it to be over, while it is in hand
    int interruptions = 0;              ///< unclean ends of the host in the middle of it
    std::optional<std::string> once;    ///< the content's hash: a repetition gets this task
    std::string reply;                  ///< a row of the request table; empty: there is none
    std::string reason;                 ///< why it ended as it did, where no row says so
    std::string guard;                  ///< the guard that refused it at hand-over
    std::string hint;                   ///< that guard's way out
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

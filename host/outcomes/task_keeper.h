/// Where tasks are kept: what a list of tasks needs of the journal.
#pragma once

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/outcomes/task.h"

namespace host {

/// A change could not be kept, so it has not happened; what() says why.
class NotKept : public std::runtime_error {
public:
    /// `guard` is the name of the guard without which the request would have gone on all the same;
    /// empty if it would not have.
    explicit NotKept(const std::string& reason, std::string guard = "")
        : std::runtime_error(reason), guard_(std::move(guard)) {}

    const std::string& guard() const { return guard_; }

private:
    std::string guard_;
};

/// The task has gone on meanwhile, so that the change would be a step back.
class StepBack : public std::logic_error {
public:
    using std::logic_error::logic_error;
};

/// The time until which the task could begin is over; nothing was changed.
class TooLate : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Which tasks are wanted.
struct TaskFilter {
    std::optional<TaskState> state{};
    std::optional<std::string> product{};
    std::optional<std::string> command{};
    std::size_t limit = 1000;
    std::optional<WallClock::time_point> since{};  ///< accepted then or later
    std::optional<std::int64_t> before{};          ///< only those with smaller numbers
};

/// Any thread may call.
class TaskKeeper {
public:
    virtual ~TaskKeeper() = default;

    /// Whose tasks these are: part of each identifier.
    virtual const std::string& identity() const = 0;
    /// The number of this run of the host.
    virtual std::int64_t run() const = 0;

    /// Gives a new task its number and identifier. Returns when it is durable. Throws NotKept.
    virtual void enter(Task& task) = 0;
    /// The same without waiting: it is durable with the next change, or after about a second.
    virtual void enterSoon(Task task) = 0;
    /// Changes a task. Returns when that is durable. Throws NotKept, and StepBack.
    virtual void save(const Task& task) = 0;
    /// This run of the host hands over a task that waited for its turn. Returns when that is
    /// durable. Throws NotKept, StepBack, and TooLate, which the same transaction decides.
    virtual void handOver(const Task& task) = 0;
    /// The plug-in gets a task now whose hand-over was recorded together with an outcome. Until
    /// then a task that is entered as one that the plug-in gets at once comes before it.
    virtual void handsOver(std::int64_t number) = 0;
    /// Changes these tasks, which an outcome has changed, in one transaction; the first one is its
    /// own. `row` is the outcome as the plug-in gave it, for those who listen now: it is not kept.
    /// Returns when that is durable, however long it takes.
    virtual void saveOutcome(const std::vector<Task>& tasks, const std::string& row) = 0;
    /// Changes a task without waiting. That it has begun can be found at once, and is durable with
    /// the next change, or after some seconds; whatever else has changed, after about a second.
    virtual void saveSoon(Task task) = 0;
    /// A row of the outcome table that belongs to no task, as it may be kept and as it came.
    /// Returns when it is durable.
    virtual void keepRow(const std::string& kept, const std::string& row) = 0;
    /// It was no task after all.
    virtual void forget(std::int64_t number) = 0;

    /// Those that satisfy all conditions, newest first, without their commands.
    virtual std::vector<Task> newest(const TaskFilter& filter) = 0;
    /// The task with this identifier, or else the newest one with this TRANSID.
    virtual std::optional<Task> find(std::string_view name) = 0;
};

}  // namespace host

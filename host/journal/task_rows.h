/// Tasks as rows of the journal's tables.
#pragma once

#include <optional>
#include <string_view>
#include <vector>

#include "host/journal/database.h"
#include "host/outcomes/task.h"
#include "host/outcomes/task_keeper.h"

namespace host {

/// Enters a new task; returns its number. One that is over gets its event. All of these throw
/// DatabaseError.
std::int64_t insertTask(Database& database, const Task& task);

/// Writes everything that may have changed. With its end a task gets an event, and only what may be
/// kept of its request stays. Returns whether a secret was removed. Throws StepBack.
bool updateTask(Database& database, const Task& task);

/// Writes down that this run of the host hands it over; the first time it gets its turn.
void noteHandOver(Database& database, std::int64_t number, std::int64_t run);
/// Takes that back, and its turn with it, unless the task is over.
void forgetHandOver(Database& database, std::int64_t number);

/// Removes every trace of it.
void deleteTask(Database& database, std::int64_t number);

/// A row of the outcome table that belongs to no task.
void insertRow(Database& database, const std::string& row);
/// The number of the newest row of the outcome table that belongs to this task; 0 when there is
/// none.
std::int64_t newestRow(Database& database, std::int64_t task);

/// A task with everything that is known. `identity` is the journal's.
std::optional<Task> readTask(Database& database, const std::string& identity, std::int64_t number);
/// The newest task with this TRANSID.
std::optional<std::int64_t> newestWithTransid(Database& database, std::string_view transid);
/// Newest first, without rows and commands.
std::vector<Task> readTasks(Database& database, const std::string& identity,
                            const TaskFilter& filter);

/// The number in a task's identifier; nothing when it is not one of this journal's.
std::optional<std::int64_t> numberIn(std::string_view id, std::string_view identity);

/// The newest time that is stored; tasks that are over count with their ends.
WallClock::time_point newestTime(Database& database);

/// Microseconds since the epoch, in which the tables give times.
std::int64_t microseconds(WallClock::time_point time);

}  // namespace host

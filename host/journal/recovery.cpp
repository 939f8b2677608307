#include "host/journal/recovery.h"

#include <unistd.h>

#include <fstream>
#include <optional>
#include <vector>

#include "host/journal/schema.h"
#include "host/journal/task_rows.h"

namespace host {
namespace {

constexpr const char* kCutOff =
    "the host ended while this task was in hand; it may have run in part";
constexpr const char* kCutOffTooOften =
    "the host ended three times while this task was in hand; it is not run again";
constexpr const char* kUnreadable =
    "the journal that held this task was damaged; whether it ran is not known";

/// Changes with each start of the machine.
std::string bootName() {
    std::ifstream file("/proc/sys/kernel/random/boot_id");
    std::string name;
    std::getline(file, name);
    return name;
}

/// The oldest task without an outcome that the plug-in had been given.
std::optional<std::int64_t> oldestHandedOver(Database& database) {
    Statement found = database.ask(
        "SELECT number FROM tasks WHERE ended IS NULL AND run IS NOT NULL "
        "ORDER BY state = 1 DESC, turn LIMIT 1");
    if (!found.step()) return std::nullopt;
    return found.integer(0);
}

void interrupt(Database& database, Task& task, const char* reason) {
    task.state = TaskState::Interrupted;
    task.answered = true;
    task.reason = reason;
    task.ended = WallClock::now();
    if (!task.started) task.started = task.accepted;
    updateTask(database, task);
}

void settleOldest(Database& database, std::int64_t number, bool rerun, Recovered& recovered) {
    std::optional<Task> task = readTask(database, journalIdentity(database), number);
    if (!task) return;
    const int interruptions = task->interruptions + 1;
    database.change("UPDATE tasks SET interruptions = ? WHERE number = ?", interruptions, number);
    recovered.interrupted = task->id;
    const bool tooOften = interruptions >= kMostInterruptions;
    recovered.runsAgain = rerun && !tooOften && task->outcomes.empty();
    if (!recovered.runsAgain) {
        interrupt(database, *task, tooOften && rerun ? kCutOffTooOften : kCutOff);
    }
}

std::int64_t beginRun(Database& database) {
    database.change("INSERT INTO runs (boot, session, started) VALUES (?, ?, ?)", bootName(),
                    static_cast<std::int64_t>(::getsid(0)), microseconds(WallClock::now()));
    return database.lastInserted();
}

std::vector<Task> unfinishedIn(Database& damaged) {
    std::vector<Task> tasks;
    try {
        Statement found =
            damaged.ask("SELECT number FROM tasks WHERE ended IS NULL ORDER BY number");
        while (found.step()) {
            try {
                auto task = readTask(damaged, "", found.integer(0));
                if (task) tasks.push_back(std::move(*task));
            } catch (const DatabaseError&) {
                // This one cannot be read; another one may.
            }
        }
    } catch (const DatabaseError&) {
        // Nothing more can be read.
    }
    return tasks;
}

}  // namespace

void takeBackUnfinished(Database& database) {
    database.run(
        "UPDATE tasks SET state = 0, way = 0, answered = 1, run = NULL, turn = NULL, "
        "started = NULL WHERE ended IS NULL");
}

void settleUnfinished(Database& database, bool rerunInterrupted, Recovered& recovered) {
    database.run("BEGIN IMMEDIATE");
    if (const auto oldest = oldestHandedOver(database)) {
        settleOldest(database, *oldest, rerunInterrupted, recovered);
    }
    takeBackUnfinished(database);
    database.run("UPDATE tasks SET answered = 1 WHERE answered = 0");
    recovered.waiting = database.number("SELECT count(*) FROM tasks WHERE ended IS NULL");
    recovered.run = beginRun(database);
    database.run("COMMIT");
}

std::int64_t salvage(const std::string& damagedFile, Database& database) {
    std::vector<Task> tasks;
    try {
        Database damaged(damagedFile);
        tasks = unfinishedIn(damaged);
    } catch (const DatabaseError&) {
        return 0;
    }
    database.run("BEGIN IMMEDIATE");
    for (Task& task : tasks) {
        task.number = insertTask(database, task);
        interrupt(database, task, kUnreadable);
    }
    database.run("COMMIT");
    return static_cast<std::int64_t>(tasks.size());
}

}  // namespace host

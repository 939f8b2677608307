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
constexpr const char* kCancelled =
    "it was cancelled while it was in hand, and then the host ended; it may have run in part";
constexpr const char* kUnreadable =
    "the journal that held this task was damaged; whether it ran is not known";

/// The oldest task without an outcome that the plug-in had been given.
std::optional<std::int64_t> oldestHandedOver(Database& database) {
    Statement found = database.ask(
        "SELECT number FROM tasks WHERE ended IS NULL AND run IS NOT NULL "
        "ORDER BY state = 1 DESC, turn LIMIT 1");
    if (!found.step()) return std::nullopt;
    return found.integer(0);
}

void end(Database& database, Task& task, TaskState state, const char* reason) {
    task.state = state;
    task.answered = true;
    task.reason = reason;
    task.ended = WallClock::now();
    if (!task.started) task.started = task.accepted;
    updateTask(database, task);
}

bool endedCleanly(Database& database, std::int64_t run) {
    return database.number("SELECT clean FROM runs WHERE run = ?", run) != 0;
}

void settleOldest(Database& database, std::int64_t number, bool rerun, const std::string& boot,
                  Recovered& recovered) {
    std::optional<Task> task = readTask(database, journalIdentity(database), number);
    if (!task || isOver(task->state)) return;
    if (task->begun) {
        recovered.begun = task->id;
        recovered.bootedAnew = task->boot != boot;
        return;
    }
    // What the grace at an orderly end cut off did not end the host.
    const bool unclean = !endedCleanly(database, task->run.value_or(0));
    const int interruptions = task->interruptions + (unclean ? 1 : 0);
    database.change("UPDATE tasks SET interruptions = ? WHERE number = ?", interruptions, number);
    recovered.interrupted = task->id;
    const bool tooOften = interruptions >= kMostInterruptions;
    recovered.runsAgain = rerun && !tooOften && task->outcomes.empty();
    if (!recovered.runsAgain) {
        end(database, *task, TaskState::Interrupted, tooOften && rerun ? kCutOffTooOften : kCutOff);
    }
}

/// What was handed over and was to be cancelled, whether it had begun or not.
void settleCancelled(Database& database) {
    Statement found = database.ask(
        "SELECT number FROM tasks WHERE ended IS NULL AND cancel = 1 AND begun = 0 "
        "ORDER BY number");
    std::vector<std::int64_t> numbers;
    while (found.step())
        numbers.push_back(found.integer(0));
    for (const std::int64_t number : numbers) {
        std::optional<Task> task = readTask(database, journalIdentity(database), number);
        if (task) end(database, *task, TaskState::Cancelled, kCancelled);
    }
}

std::int64_t beginRun(Database& database, const std::string& boot) {
    database.change("INSERT INTO runs (boot, session, started) VALUES (?, ?, ?)", boot,
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

/// What can still be read of a damaged journal.
struct Remains {
    std::string identity;
    std::string key;
    std::vector<Task> tasks;
};

/// A fact of it; empty where that is damaged.
std::string readable(Database& damaged, std::string (*fact)(Database& database)) {
    try {
        return fact(damaged);
    } catch (const DatabaseError&) {
        return {};
    }
}

Remains remainsOf(Database& damaged) {
    return {readable(damaged, journalIdentity), readable(damaged, journalKey),
            unfinishedIn(damaged)};
}

}  // namespace

std::string bootName() {
    std::ifstream file("/proc/sys/kernel/random/boot_id");
    std::string name;
    std::getline(file, name);
    return name;
}

void takeBackUnfinished(Database& database) {
    database.run(
        "UPDATE tasks SET state = 0, way = 0, answered = 1, run = NULL, turn = NULL, "
        "started = NULL WHERE ended IS NULL AND begun = 0");
}

void settleUnfinished(Database& database, bool rerunInterrupted, const std::string& boot,
                      Recovered& recovered) {
    database.run("BEGIN IMMEDIATE");
    const auto oldest = oldestHandedOver(database);
    settleCancelled(database);
    if (oldest) settleOldest(database, *oldest, rerunInterrupted, boot, recovered);
    takeBackUnfinished(database);
    database.run("UPDATE tasks SET answered = 1 WHERE answered = 0");
    recovered.waiting =
        database.number("SELECT count(*) FROM tasks WHERE ended IS NULL AND begun = 0");
    recovered.run = beginRun(database, boot);
    database.run("COMMIT");
}

std::int64_t salvage(const std::string& damagedFile, const std::string& notedIdentity,
                     Database& database) {
    Remains remains;
    try {
        Database damaged(damagedFile);
        remains = remainsOf(damaged);
    } catch (const DatabaseError&) {
        // Nothing can be read.
    }
    if (remains.identity.empty()) remains.identity = notedIdentity;
    database.run("BEGIN IMMEDIATE");
    if (!remains.identity.empty()) setFormerIdentity(database, remains.identity);
    if (!remains.key.empty()) setJournalKey(database, remains.key);
    for (Task& task : remains.tasks) {
        task.run.reset();  // a number of the other journal
        task.number = insertTask(database, task);
        end(database, task, TaskState::Interrupted, kUnreadable);
    }
    database.run("COMMIT");
    return static_cast<std::int64_t>(remains.tasks.size());
}

}  // namespace host

#include "host/journal/task_rows.h"

#include <charconv>
#include <chrono>
#include <stdexcept>

#include "host/outcomes/packed_row.h"
#include "host/outcomes/shown_request.h"
#include "host/tables/plugin_facts.h"
#include "secrets/masked.h"

namespace host {
namespace {

constexpr const char* kColumns =
    "number, transid, asker, state, way, answered, accepted, started, ended, expires, forced, run, "
    "interruptions, once, reply, reason, guard, hint, cancel, begun";

std::optional<std::int64_t> maybeMicroseconds(const std::optional<WallClock::time_point>& time) {
    if (!time) return std::nullopt;
    return microseconds(*time);
}

WallClock::time_point timeOf(std::int64_t count) {
    return WallClock::time_point(
        std::chrono::duration_cast<WallClock::duration>(std::chrono::microseconds(count)));
}

std::optional<WallClock::time_point> maybeTimeOf(const std::optional<std::int64_t>& count) {
    if (!count) return std::nullopt;
    return timeOf(*count);
}

std::optional<int> numberOf(const std::optional<std::int64_t>& number) {
    if (!number) return std::nullopt;
    return static_cast<int>(*number);
}

void writeConditions(Database& database, std::int64_t number,
                     const std::vector<oxa::Predicate>& conditions) {
    int place = 0;
    for (const oxa::Predicate& condition : conditions) {
        database.change("INSERT INTO conditions VALUES (?, ?, ?, ?, ?)", number, place++,
                        condition.column, static_cast<int>(condition.op), condition.value);
    }
}

std::vector<oxa::Predicate> readConditions(Database& database, std::int64_t number) {
    std::vector<oxa::Predicate> conditions;
    Statement found = database.ask(
        "SELECT name, operator, value FROM conditions WHERE task = ? ORDER BY place", number);
    while (found.step()) {
        conditions.push_back(
            {found.bytes(0), static_cast<_IntfOper>(found.integer(1)), found.bytes(2)});
    }
    return conditions;
}

/// Replaces what was asked by what may be kept of it. Returns whether a secret was removed.
bool removeSecrets(Database& database, std::int64_t number) {
    std::vector<oxa::Predicate> conditions = readConditions(database, number);
    const bool removed = makeKeepable(conditions);
    database.change("DELETE FROM conditions WHERE task = ?", number);
    writeConditions(database, number, conditions);
    return removed;
}

void writeOutcomes(Database& database, const Task& task) {
    const auto there = static_cast<std::size_t>(
        database.number("SELECT count(*) FROM outcomes WHERE task = ? AND kind = 0", task.number));
    for (std::size_t i = there; i < task.outcomes.size(); ++i) {
        database.change("INSERT INTO outcomes (task, row) VALUES (?, ?)", task.number,
                        packRow(task.outcomes[i]));
    }
}

/// The end of a task is an event, once.
void noteEnd(Database& database, const Task& task) {
    if (!isOver(task.state)) return;
    database.change(
        "INSERT INTO outcomes (task, row, kind) SELECT ?1, x'', 1 WHERE NOT EXISTS "
        "(SELECT 1 FROM outcomes WHERE task = ?1 AND kind = 1)",
        task.number);
}

void writeCommands(Database& database, const Task& task) {
    if (task.commands.empty()) return;
    database.change("DELETE FROM commands WHERE task = ?", task.number);
    int place = 0;
    for (const Command& ran : task.commands) {
        database.change("INSERT INTO commands VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)",
                        task.number, place++, ran.line, static_cast<int>(ran.pid),
                        microseconds(ran.started), maybeMicroseconds(ran.ended), ran.exit,
                        ran.signal, ran.error, static_cast<int>(ran.timedOut),
                        static_cast<int>(ran.executedNothing), ran.out.text(), ran.err.text());
    }
}

std::vector<Command> readCommands(Database& database, std::int64_t number) {
    std::vector<Command> commands;
    Statement found = database.ask(
        "SELECT line, pid, started, ended, exit, signal, error, timed_out, executed_nothing, out, "
        "err FROM commands WHERE task = ? ORDER BY place",
        number);
    while (found.step()) {
        Command& command = commands.emplace_back();
        command.line = found.bytes(0);
        command.pid = static_cast<pid_t>(found.integer(1));
        command.started = timeOf(found.integer(2));
        command.ended = maybeTimeOf(found.maybeInteger(3));
        command.exit = numberOf(found.maybeInteger(4));
        command.signal = numberOf(found.maybeInteger(5));
        command.error = found.bytes(6);
        command.timedOut = found.integer(7) != 0;
        command.executedNothing = found.integer(8) != 0;
        command.out.append(found.bytes(9));
        command.err.append(found.bytes(10));
    }
    return commands;
}

std::vector<std::string> readOutcomes(Database& database, std::int64_t number) {
    std::vector<std::string> rows;
    Statement found =
        database.ask("SELECT row FROM outcomes WHERE task = ? AND kind = 0 ORDER BY id", number);
    while (found.step())
        rows.push_back(unpackRow(found.bytes(0)));
    return rows;
}

/// The start of the machine in which the run began.
std::string bootOf(Database& database, std::int64_t run) {
    Statement found = database.ask("SELECT boot FROM runs WHERE run = ?", run);
    return found.step() ? found.bytes(0) : std::string();
}

/// From a row of kColumns.
Task taskOf(Database& database, const Statement& row, const std::string& identity) {
    Task task;
    task.number = row.integer(0);
    task.id = identity + '-' + std::to_string(task.number);
    task.transid = row.bytes(1);
    task.asker = row.bytes(2);
    task.state = static_cast<TaskState>(row.integer(3));
    task.way = static_cast<TaskWay>(row.integer(4));
    task.answered = row.integer(5) != 0;
    task.accepted = timeOf(row.integer(6));
    task.started = maybeTimeOf(row.maybeInteger(7));
    task.ended = maybeTimeOf(row.maybeInteger(8));
    task.expires = maybeTimeOf(row.maybeInteger(9));
    task.forced = row.integer(10) != 0;
    task.run = row.maybeInteger(11);
    task.interruptions = static_cast<int>(row.integer(12));
    if (!row.isNull(13)) task.once = row.bytes(13);
    task.reply = unpackRow(row.bytes(14));
    task.reason = row.bytes(15);
    task.guard = row.bytes(16);
    task.hint = row.bytes(17);
    task.cancel = row.integer(18) != 0;
    task.begun = row.integer(19) != 0;
    task.conditions = readConditions(database, task.number);
    task.request = shownRequest(task.conditions);
    return task;
}

std::optional<int> codeOf(const std::optional<TaskState>& state) {
    if (!state) return std::nullopt;
    return static_cast<int>(*state);
}

}  // namespace

std::int64_t microseconds(WallClock::time_point time) {
    return std::chrono::duration_cast<std::chrono::microseconds>(time.time_since_epoch()).count();
}

std::int64_t insertTask(Database& database, const Task& task) {
    database.change(
        "INSERT INTO tasks (transid, command, product, asker, state, way, answered, accepted, "
        "started, ended, expires, forced, once, reply, reason, guard, hint) "
        "VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)",
        task.transid, valueIn(task.conditions, plugin::kCommandColumn),
        valueIn(task.conditions, plugin::kProductColumn), task.asker, static_cast<int>(task.state),
        static_cast<int>(task.way), static_cast<int>(task.answered), microseconds(task.accepted),
        maybeMicroseconds(task.started), maybeMicroseconds(task.ended),
        maybeMicroseconds(task.expires), static_cast<int>(task.forced), task.once,
        packRow(task.reply), secrets::masked(task.reason), task.guard, secrets::masked(task.hint));
    Task entered = task;
    entered.number = database.lastInserted();
    if (entered.run) noteHandOver(database, entered.number, *entered.run);
    if (isOver(task.state)) makeKeepable(entered.conditions);
    writeConditions(database, entered.number, entered.conditions);
    writeOutcomes(database, entered);
    noteEnd(database, entered);
    writeCommands(database, entered);
    return entered.number;
}

bool updateTask(Database& database, const Task& task) {
    const int state = static_cast<int>(task.state);
    // What is known stays known: of two changes in a row the second may have been made without the
    // reply.
    const int changed = database.change(
        "UPDATE tasks SET transid = ?1, state = ?2, answered = max(answered, ?3), accepted = ?4, "
        "started = ?5, ended = ?6, reply = iif(length(?7) = 0, reply, ?7), reason = ?8, "
        "guard = ?9, hint = ?10, begun = max(begun, ?12) WHERE number = ?11 AND (state < 2 AND "
        "state <= ?2 OR state = ?2)",
        task.transid, state, static_cast<int>(task.answered), microseconds(task.accepted),
        maybeMicroseconds(task.started), maybeMicroseconds(task.ended), packRow(task.reply),
        secrets::masked(task.reason), task.guard, secrets::masked(task.hint), task.number,
        static_cast<int>(task.begun));
    if (changed == 0) {
        throw StepBack("task " + std::to_string(task.number) + " goes forward only");
    }
    if (task.run) noteHandOver(database, task.number, *task.run);
    writeOutcomes(database, task);
    noteEnd(database, task);
    writeCommands(database, task);
    return isOver(task.state) && removeSecrets(database, task.number);
}

void noteHandOver(Database& database, std::int64_t number, std::int64_t run) {
    database.change(
        "UPDATE tasks SET run = ?, turn = (SELECT coalesce(max(turn), 0) + 1 FROM tasks) "
        "WHERE number = ? AND run IS NULL",
        run, number);
}

void forgetHandOver(Database& database, std::int64_t number) {
    database.change("UPDATE tasks SET run = NULL, turn = NULL WHERE number = ? AND ended IS NULL",
                    number);
}

void deleteTask(Database& database, std::int64_t number) {
    database.change("DELETE FROM conditions WHERE task = ?", number);
    database.change("DELETE FROM commands WHERE task = ?", number);
    database.change("DELETE FROM tasks WHERE number = ?", number);
}

void insertRow(Database& database, const std::string& row) {
    database.change("INSERT INTO outcomes (task, row) VALUES (NULL, ?)", packRow(row));
}

std::int64_t newestRow(Database& database, std::int64_t task) {
    return database.number("SELECT max(id) FROM outcomes WHERE task = ? AND kind = 0", task);
}

std::optional<Task> readTask(Database& database, const std::string& identity, std::int64_t number) {
    const std::string sql = std::string("SELECT ") + kColumns + " FROM tasks WHERE number = ?";
    Statement found = database.ask(sql.c_str(), number);
    if (!found.step()) return std::nullopt;
    Task task = taskOf(database, found, identity);
    task.outcomes = readOutcomes(database, number);
    task.commands = readCommands(database, number);
    if (task.run) task.boot = bootOf(database, *task.run);
    return task;
}

std::optional<std::int64_t> newestWithTransid(Database& database, std::string_view transid) {
    Statement found = database.ask(
        "SELECT number FROM tasks WHERE transid = ? AND answered = 1 ORDER BY number DESC LIMIT 1",
        transid);
    if (!found.step()) return std::nullopt;
    return found.integer(0);
}

WallClock::time_point newestTime(Database& database) {
    return timeOf(database.number(
        "SELECT max((SELECT coalesce(max(ended), 0) FROM tasks WHERE ended IS NOT NULL), "
        "(SELECT coalesce(max(max(accepted, coalesce(started, 0))), 0) FROM tasks "
        "WHERE ended IS NULL), (SELECT coalesce(max(started), 0) FROM runs))"));
}

std::vector<Task> readTasks(Database& database, const std::string& identity,
                            const TaskFilter& filter) {
    const std::string sql = std::string("SELECT ") + kColumns +
                            " FROM tasks WHERE answered = 1 AND (?1 IS NULL OR state = ?1) "
                            "AND (?2 IS NULL OR product = ?2) AND (?3 IS NULL OR command = ?3) "
                            "AND (?4 IS NULL OR accepted >= ?4) AND (?5 IS NULL OR number < ?5) "
                            "ORDER BY number DESC LIMIT ?6";
    Statement found = database.ask(sql.c_str(), codeOf(filter.state), filter.product,
                                   filter.command, maybeMicroseconds(filter.since), filter.before,
                                   static_cast<std::int64_t>(filter.limit));
    std::vector<Task> tasks;
    while (found.step())
        tasks.push_back(taskOf(database, found, identity));
    return tasks;
}

std::optional<std::int64_t> numberIn(std::string_view id, std::string_view identity) {
    if (id.size() <= identity.size() || id.substr(0, identity.size()) != identity ||
        id[identity.size()] != '-') {
        return std::nullopt;
    }
    const std::string_view digits = id.substr(identity.size() + 1);
    std::int64_t number = 0;
    const char* const end = digits.data() + digits.size();
    const auto [rest, error] = std::from_chars(digits.data(), end, number);
    if (error != std::errc() || rest != end) return std::nullopt;
    return number;
}

}  // namespace host

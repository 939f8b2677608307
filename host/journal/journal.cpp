#include "host/journal/journal.h"

#include <algorithm>
#include <chrono>
#include <memory>
#include <thread>
#include <utility>

#include "host/journal/keyed_hash.h"
#include "host/journal/schema.h"
#include "host/journal/task_rows.h"
#include "host/outcomes/packed_row.h"
#include "host/process/log.h"
#include "host/process/start_error.h"
#include "host/tables/plugin_facts.h"

namespace host {
namespace {

constexpr std::chrono::seconds kCommitRetry{1};

/// That a task has begun needs no transaction of its own if its outcome is near, which takes a
/// second at least: the plug-in waits that long before it publishes one.
constexpr std::chrono::seconds kBeginningWithin{5};
constexpr std::chrono::seconds kEndWithin{1};
/// At most so many events lie between two looks at what is too old.
constexpr std::size_t kPruneEvery = 1000;
/// Rows may be more than are to be kept by this part of their number, or one.
constexpr std::size_t kSparePart = 10;
/// Of so many finished tasks the ends of the outputs are kept.
constexpr int kKeptTails = 1000;

void warn(const std::string& text) {
    say(Priority::Warning, text);
}

void removeOldRows(Database& database, int rows) {
    for (const EventKind kind : {EventKind::Row, EventKind::TaskEnd}) {
        database.change(
            "DELETE FROM outcomes WHERE kind = ?1 AND id <= "
            "(SELECT id FROM outcomes WHERE kind = ?1 ORDER BY id DESC LIMIT 1 OFFSET ?2) AND "
            "(task IS NULL OR task NOT IN (SELECT number FROM tasks WHERE ended IS NULL))",
            static_cast<int>(kind), rows);
    }
}

void removeOldTasks(Database& database, std::int64_t endedBefore) {
    constexpr const char* kOld = "(SELECT number FROM tasks WHERE ended IS NOT NULL AND ended < ?)";
    for (const char* table : {"conditions", "commands", "outcomes"}) {
        database.change((std::string("DELETE FROM ") + table + " WHERE task IN " + kOld).c_str(),
                        endedBefore);
    }
    database.change("DELETE FROM tasks WHERE ended IS NOT NULL AND ended < ?", endedBefore);
    database.change(
        "UPDATE commands SET out = x'', err = x'' WHERE task IN (SELECT number FROM tasks "
        "WHERE ended IS NOT NULL ORDER BY ended DESC LIMIT -1 OFFSET ?) "
        "AND length(out) + length(err) > 0",
        kKeptTails);
}

std::string described(const Recovered& recovered) {
    std::string text;
    if (!recovered.interrupted.empty()) {
        text += "task " + recovered.interrupted + " was interrupted" +
                (recovered.runsAgain ? " and runs again; " : "; ");
    }
    return text + std::to_string(recovered.waiting) + " tasks wait";
}

std::int64_t newestEvent(Database& database) {
    return database.number("SELECT seq FROM sqlite_sequence WHERE name = 'outcomes'");
}

std::vector<JournalEvent> eventsIn(Database& database, std::int64_t after, std::int64_t most) {
    std::vector<JournalEvent> events;
    Statement found = database.ask(
        "SELECT id, kind, coalesce(task, 0), row FROM outcomes WHERE id > ? ORDER BY id LIMIT ?",
        after, most);
    while (found.step()) {
        events.push_back({found.integer(0), static_cast<EventKind>(found.integer(1)),
                          found.integer(2), unpackRow(found.bytes(3))});
    }
    return events;
}

/// The first task with this TRANSID that answers its repetitions.
std::optional<Task> onceIn(Database& database, const std::string& identity,
                           std::string_view transid) {
    Statement found = database.ask(
        "SELECT number FROM tasks WHERE transid = ? AND once IS NOT NULL ORDER BY number LIMIT 1",
        transid);
    return found.step() ? readTask(database, identity, found.integer(0)) : std::nullopt;
}

/// What ran for a journal that is not there any more may still run.
void noteIdentity(const StateDirectory& directory, Database& database, Recovered& recovered) {
    const std::string identity = journalIdentity(database);
    const std::string noted = directory.notedIdentity();
    if (noted == identity) return;
    if (recovered.formerIdentity.empty() && !noted.empty()) {
        setFormerIdentity(database, noted);
        recovered.formerIdentity = noted;
    }
    directory.noteIdentity(identity);
}

/// What is known of a task that is about to be written; false if it has been written, or begins
/// nothing.
bool addBeginning(Task& task, const Task& known) {
    if (task.state != TaskState::Queued) return false;
    task.state = known.state;
    task.started = known.started;
    task.transid = known.transid;
    task.answered = task.answered || known.answered;
    if (!known.reply.empty()) task.reply = known.reply;
    return task.state == TaskState::Running;
}

}  // namespace

Journal::Journal(const Settings& settings) : settings_(settings) {
    try {
        if (!settings_.directory.empty()) takeDirectory();
        try {
            begin();
        } catch (const DatabaseError& error) {
            if (!directory_ || !error.damaged()) throw;
            replaceDamaged(error.what());
            beginRun();
        }
    } catch (const NewerSchema& newer) {
        throw StartError("cannot use the journal " + directory_->database() + ": " + newer.what());
    } catch (const DatabaseError& error) {
        throw StartError("cannot use the journal in " + settings_.directory + ": " + error.what());
    }
    if (recovered_.waiting > 0 || !recovered_.interrupted.empty()) warn(described(recovered_));
    writer_ = std::make_unique<Writer>(
        *database_, reader_ ? nullptr : &readLock_,
        Writer::Watch{[this] { beginTransaction(); },
                      [this](Database& database) { tellOfCommit(database); }, pruning(),
                      settings_.pruneEvery});
    writer_->submitLater(pruning());
}

Journal::~Journal() = default;

void Journal::takeDirectory() {
    try {
        directory_.emplace(settings_.directory);
    } catch (const InUse& inUse) {
        if (!settings_.mayYield) throw;
        warn(std::string(inUse.what()) + "; this one keeps its tasks in memory only");
    }
}

/// A full disk keeps nobody from asking how tasks ended: that is what the reserve is for, too.
void Journal::begin() {
    try {
        open();
        beginRun();
    } catch (const DatabaseError& error) {
        if (!directory_ || error.damaged() || !directory_->freeReserve()) throw;
        reader_.reset();
        database_.reset();
        open();
        beginRun();
    }
}

void Journal::open() {
    database_ = std::make_unique<Database>(directory_ ? directory_->database() : ":memory:");
    prepareSchema(*database_);
    identity_ = journalIdentity(*database_);
    key_ = journalKey(*database_);
}

/// Settles what the last run left. Throws DatabaseError, also when the journal is damaged; it looks
/// for damage if that run did not end in good order.
void Journal::beginRun() {
    recovered_.clean = !directory_ || directory_->endedCleanly();
    if (!recovered_.clean) {
        const std::string fault = integrityFault(*database_);
        if (!fault.empty()) throw DatabaseError::ofDamage(fault);
    }
    Recovered found = recovered_;
    settleUnfinished(*database_, settings_.rerunInterrupted,
                     settings_.boot.empty() ? bootName() : settings_.boot, found);
    found.formerIdentity = formerIdentity(*database_);
    if (directory_) {
        // What a kill left of a secret in the log of changes goes now.
        database_->number("PRAGMA wal_checkpoint(TRUNCATE)");
        reader_ = std::make_unique<Database>(directory_->database());
        directory_->takeReserve();
        noteIdentity(*directory_, *database_, found);
    }
    latest_.store(newestTime(*database_).time_since_epoch().count());
    events_.emplace(newestEvent(*database_));
    recovered_ = found;
}

/// Begins a new journal with what can be read of the damaged one.
void Journal::replaceDamaged(const std::string& fault) {
    reader_.reset();
    database_.reset();
    recovered_.fault = fault;
    recovered_.setAside = directory_->setAside();
    open();
    recovered_.salvaged = salvage(recovered_.setAside, directory_->notedIdentity(), *database_);
    key_ = journalKey(*database_);
    warn("the journal is damaged (" + fault + ") and was set aside as " + recovered_.setAside +
         ", which may hold passwords of requests; " + std::to_string(recovered_.salvaged) +
         " unfinished tasks of it are entered as interrupted");
}

void Journal::endCleanly(bool quiet) noexcept {
    try {
        commit([quiet, this](Database& database) {
            if (quiet) takeBackUnfinished(database);
            forgetHandOver(database, ahead_.load());  // the plug-in never got it
            database.change("UPDATE runs SET clean = 1 WHERE run = ?", recovered_.run);
        });
        writer_->settle();
        if (directory_) directory_->noteCleanEnd();
    } catch (const std::exception& error) {
        warn(std::string("the journal could not be closed in good order: ") + error.what());
    }
}

void Journal::commit(Writer::Change change) {
    try {
        writer_->submit(std::move(change)).get();
    } catch (const DatabaseError& error) {
        const std::string trouble =
            std::string("the journal cannot be written to: ") + error.what();
        noteTrouble(trouble);
        throw NotKept(trouble);
    }
    if (troubled_.load()) noteTrouble({});
}

void Journal::noteTrouble(const std::string& trouble) {
    const embedded::MutexLock lock(troubleLock_);
    if (trouble_.empty() && !trouble.empty()) warn(trouble);
    trouble_ = trouble;
    troubled_.store(!trouble.empty());
}

/// Without the reserve an outcome might find no room. What is written may still find some, so this
/// is no trouble that the next commit ends.
void Journal::insistOnReserve() {
    const bool isTaken = !directory_ || directory_->takeReserve();
    const bool wasTaken = !lacksReserve_.exchange(!isTaken);
    if (isTaken) return;
    const std::string reason = "the disk with " + directory_->path() + " is full";
    if (wasTaken) warn("the journal cannot record requests: " + reason);
    throw NotKept(reason);
}

void Journal::enter(Task& task) {
    insistOnReserve();
    std::int64_t number = 0;
    commit([&task, &number, this](Database& database) { number = enterInto(database, task); });
    task.number = number;
    task.id = identity_ + '-' + std::to_string(number);
}

/// One that the plug-in gets at once comes before the one whose hand-over has only been recorded:
/// after a kill it is the older one, which alone can have begun.
std::int64_t Journal::enterInto(Database& database, const Task& task) const {
    const std::int64_t number = insertTask(database, task);
    const std::int64_t ahead = ahead_.load();
    if (task.run && ahead != 0) {
        forgetHandOver(database, ahead);
        noteHandOver(database, ahead, recovered_.run);
    }
    return number;
}

void Journal::enterSoon(Task task) {
    writeSoon([task = std::move(task)](Database& database) { insertTask(database, task); },
              kEndWithin);
}

void Journal::writeSoon(Writer::Change change, std::chrono::milliseconds within) {
    std::uint64_t number = 0;
    {
        const embedded::MutexLock lock(soonLock_);
        number = ++soon_.last;
        soon_.hidden.insert(number);
    }
    submitSoon(number, std::move(change), within);
}

void Journal::submitSoon(std::uint64_t number, Writer::Change change,
                         std::chrono::milliseconds within) {
    writer_->submitLater(
        [change = std::move(change), number, this](Database& database) {
            written_.push_back(number);
            try {
                change(database);
            } catch (const DatabaseError&) {
                written_.pop_back();  // it is tried again with another transaction
                throw;
            }
        },
        within);
}

Writer::Change Journal::updateOf(std::vector<Task> tasks) {
    return [tasks = std::move(tasks), this](Database& database) {
        for (const Task& task : tasks) {
            if (updateTask(database, task)) writer_->wipeSoon();
        }
    };
}

void Journal::save(const Task& task) {
    commit(updateOf({task}));
}

void Journal::handOver(const Task& task) {
    commit([task, this](Database& database) {
        if (isTooLate(task)) throw TooLate("task " + task.id + " was to begin earlier");
        updateTask(database, task);
    });
}

void Journal::handsOver(std::int64_t number) {
    ahead_.compare_exchange_strong(number, 0);
}

void Journal::takeBack(std::int64_t number) {
    // On the writer's thread, so that nothing is entered between the two.
    try {
        commit([number, this](Database& database) {
            ahead_.store(0);
            forgetHandOver(database, number);
        });
    } catch (const NotKept&) {
        ahead_.store(number);
        throw;
    }
}

void Journal::saveSoon(Task task) {
    if (isOver(task.state)) {
        writeSoon(updateOf({std::move(task)}), kEndWithin);
        return;
    }
    std::uint64_t number = 0;
    {
        const embedded::MutexLock lock(soonLock_);
        number = ++soon_.last;
        soon_.begun.emplace(number, task);
        // Until it is written that it was answered, nobody who asks finds it.
        if (task.way != TaskWay::Journal) soon_.hidden.insert(number);
    }
    submitSoon(number, updateOf({std::move(task)}), kBeginningWithin);
    tellOfChange();
}

void Journal::saveOutcome(const std::vector<Task>& tasks, const std::string& row) {
    const Task& over = tasks.front();
    const bool handsOver = handsOver_.load() && isOver(over.state) && over.way == TaskWay::Journal;
    const auto next = std::make_shared<std::int64_t>(0);
    commitOutcome([update = updateOf(tasks), number = over.number, row, handsOver, next,
                   this](Database& database) {
        update(database);
        asGiven_[newestRow(database, number)] = row;
        *next = handsOver ? handOverNext(database) : 0;
    });
    if (*next != 0) handedOver_.store(*next);
}

void Journal::keepRow(const std::string& kept, const std::string& row) {
    commitOutcome([this, kept, row](Database& database) {
        insertRow(database, kept);
        asGiven_[database.lastInserted()] = row;
    });
}

void Journal::whenChanged(std::function<void()> call) {
    const embedded::MutexLock lock(changedLock_);
    whenChanged_ = std::move(call);
}

/// On the writer's thread, before each transaction.
void Journal::beginTransaction() {
    asGiven_.clear();
    written_.clear();
}

/// On the writer's thread, after each transaction.
void Journal::tellOfCommit(Database& database) {
    {
        const embedded::MutexLock lock(soonLock_);
        for (const std::uint64_t number : written_) {
            soon_.begun.erase(number);
            soon_.hidden.erase(number);
        }
    }
    tellOfEvents(database);
    tellOfChange();
}

void Journal::tellOfChange() {
    std::function<void()> call;
    {
        const embedded::MutexLock lock(changedLock_);
        call = whenChanged_;
    }
    if (call) call();
}

void Journal::tellOfEvents(Database& database) {
    constexpr std::int64_t kAll = -1;
    std::vector<JournalEvent> events = eventsIn(database, events_->last(), kAll);
    if (events.empty()) return;
    for (JournalEvent& event : events) {
        const auto given = asGiven_.find(event.number);
        if (given != asGiven_.end()) event.row = std::move(given->second);
    }
    events_->append(events);
    const auto keptRows = static_cast<std::size_t>(settings_.keepRows);
    rowsSincePrune_ += events.size();
    sincePrune_ += events.size();
    if (sincePrune_ >= kPruneEvery) {
        sincePrune_ = 0;
        rowsSincePrune_ = 0;
        writer_->submitLater(pruning());
    } else if (rowsSincePrune_ > keptRows / kSparePart) {
        rowsSincePrune_ = 0;
        writer_->submitLater(
            [this](Database& changed) { removeOldRows(changed, settings_.keepRows); });
    }
}

void Journal::commitOutcome(const Writer::Change& change) {
    while (closed_.load())
        std::this_thread::sleep_for(kCommitRetry);
    while (!commitOutcomeOnce(change)) {
        if (directory_) directory_->freeReserve();
        if (commitOutcomeOnce(change)) break;
        std::this_thread::sleep_for(kCommitRetry);
    }
}

bool Journal::commitOutcomeOnce(const Writer::Change& change) {
    try {
        commit(change);
        return true;
    } catch (const NotKept&) {
        return false;
    }
}

std::string Journal::trouble() {
    if (!troubled_.load()) return {};
    try {
        commit([](Database& database) {
            database.change("INSERT OR REPLACE INTO facts VALUES ('written', randomblob(8))");
        });
    } catch (const NotKept&) {
        // It is still so.
    }
    const embedded::MutexLock lock(troubleLock_);
    return trouble_;
}

void Journal::forget(std::int64_t number) {
    writeSoon(
        [number, this](Database& database) {
            deleteTask(database, number);
            writer_->wipeSoon();
        },
        kEndWithin);
}

/// Removes what is too old.
Writer::Change Journal::pruning() {
    return [this](Database& database) {
        const auto days = std::chrono::hours(24) * settings_.keepDays;
        removeOldTasks(database, microseconds(WallClock::now() - days));
        removeOldRows(database, settings_.keepRows);
    };
}

template <typename Reader>
auto Journal::read(const Reader& reader) {
    const embedded::MutexLock lock(readLock_);
    return reader(reader_ ? *reader_ : *database_);
}

std::vector<JournalEvent> Journal::eventsAfter(std::int64_t position, std::size_t most) {
    if (auto recent = events_->after(position, most)) return *std::move(recent);
    return read([&](Database& database) {
        return eventsIn(database, position, static_cast<std::int64_t>(most));
    });
}

std::vector<Task> Journal::newest(const TaskFilter& filter) {
    writer_->flush();
    return read([&](Database& database) { return readTasks(database, identity_, filter); });
}

std::optional<Task> Journal::find(std::string_view name) {
    if (awaitsHidden()) writer_->flush();
    // Before the look: what has been written meanwhile is then found there.
    const std::map<std::int64_t, Task> begun = begunTasks();
    std::optional<Task> found = read([&](Database& database) -> std::optional<Task> {
        if (const auto number = numberIn(name, identity_)) {
            std::optional<Task> task = readTask(database, identity_, *number);
            if (task) return task;
        }
        const auto number = newestWithTransid(database, name);
        return number ? readTask(database, identity_, *number) : std::nullopt;
    });
    if (!found) return found;
    const auto known = begun.find(found->number);
    if (known != begun.end()) addBeginning(*found, known->second);
    return found;
}

bool Journal::awaitsHidden() const {
    const embedded::MutexLock lock(soonLock_);
    return !soon_.hidden.empty();
}

std::map<std::int64_t, Task> Journal::begunTasks() const {
    const embedded::MutexLock lock(soonLock_);
    std::map<std::int64_t, Task> tasks;
    for (const auto& [change, task] : soon_.begun)
        tasks.insert_or_assign(task.number, task);
    return tasks;
}

/// Of the tasks that run and of which that is not written yet, as a JSON array.
std::string Journal::begunNumbers() const {
    std::string numbers;
    for (const auto& [number, task] : begunTasks()) {
        if (task.state != TaskState::Running) continue;
        numbers += (numbers.empty() ? "" : ",") + std::to_string(number);
    }
    return '[' + numbers + ']';
}

std::vector<Task> Journal::running() {
    const std::map<std::int64_t, Task> begun = begunTasks();
    return read([&](Database& database) {
        TaskFilter filter;
        filter.state = TaskState::Running;
        std::vector<Task> found = readTasks(database, identity_, filter);
        for (const auto& [number, known] : begun) {
            std::optional<Task> task = readTask(database, identity_, number);
            if (!task && known.state == TaskState::Running) {
                found.push_back(known);  // nobody has been told yet that it was accepted
            } else if (task && addBeginning(*task, known)) {
                found.push_back(std::move(*task));
            }
        }
        return found;
    });
}

std::optional<Task> Journal::nextInLine() {
    return read([&](Database& database) -> std::optional<Task> {
        Statement found = database.ask(
            "SELECT number FROM tasks WHERE ended IS NULL AND way = 0 AND run IS NULL "
            "ORDER BY number LIMIT 1");
        return found.step() ? readTask(database, identity_, found.integer(0)) : std::nullopt;
    });
}

bool Journal::isTooLate(const Task& task) {
    return task.expires && latestTime() > *task.expires;
}

/// Returns its number; 0: nothing waits, or its time is over, which the dispatcher will see.
std::int64_t Journal::handOverNext(Database& database) {
    Statement found = database.ask(
        "SELECT number, expires FROM tasks WHERE ended IS NULL AND way = 0 AND run IS NULL "
        "ORDER BY number LIMIT 1");
    if (!found.step()) return 0;
    const std::int64_t number = found.integer(0);
    const auto expires = found.maybeInteger(1);
    if (expires && microseconds(latestTime()) > *expires) return 0;
    noteHandOver(database, number, recovered_.run);
    ahead_.store(number);
    return number;
}

std::optional<Task> Journal::byNumber(std::int64_t number) {
    return read([&](Database& database) { return readTask(database, identity_, number); });
}

WallClock::time_point Journal::latestTime() {
    const WallClock::rep now = WallClock::now().time_since_epoch().count();
    WallClock::rep latest = latest_.load();
    while (latest < now && !latest_.compare_exchange_weak(latest, now)) {
    }
    return WallClock::time_point(WallClock::duration(std::max(latest, now)));
}

std::int64_t Journal::waiting() {
    return read([](Database& database) {
        return database.number(
            "SELECT count(*) FROM tasks WHERE ended IS NULL AND way = 0 AND run IS NULL");
    });
}

std::int64_t Journal::notBegun() {
    const std::string begun = begunNumbers();
    return read([&](Database& database) {
        return database.number(
            "SELECT count(*) FROM tasks WHERE ended IS NULL AND state = 0 "
            "AND number NOT IN (SELECT value FROM json_each(?))",
            begun);
    });
}

Journal::Unfinished Journal::unfinished() {
    const std::string begun = begunNumbers();
    return read([&](Database& database) {
        Statement found = database.ask(
            "SELECT coalesce(sum(known = 0), 0), coalesce(sum(known = 1), 0), "
            "min(CASE WHEN known = 0 THEN accepted END) FROM (SELECT accepted, "
            "max(state, number IN (SELECT value FROM json_each(?))) AS known "
            "FROM tasks WHERE ended IS NULL)",
            begun);
        Unfinished tasks;
        if (!found.step()) return tasks;
        tasks.queued = found.integer(0);
        tasks.running = found.integer(1);
        if (const auto oldest = found.maybeInteger(2)) {
            tasks.oldestQueued = WallClock::time_point(std::chrono::microseconds(*oldest));
        }
        return tasks;
    });
}

bool Journal::mayChange(const std::string& product) {
    return read([&](Database& database) {
        Statement found = database.ask(
            "SELECT command FROM tasks WHERE ended IS NULL AND way = 0 AND "
            "lower(CAST(product AS TEXT)) = lower(CAST(? AS TEXT))",
            product);
        while (found.step()) {
            if (plugin::changesWhatIsInstalled(found.bytes(0))) return true;
        }
        return false;
    });
}

std::optional<Task> Journal::enterOnce(Task& task) {
    insistOnReserve();
    std::optional<Task> first;
    commit([&task, &first, this](Database& database) {
        first = onceIn(database, identity_, task.transid);
        if (!first) task.number = insertTask(database, task);
    });
    if (!first) task.id = identity_ + '-' + std::to_string(task.number);
    return first;
}

Journal::Cancel Journal::cancel(std::int64_t number) {
    Cancel result = Cancel::Unknown;
    commit([&result, number, &writer = *writer_, this](Database& database) {
        std::optional<Task> task = readTask(database, identity_, number);
        if (!task) return;
        result = Cancel::Over;
        if (isOver(task->state)) return;
        if (task->run) {
            const bool waits = task->way == TaskWay::Query && task->state == TaskState::Queued;
            result = waits ? Cancel::InPlugin : Cancel::Asked;
            if (!waits) database.change("UPDATE tasks SET cancel = 1 WHERE number = ?", number);
            return;
        }
        task->state = TaskState::Cancelled;
        task->ended = WallClock::now();
        if (updateTask(database, *task)) writer.wipeSoon();
        result = Cancel::Ended;
    });
    return result;
}

bool Journal::isToBeCancelled(std::int64_t number) {
    return read([&](Database& database) {
        return database.number("SELECT cancel FROM tasks WHERE number = ?", number) != 0;
    });
}

std::string Journal::hashOf(std::string_view content) const {
    return keyedHash(key_, content);
}

std::optional<Task> Journal::findOnce(std::string_view transid) {
    return read([&](Database& database) { return onceIn(database, identity_, transid); });
}

}  // namespace host

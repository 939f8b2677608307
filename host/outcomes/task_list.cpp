#include "host/outcomes/task_list.h"

#include <strings.h>

#include <algorithm>
#include <iterator>
#include <utility>

#include "host/commands/ear.h"
#include "host/commands/plugin_threads.h"
#include "host/outcomes/shown_request.h"
#include "host/tables/masked_row.h"
#include "host/tables/plugin_facts.h"
#include "host/tables/row_fields.h"

namespace host {
namespace {

/// The column's value as a row of the table would have it.
std::string asInRow(const oxa::Column& column, std::string_view value) {
    std::string text(value.substr(0, static_cast<std::size_t>(std::max(0, column.length))));
    text.erase(text.find_last_not_of(' ') + 1);
    return text;
}

void blank(std::string& row, const oxa::Column& column) {
    const auto offset = static_cast<std::size_t>(std::max(0, column.offset));
    const auto length = static_cast<std::size_t>(std::max(0, column.length));
    if (offset > row.size() || length > row.size() - offset) return;
    std::fill_n(row.begin() + column.offset, length, ' ');
}

void append(std::vector<Command>& commands, std::vector<Command> more) {
    commands.insert(commands.end(), std::make_move_iterator(more.begin()),
                    std::make_move_iterator(more.end()));
}

}  // namespace

bool TaskList::Columns::complete() const {
    return transid != nullptr && retval != nullptr && outcomeTransid != nullptr &&
           outcomeRetval != nullptr;
}

TaskList::Columns TaskList::columnsOf(const oxa::Table& requests, const oxa::Table& outcomes) {
    return {columnOf(requests, plugin::kTransidColumn), columnOf(requests, plugin::kRetvalColumn),
            columnOf(requests, plugin::kContextColumn), columnOf(outcomes, plugin::kTransidColumn),
            columnOf(outcomes, plugin::kRetvalColumn)};
}

TaskList::TaskList(const TableSet& tables, OutcomeFeed& feed, TaskKeeper& keeper, bool guarded)
    : guarded_(guarded), keeper_(keeper) {
    const oxa::Table* const requests = tables.find(plugin::kRequestTable);
    outcomeTable_ = tables.find(plugin::kOutcomeTable);
    if (outcomeTable_ == nullptr) return;
    if (requests != nullptr) columns_ = columnsOf(*requests, *outcomeTable_);
    if (columns_.complete()) {
        requests_ = requests;
        heard_ = std::make_shared<const Follower>(
            [this](const OutputPiece& piece) { tellFollowers(piece); });
        PluginThreads::ofProcess().hearOutput(heard_);
    }
    outcomes_ = feed.subscribe({}, [this](const oxa::Rows& rows) {
        Heard heard = takeOfPluginThread();
        for (std::size_t i = 0; i < rows.count(); ++i)
            take(std::string(rowOf(rows, i)), std::exchange(heard, {}));
        return static_cast<int>(OXA_OK);
    });
}

TaskList::Request::Request(TaskList& list, const Query& query, std::string asker, bool forced)
    : list_(list) {
    if (list_.requests_ == nullptr || query.table->name != list_.requests_->name) return;
    if (!plugin::runsAtOnce(valueIn(query.where, plugin::kCommandColumn))) {
        turn_ = std::unique_lock<std::mutex>(list_.turns_);
    }
    number_ = list_.add(query, std::move(asker), forced);
}

TaskList::Request::Request(TaskList& list, Task task)
    : list_(list), turn_(list.turns_), number_(list.addHandedOver(std::move(task))) {}

TaskList::Request::~Request() {
    if (number_ != 0) list_.forget(number_);
}

bool TaskList::Request::answered(const oxa::Rows& rows, const Heard& heard) {
    return number_ != 0 && list_.answer(number_, rows, heard);
}

/// Returns 0 when it cannot be kept and goes on all the same.
std::uint64_t TaskList::add(const Query& query, std::string asker, bool forced) {
    Task task;
    task.forced = forced;
    task.asker = std::move(asker);
    task.conditions = query.where;
    task.request = shownRequest(query.where);
    task.transid = asInRow(*columns_.transid, task.value(plugin::kTransidColumn));
    task.accepted = WallClock::now();
    task.answered = false;
    if (plugin::runsAtOnce(task.value(plugin::kCommandColumn))) {
        task.way = TaskWay::AtOnce;
        return insert(std::move(task));
    }
    task.run = keeper_.run();
    try {
        keeper_.enter(task);
    } catch (const NotKept& failure) {
        if (guarded_) throw NotKept(failure.what(), "journal");
        return 0;
    }
    return insert(std::move(task));
}

std::uint64_t TaskList::addHandedOver(Task task) {
    // The transaction that recorded the outcome of the one before may have recorded it.
    if (task.run != keeper_.run()) {
        task.run = keeper_.run();
        keeper_.handOver(task);
    } else {
        keeper_.handsOver(task.number);
    }
    return insert(std::move(task));
}

std::uint64_t TaskList::insert(Task task) {
    Entry entry;
    entry.overAtFirst = !plugin::mayRestart(task.value(plugin::kCommandColumn),
                                            task.value(plugin::kOptionalColumn));
    if (task.way != TaskWay::AtOnce) std::vector<oxa::Predicate>().swap(task.conditions);
    entry.task = std::move(task);
    const embedded::MutexLock lock(lock_);
    const std::uint64_t number = ++lastNumber_;
    if (entry.task.number != 0) entry.cancelled = cancelled_.erase(entry.task.number) != 0;
    entries_.emplace(number, std::move(entry));
    return number;
}

void TaskList::forget(std::uint64_t number) {
    Task task;
    {
        const embedded::MutexLock lock(lock_);
        const auto found = entries_.find(number);
        if (found == entries_.end() || found->second.answered) return;
        task = std::move(found->second.task);
        entries_.erase(found);
    }
    if (task.way == TaskWay::Query) keeper_.forget(task.number);
}

/// Puts down what the answer says. Without a word about it there was none, unless the outcome has
/// shown already that the request was accepted.
std::optional<int> TaskList::readAnswer(Entry& entry, const oxa::Rows& rows, const Heard& heard) {
    std::optional<int> retval = heard.answer;
    Task& task = entry.task;
    if (rows.count() > 0) {
        task.reply = maskedRow(*requests_, std::string(rowOf(rows, 0)));
        retval = integerField(*columns_.retval, task.reply);
        task.transid = textField(*columns_.transid, task.reply);
        if (plugin::holdsConfiguration(task.value(plugin::kCommandColumn)) &&
            columns_.context != nullptr) {
            blank(task.reply, *columns_.context);
        }
    }
    if (!retval && entry.ended) retval = plugin::kAccepted;
    return retval;
}

bool TaskList::answer(std::uint64_t number, const oxa::Rows& rows, const Heard& heard) {
    Entry over;
    {
        const embedded::MutexLock lock(lock_);
        Entry& entry = entries_.at(number);
        const std::optional<int> retval = readAnswer(entry, rows, heard);
        if (!retval) return false;
        entry.answered = true;
        entry.task.answered = true;
        const bool refused = *retval != plugin::kAccepted && !entry.ended;
        const bool isOver = entry.task.way == TaskWay::AtOnce || refused || entry.kept;
        if (isOver) {
            over = std::move(entry);
            entries_.erase(number);
            if (refused) over.task.state = TaskState::Refused;
            if (over.task.way == TaskWay::AtOnce) over.retval = *retval;
        } else {
            entry.turn = ++lastTurn_;
            // Handed over with the lock held, so that no later change of the task comes first.
            if (!entry.ended) keeper_.saveSoon(entry.task);
            if (auto next = startNext(0)) keeper_.saveSoon(std::move(*next));
        }
    }
    if (over.answered) endAnswered(std::move(over), heard);
    return true;
}

/// A task that is over and has been answered now.
void TaskList::endAnswered(Entry entry, const Heard& heard) {
    Task& task = entry.task;
    if (!task.ended) task.ended = WallClock::now();
    if (task.way == TaskWay::AtOnce) {
        task.started = task.accepted;
        task.commands = heard.commands;
        if (task.value(plugin::kCommandColumn) == plugin::kGetConfiguration) {
            for (Command& ran : task.commands)
                ran.out.clear();  // it is the answer, whatever program gave it
        }
        entry.tooMuchOutput = heard.tooMuchOutput;
        task.state = judge(entry);
        task.reason = reasonOf(entry);
        keeper_.enterSoon(task);
    } else if (task.state == TaskState::Refused) {
        keepRefusal(task);
    } else {
        keeper_.saveSoon(task);
    }
    tellOfEnd(task);
}

/// It is durable before anybody hears of it. Else the host, when it is killed just then, would take
/// the task for one that it has to hand over again.
void TaskList::keepRefusal(const Task& task) {
    try {
        keeper_.save(task);
    } catch (const NotKept&) {
        keeper_.saveSoon(task);
    }
}

/// Whether the outcome ends its task.
bool TaskList::isLast(const Entry& entry, const std::string& row) const {
    return entry.overAtFirst || integerField(*columns_.outcomeRetval, row) != plugin::kAccepted ||
           !entry.task.outcomes.empty();
}

/// If the outcome ends its task, it is too late to cancel that from now on.
TaskList::Addressee TaskList::close(const std::string& row) {
    const embedded::MutexLock lock(lock_);
    const auto found = awaiting(textField(*columns_.outcomeTransid, row));
    if (found == entries_.end()) return {};
    Addressee addressee{found->first, nullptr};
    if (isLast(found->second, row)) {
        found->second.closing = true;
        if (endingOf_ == found->first) addressee.ending = std::move(ending_);
    }
    return addressee;
}

void TaskList::take(const std::string& row, Heard heard) {
    const Addressee addressee = requests_ == nullptr ? Addressee{} : close(row);
    // Nothing of a cancelled task lives when it is over. Without the lock: this may take long.
    const bool reached = addressee.ending && addressee.ending->finish();
    std::vector<Task> changed;
    {
        const embedded::MutexLock lock(lock_);
        const auto found = entries_.find(addressee.number);
        if (found != entries_.end()) {
            found->second.reached = reached;
            changed = takeInto(addressee.number, row, std::move(heard));
        }
    }
    if (changed.empty()) {
        keeper_.keepRow(maskedRow(*outcomeTable_, row), row);
        return;
    }
    keeper_.saveOutcome(changed, row);
    if (isOver(changed.front().state)) noteKept(addressee.number, !changed.front().answered);
}

/// What the outcome changes: its task first, and the one that begins with it.
std::vector<Task> TaskList::takeInto(std::uint64_t number, const std::string& row, Heard heard) {
    Entry& entry = entries_.at(number);
    Task& task = entry.task;
    entry.ended = isLast(entry, row);
    task.outcomes.push_back(maskedRow(*outcomeTable_, row));
    append(task.commands, std::move(heard.commands));
    entry.tooMuchOutput = entry.tooMuchOutput || heard.tooMuchOutput;
    entry.retval = integerField(*columns_.outcomeRetval, row);
    if (!task.started) task.started = task.accepted;
    if (!entry.ended) {
        task.begun = true;
        task.state = TaskState::Running;
        return {task};
    }
    task.ended = WallClock::now();
    task.state = judge(entry);
    task.reason = reasonOf(entry);
    std::vector<Task> changed = {task};
    if (auto next = startNext(number)) changed.push_back(std::move(*next));
    return changed;
}

/// The outcome is kept: now everybody may know.
void TaskList::noteKept(std::uint64_t number, bool answeredMeanwhile) {
    Task over;
    {
        const embedded::MutexLock lock(lock_);
        Entry& entry = entries_.at(number);
        entry.kept = true;
        if (!entry.answered) return;  // its thread has yet to come
        over = std::move(entry.task);
        entries_.erase(number);
        // The answer may have come while the outcome was being written.
        if (answeredMeanwhile) keeper_.saveSoon(over);
    }
    tellOfEnd(over);
}

/// The task that an outcome with this TRANSID ends: the first one accepted, or else one whose
/// answer is on its way.
TaskList::Entries::iterator TaskList::awaiting(std::string_view transid) {
    auto best = entries_.end();
    for (auto at = entries_.begin(); at != entries_.end(); ++at) {
        const Entry& entry = at->second;
        if (entry.ended || entry.task.way == TaskWay::AtOnce) continue;
        if (entry.task.transid != transid) continue;
        if (best == entries_.end()) {
            best = at;
        } else if (entry.answered && (!best->second.answered || entry.turn < best->second.turn)) {
            best = at;
        }
    }
    return best;
}

/// The task that the executor takes next begins; nothing if there is none or it has begun.
std::optional<Task> TaskList::startNext(std::uint64_t except) {
    auto next = entries_.end();
    for (auto at = entries_.begin(); at != entries_.end(); ++at) {
        const Entry& entry = at->second;
        if (at->first == except || entry.turn == 0 || entry.ended) continue;
        if (next == entries_.end() || entry.turn < next->second.turn) next = at;
    }
    if (next == entries_.end()) return std::nullopt;
    Entry& entry = next->second;
    if (entry.task.state == TaskState::Running) return std::nullopt;
    entry.task.state = TaskState::Running;
    entry.task.started = WallClock::now();
    if (entry.cancelled) beginEnding(next->first, entry);
    return entry.task;
}

void TaskList::beginEnding(std::uint64_t number, Entry& entry) {
    if (entry.closing || entry.ended || ending_) return;
    try {
        ending_ = std::make_unique<CommandEnding>();
        endingOf_ = number;
    } catch (const std::exception&) {
        // There is no memory for it, or no thread. The task goes on and ends as it would have.
    }
}

void TaskList::endCommandsOf(std::int64_t number) {
    const embedded::MutexLock lock(lock_);
    for (auto& [place, entry] : entries_) {
        if (entry.task.number != number || entry.task.way == TaskWay::AtOnce) continue;
        entry.cancelled = true;
        if (entry.task.state == TaskState::Running) beginEnding(place, entry);
        return;
    }
    cancelled_.insert(number);
}

TaskState TaskList::judge(const Entry& entry) const {
    if (entry.reached) return TaskState::Cancelled;
    if (entry.tooMuchOutput) return TaskState::Failed;
    if (entry.retval != plugin::kAccepted) return TaskState::Failed;
    const std::vector<Command>& commands = entry.task.commands;
    const bool unseen = std::any_of(commands.begin(), commands.end(),
                                    [](const Command& command) { return command.failedUnseen(); });
    return guarded_ && unseen ? TaskState::Failed : TaskState::Done;
}

/// Where the task's row does not say why it ended so.
std::string TaskList::reasonOf(const Entry& entry) {
    if (entry.reached) return "it was cancelled while it ran, and its commands were ended";
    if (entry.tooMuchOutput) return "its commands wrote more than they may, and were ended";
    return entry.task.reason;
}

void TaskList::end(const Task& task) {
    keeper_.save(task);
    tellOfEnd(task);
}

/// Once for each task that is over.
void TaskList::tellOfEnd(const Task& task) {
    counts_.add(task);
    std::vector<WhenOver> calls;
    {
        const embedded::MutexLock lock(lock_);
        for (auto at = waiters_.begin(); at != waiters_.end();) {
            if (at->second.id != task.id) {
                ++at;
                continue;
            }
            calls.push_back(std::move(at->second.whenOver));
            at = waiters_.erase(at);
        }
    }
    for (const WhenOver& call : calls)
        call(task);
}

std::uint64_t TaskList::follow(std::int64_t number, Follower follower) {
    Following following{number, std::make_shared<const Follower>(std::move(follower))};
    const embedded::MutexLock lock(lock_);
    followers_.emplace(++lastWaiter_, std::move(following));
    return lastWaiter_;
}

void TaskList::unfollow(std::uint64_t follower) {
    const embedded::MutexLock lock(lock_);
    followers_.erase(follower);
}

/// The number of the task that the executor carries out: the one that runs, or one that it took
/// before its request was answered.
std::int64_t TaskList::atWork() const {
    std::int64_t number = 0;
    for (const auto& [place, entry] : entries_) {
        if (entry.ended || entry.task.way == TaskWay::AtOnce) continue;
        if (entry.task.state == TaskState::Running) return entry.task.number;
        if (number == 0) number = entry.task.number;
    }
    return number;
}

bool TaskList::isAtWork(std::int64_t number) const {
    const embedded::MutexLock lock(lock_);
    return number != 0 && atWork() == number;
}

void TaskList::tellFollowers(const OutputPiece& piece) {
    std::vector<std::shared_ptr<const Follower>> calls;
    {
        const embedded::MutexLock lock(lock_);
        if (followers_.empty()) return;
        const std::int64_t number = atWork();
        for (const auto& [id, following] : followers_) {
            if (following.number == number) calls.push_back(following.follower);
        }
    }
    for (const auto& call : calls)
        (*call)(piece);
}

bool TaskList::mayChange(const std::string& product) const {
    if (product.empty()) return false;
    const embedded::MutexLock lock(lock_);
    return std::any_of(entries_.begin(), entries_.end(), [&product](const auto& each) {
        const Entry& entry = each.second;
        const std::string other(entry.task.value(plugin::kProductColumn));
        return entry.turn != 0 && !isOver(entry.task.state) &&
               plugin::changesWhatIsInstalled(entry.task.value(plugin::kCommandColumn)) &&
               ::strcasecmp(other.c_str(), product.c_str()) == 0;
    });
}

bool TaskList::anyAtWork() const {
    const embedded::MutexLock lock(lock_);
    return std::any_of(entries_.begin(), entries_.end(), [](const auto& each) {
        return each.second.turn != 0 && !isOver(each.second.task.state);
    });
}

bool TaskList::mustWait(const Task& task) const {
    if (!guarded_) return false;
    const bool restarts =
        plugin::mayRestart(task.value(plugin::kCommandColumn), task.value(plugin::kOptionalColumn));
    return (restarts && mayRestartHost()) ||
           mayChange(std::string(task.value(plugin::kProductColumn)));
}

bool TaskList::restartsHost() const {
    const embedded::MutexLock lock(lock_);
    return std::any_of(entries_.begin(), entries_.end(), [](const auto& each) {
        return each.second.task.begun && !each.second.ended;
    });
}

bool TaskList::mayRestartHost() const {
    const embedded::MutexLock lock(lock_);
    return std::any_of(entries_.begin(), entries_.end(), [](const auto& each) {
        return !each.second.overAtFirst && !each.second.ended;
    });
}

std::optional<Task> TaskList::find(std::string_view name) const {
    std::optional<Task> found = keeper_.find(name);
    while (found && !isOver(found->state) && isAtWork(found->number)) {
        std::vector<Command> commands = commandsOfPluginThreads();
        if (isAtWork(found->number)) {
            append(found->commands, std::move(commands));
            break;
        }
        found = keeper_.find(name);  // it has ended, and these may be another's
    }
    return found;
}

std::uint64_t TaskList::awaitEnd(const std::string& id, WhenOver whenOver) {
    std::uint64_t number = 0;
    {
        const embedded::MutexLock lock(lock_);
        number = ++lastWaiter_;
        waiters_.emplace(number, Waiter{id, std::move(whenOver)});
    }
    const std::optional<Task> task = keeper_.find(id);
    if (!task || !isOver(task->state)) return number;
    WhenOver call;
    {
        const embedded::MutexLock lock(lock_);
        const auto waiter = waiters_.find(number);
        if (waiter == waiters_.end()) return 0;  // it has been called meanwhile
        call = std::move(waiter->second.whenOver);
        waiters_.erase(waiter);
    }
    call(*task);
    return 0;
}

void TaskList::cancel(std::uint64_t waiter) {
    const embedded::MutexLock lock(lock_);
    waiters_.erase(waiter);
}

}  // namespace host

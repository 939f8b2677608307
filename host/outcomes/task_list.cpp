#include "host/outcomes/task_list.h"

#include <strings.h>

#include <algorithm>
#include <cstdio>
#include <iterator>
#include <random>
#include <utility>

#include "host/commands/ear.h"
#include "host/outcomes/packed_row.h"
#include "host/tables/plugin_facts.h"
#include "host/tables/row_fields.h"

namespace host {
namespace {

constexpr std::size_t kLongestValue = 4096;
/// Of the commands of all tasks that are over.
constexpr std::size_t kMostWeight = std::size_t{8} << 20;

std::string randomName() {
    std::random_device source;
    char text[16];
    std::snprintf(text, sizeof text, "%08x", static_cast<unsigned>(source()));
    return text;
}

const oxa::Column* find(const oxa::Table& table, std::string_view column) {
    return table.find(std::string(column));
}

/// The column's value as a row of the table would have it.
std::string asInRow(const oxa::Column& column, std::string_view value) {
    std::string text(value.substr(0, static_cast<std::size_t>(std::max(0, column.length))));
    text.erase(text.find_last_not_of(' ') + 1);
    return text;
}

/// The plug-in takes the last value of a column that is given more than once.
std::vector<std::pair<std::string, std::string>> valuesOf(const Query& query) {
    std::vector<std::pair<std::string, std::string>> values;
    for (const oxa::Predicate& condition : query.where) {
        const auto same = std::find_if(values.begin(), values.end(), [&](const auto& value) {
            return value.first == condition.column;
        });
        if (same == values.end()) {
            values.emplace_back(condition.column, condition.value);
        } else {
            same->second = condition.value;
        }
    }
    return values;
}

/// Leaves out what may be a secret and cuts what is long.
void makeKeepable(Task& task) {
    const bool secret = task.value(plugin::kCommandColumn) == plugin::kSetConfiguration;
    const auto isContext = [](const auto& value) { return value.first == plugin::kContextColumn; };
    std::vector<std::pair<std::string, std::string>>& values = task.request;
    if (secret) values.erase(std::remove_if(values.begin(), values.end(), isContext), values.end());
    for (auto& value : values) {
        if (value.second.size() > kLongestValue) value.second.resize(kLongestValue);
        value.second.shrink_to_fit();
    }
}

void blank(std::string& row, const oxa::Column& column) {
    const auto offset = static_cast<std::size_t>(std::max(0, column.offset));
    const auto length = static_cast<std::size_t>(std::max(0, column.length));
    if (offset > row.size() || length > row.size() - offset) return;
    std::fill_n(row.begin() + column.offset, length, ' ');
}

std::size_t weightOf(const std::vector<Command>& commands) {
    std::size_t bytes = 0;
    for (const Command& command : commands) {
        bytes += sizeof command + command.line.size() + command.out.text().size() +
                 command.err.text().size();
    }
    return bytes;
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

Task TaskList::Entry::whole() const {
    Task copy = task;
    copy.reply = unpackRow(reply);
    for (const std::string& row : outcomes)
        copy.outcomes.push_back(unpackRow(row));
    return copy;
}

Task TaskList::Entry::summary() const {
    Task copy;
    copy.id = task.id;
    copy.asker = task.asker;
    copy.request = task.request;
    copy.state = task.state;
    copy.accepted = task.accepted;
    copy.started = task.started;
    copy.ended = task.ended;
    return copy;
}

TaskList::TaskList(const TableSet& tables, OutcomeFeed& feed, bool seesThrough)
    : seesThrough_(seesThrough), run_(randomName() + '-') {
    const oxa::Table* const requests = tables.find(plugin::kRequestTable);
    const oxa::Table* const outcomes = tables.find(plugin::kOutcomeTable);
    if (requests == nullptr || outcomes == nullptr) return;
    columns_ = {host::find(*requests, plugin::kTransidColumn),
                host::find(*requests, plugin::kRetvalColumn),
                host::find(*requests, plugin::kContextColumn),
                host::find(*outcomes, plugin::kTransidColumn),
                host::find(*outcomes, plugin::kRetvalColumn)};
    if (!columns_.complete()) return;
    requests_ = requests;
    outcomes_ = feed.subscribe({}, [this](const oxa::Rows& rows) {
        std::vector<Command> commands = takeOfPluginThread().commands;
        for (std::size_t i = 0; i < rows.count(); ++i)
            take(std::string(rowOf(rows, i)), std::exchange(commands, {}));
        return static_cast<int>(OXA_OK);
    });
}

TaskList::Request::Request(TaskList& list, const Query& query, std::string asker) : list_(list) {
    if (list.requests_ == nullptr || query.table->name != list.requests_->name) return;
    number_ = list.add(query, std::move(asker));
}

TaskList::Request::~Request() {
    if (number_ != 0) list_.forget(number_);
}

void TaskList::Request::answered(const oxa::Rows& rows, const Heard& heard) {
    if (number_ == 0) return;
    const Calls calls = list_.answer(number_, rows, heard);
    calls();
}

void TaskList::Calls::operator()() const {
    for (const WhenOver& waiter : waiters)
        waiter(task);
}

std::uint64_t TaskList::add(const Query& query, std::string asker) {
    Entry entry;
    entry.task.asker = std::move(asker);
    entry.task.request = valuesOf(query);
    entry.task.accepted = WallClock::now();
    entry.transid = asInRow(*columns_.transid, entry.task.value(plugin::kTransidColumn));
    entry.overAtFirst = entry.task.value(plugin::kCommandColumn) != plugin::kInstall ||
                        entry.task.value(plugin::kOptionalColumn) != plugin::kWithRestart;
    makeKeepable(entry.task);
    const embedded::MutexLock lock(lock_);
    const std::uint64_t number = ++lastNumber_;
    entry.task.id = run_ + std::to_string(number);
    entries_.emplace(number, std::move(entry));
    return number;
}

void TaskList::forget(std::uint64_t number) {
    const embedded::MutexLock lock(lock_);
    const auto found = entries_.find(number);
    if (found != entries_.end() && !found->second.answered) entries_.erase(found);
}

TaskList::Calls TaskList::answer(std::uint64_t number, const oxa::Rows& rows, const Heard& heard) {
    const embedded::MutexLock lock(lock_);
    Entry& entry = entries_.at(number);
    Task& task = entry.task;
    std::optional<int> retval = heard.answer;
    const std::string_view command = task.value(plugin::kCommandColumn);
    if (rows.count() > 0) {
        std::string reply(rowOf(rows, 0));
        retval = integerField(*columns_.retval, reply);
        entry.transid = textField(*columns_.transid, reply);
        if (plugin::holdsConfiguration(command) && columns_.context != nullptr) {
            blank(reply, *columns_.context);
        }
        entry.reply = packRow(reply);
    }
    if (!retval && !entry.ended) return {};
    entry.answered = true;
    if (plugin::runsAtOnce(command)) {
        task.started = task.accepted;
        task.commands = heard.commands;
        if (command == plugin::kGetConfiguration) {
            for (Command& ran : task.commands)
                ran.out.clear();  // it is the answer
        }
        entry.retval = retval.value_or(plugin::kAccepted);
        return finish(number, judge(entry));
    }
    if (retval && *retval != plugin::kAccepted) return finish(number, TaskState::Refused);
    entry.turn = ++lastTurn_;
    task.accepted = std::min(WallClock::now(), task.ended.value_or(WallClock::time_point::max()));
    if (entry.ended) return finish(number, judge(entry));
    startNext();
    return {};
}

void TaskList::take(const std::string& row, std::vector<Command> commands) {
    Calls calls;
    {
        const embedded::MutexLock lock(lock_);
        const auto found = awaiting(textField(*columns_.outcomeTransid, row));
        if (found == entries_.end()) return;
        Entry& entry = found->second;
        entry.outcomes.push_back(packRow(row));
        append(entry.task.commands, std::move(commands));
        entry.retval = integerField(*columns_.outcomeRetval, row);
        entry.ended =
            entry.overAtFirst || entry.retval != plugin::kAccepted || entry.outcomes.size() > 1;
        if (!entry.ended) return;
        entry.task.ended = WallClock::now();
        if (!entry.answered) return;  // its thread has yet to come
        calls = finish(found->first, judge(entry));
        startNext();
    }
    calls();
}

/// The task that an outcome with this TRANSID ends: the first one accepted, or else one whose
/// answer is on its way.
TaskList::Entries::iterator TaskList::awaiting(std::string_view transid) {
    auto best = entries_.end();
    for (auto at = entries_.begin(); at != entries_.end(); ++at) {
        const Entry& entry = at->second;
        if (entry.ended || isOver(entry.task.state) || entry.transid != transid) continue;
        if (plugin::runsAtOnce(entry.task.value(plugin::kCommandColumn))) continue;
        if (best == entries_.end()) {
            best = at;
        } else if (entry.answered && (!best->second.answered || entry.turn < best->second.turn)) {
            best = at;
        }
    }
    return best;
}

void TaskList::startNext() {
    Entry* next = nullptr;
    for (auto& [number, entry] : entries_) {
        if (entry.turn == 0 || isOver(entry.task.state)) continue;
        if (next == nullptr || entry.turn < next->turn) next = &entry;
    }
    if (next == nullptr || next->task.state == TaskState::Running) return;
    next->task.state = TaskState::Running;
    next->task.started = WallClock::now();
}

TaskState TaskList::judge(const Entry& entry) const {
    if (entry.retval != plugin::kAccepted) return TaskState::Failed;
    const std::vector<Command>& commands = entry.task.commands;
    const bool unseen = std::any_of(commands.begin(), commands.end(),
                                    [](const Command& command) { return command.failedUnseen(); });
    return seesThrough_ && unseen ? TaskState::Failed : TaskState::Done;
}

TaskList::Calls TaskList::finish(std::uint64_t number, TaskState state) {
    Entry& entry = entries_.at(number);
    Task& task = entry.task;
    task.state = state;
    if (!task.ended) task.ended = WallClock::now();
    if (!task.started && state != TaskState::Refused) task.started = task.accepted;
    Calls calls;
    for (auto at = waiters_.begin(); at != waiters_.end();) {
        if (at->second.id != task.id) {
            ++at;
            continue;
        }
        calls.waiters.push_back(std::move(at->second.whenOver));
        at = waiters_.erase(at);
    }
    if (!calls.waiters.empty()) calls.task = entry.whole();
    entry.weight = weightOf(task.commands);
    weight_ += entry.weight;
    over_.push_back(number);
    trim();
    return calls;
}

void TaskList::trim() {
    while (over_.size() > kKept) {
        const auto oldest = entries_.find(over_.front());
        weight_ -= oldest->second.weight;
        entries_.erase(oldest);
        over_.pop_front();
    }
    for (const std::uint64_t number : over_) {
        if (weight_ <= kMostWeight) return;
        Entry& entry = entries_.at(number);
        weight_ -= std::exchange(entry.weight, 0);
        std::vector<Command>().swap(entry.task.commands);
    }
}

std::vector<Task> TaskList::newest(const Filter& filter) const {
    std::vector<Task> found;
    const embedded::MutexLock lock(lock_);
    for (auto at = entries_.rbegin(); at != entries_.rend() && found.size() < filter.limit; ++at) {
        const Task& task = at->second.task;
        if (!at->second.answered) continue;
        if (filter.state && task.state != *filter.state) continue;
        if (filter.product && task.value(plugin::kProductColumn) != *filter.product) continue;
        if (filter.command && task.value(plugin::kCommandColumn) != *filter.command) continue;
        found.push_back(at->second.summary());
    }
    return found;
}

TaskList::Entries::const_iterator TaskList::entryOf(std::string_view name) const {
    auto newest = entries_.end();
    for (auto at = entries_.begin(); at != entries_.end(); ++at) {
        if (!at->second.answered) continue;
        if (at->second.task.id == name) return at;
        if (at->second.transid == name) newest = at;
    }
    return newest;
}

bool TaskList::unfinished(const std::string& product) const {
    if (product.empty()) return false;
    const embedded::MutexLock lock(lock_);
    return std::any_of(entries_.begin(), entries_.end(), [&product](const auto& each) {
        const Entry& entry = each.second;
        const std::string other(entry.task.value(plugin::kProductColumn));
        return entry.turn != 0 && !isOver(entry.task.state) &&
               ::strcasecmp(other.c_str(), product.c_str()) == 0;
    });
}

std::optional<Task> TaskList::find(std::string_view name) const {
    std::optional<Task> found;
    bool atWork = false;
    {
        const embedded::MutexLock lock(lock_);
        const auto entry = entryOf(name);
        if (entry == entries_.end()) return std::nullopt;
        found = entry->second.whole();
        atWork = found->state == TaskState::Running;
    }
    if (atWork) append(found->commands, commandsOfPluginThreads());
    return found;
}

std::uint64_t TaskList::awaitEnd(const std::string& id, WhenOver whenOver) {
    std::optional<Task> over;
    {
        const embedded::MutexLock lock(lock_);
        const auto entry = entryOf(id);
        if (entry != entries_.end() && isOver(entry->second.task.state)) {
            over = entry->second.whole();
        } else {
            waiters_.emplace(++lastWaiter_, Waiter{id, std::move(whenOver)});
            return lastWaiter_;
        }
    }
    whenOver(*over);
    return 0;
}

void TaskList::cancel(std::uint64_t waiter) {
    const embedded::MutexLock lock(lock_);
    waiters_.erase(waiter);
}

}  // namespace host

#include "host/outcomes/task_watch.h"

#include <algorithm>
#include <iterator>
#include <string_view>

#include "host/tables/plugin_facts.h"
#include "host/tables/row_fields.h"

namespace host {
bool TaskWatch::Columns::complete() const {
    return transid != nullptr && command != nullptr && retval != nullptr &&
           outcomeTransid != nullptr;
}

TaskWatch::Columns TaskWatch::columnsOf(const oxa::Table& requests, const oxa::Table& outcomes) {
    return {columnOf(requests, plugin::kTransidColumn), columnOf(requests, plugin::kCommandColumn),
            columnOf(requests, plugin::kRetvalColumn), columnOf(outcomes, plugin::kTransidColumn)};
}

TaskWatch::TaskWatch(const TableSet& tables, OutcomeFeed& feed) : feed_(feed) {
    const oxa::Table* const requests = tables.find(plugin::kRequestTable);
    const oxa::Table* const outcomes = tables.find(plugin::kOutcomeTable);
    if (requests == nullptr || outcomes == nullptr) return;
    columns_ = columnsOf(*requests, *outcomes);
    if (!columns_.complete()) return;
    outcomes_ = feed_.subscribe({}, [this](const oxa::Rows& rows) {
        published(rows);
        return static_cast<int>(OXA_OK);
    });
    if (outcomes_) requests_ = requests;
}

TaskWatch::Request::Request(TaskWatch& watch, const oxa::Table& table)
    : watch_(watch), table_(table) {
    watch_.began();
}

TaskWatch::Request::~Request() {
    watch_.ended();
}

void TaskWatch::Request::answered(const oxa::Rows& rows) {
    if (watch_.requests_ == nullptr || table_.name != watch_.requests_->name) return;
    const Columns& columns = watch_.columns_;
    for (std::size_t i = 0; i < rows.count(); ++i) {
        const RowView row = rowOf(rows, i);
        if (integerField(*columns.retval, row) != plugin::kAccepted) continue;
        if (plugin::runsAtOnce(textField(*columns.command, row))) continue;
        watch_.accepted(std::string(textField(*columns.transid, row)));
    }
}

void TaskWatch::began() {
    const embedded::MutexLock lock(lock_);
    ++running_;
}

void TaskWatch::ended() {
    const embedded::MutexLock lock(lock_);
    if (--running_ > 0) return;
    // No query is left that could still claim an outcome that came early.
    for (auto entry = outstanding_.begin(); entry != outstanding_.end();) {
        entry = entry->second < 0 ? outstanding_.erase(entry) : std::next(entry);
    }
}

void TaskWatch::accepted(const std::string& transid) {
    const embedded::MutexLock lock(lock_);
    if (++outstanding_[transid] == 0) outstanding_.erase(transid);
}

void TaskWatch::published(const oxa::Rows& rows) {
    const embedded::MutexLock lock(lock_);
    for (std::size_t i = 0; i < rows.count(); ++i) {
        const std::string transid(textField(*columns_.outcomeTransid, rowOf(rows, i)));
        if (running_ == 0 && outstanding_.count(transid) == 0) continue;
        if (--outstanding_[transid] == 0) outstanding_.erase(transid);
    }
}

bool TaskWatch::quiet(bool willNotEnd) const {
    const bool held = feed_.holding();
    const embedded::MutexLock lock(lock_);
    if (running_ > 0) return false;
    return held || willNotEnd ||
           std::all_of(outstanding_.begin(), outstanding_.end(),
                       [](const auto& entry) { return entry.second <= 0; });
}

}  // namespace host

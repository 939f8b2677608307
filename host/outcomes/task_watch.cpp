#include "host/outcomes/task_watch.h"

#include <algorithm>
#include <iterator>
#include <string_view>

#include "host/tables/row_fields.h"

namespace host {
namespace {

constexpr const char* kRequestTable = "KAGREQT";
constexpr const char* kOutcomeTable = "KAGDYST";

/// These two are carried out before their request is answered; all others are queued.
bool runsAtOnce(std::string_view command) {
    return command == "GETCONFIG" || command == "COMPLETE_INSTALL";
}

const oxa::Table* find(const std::vector<oxa::Table>& tables, std::string_view name) {
    const auto found = std::find_if(tables.begin(), tables.end(),
                                    [&](const oxa::Table& table) { return table.name == name; });
    return found == tables.end() ? nullptr : &*found;
}

}  // namespace

TaskWatch::Columns TaskWatch::columnsOf(const oxa::Table& table) {
    return {table.find("TRANSID"), table.find("COMMAND"), table.find("RETVAL")};
}

TaskWatch::TaskWatch(const std::vector<oxa::Table>& tables)
    : requests_(find(tables, kRequestTable)), outcomes_(find(tables, kOutcomeTable)) {
    if (requests_ == nullptr || outcomes_ == nullptr) return;
    requestColumns_ = columnsOf(*requests_);
    outcomeColumns_ = columnsOf(*outcomes_);
    if (requestColumns_.transid == nullptr || requestColumns_.command == nullptr ||
        requestColumns_.retval == nullptr || outcomeColumns_.transid == nullptr) {
        requests_ = nullptr;
        return;
    }
    counting_ = oxa::subscribe(kOutcomeTable, {}, [this](const oxa::Rows& rows) {
        published(rows);
        return static_cast<int>(OXA_OK);
    });
}

TaskWatch::~TaskWatch() {
    release();
    holding_.reset();
    counting_.reset();
}

void TaskWatch::release() {
    {
        const embedded::MutexLock lock(lock_);
        letGo_ = true;
    }
    released_.notify_all();
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
    const Columns& columns = watch_.requestColumns_;
    for (std::size_t i = 0; i < rows.count(); ++i) {
        const RowView row = rowOf(rows, i);
        if (integerField(*columns.retval, row) != 0) continue;
        if (runsAtOnce(textField(*columns.command, row))) continue;
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
    // Nobody is left who could still claim an outcome that came early.
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
        const std::string transid(textField(*outcomeColumns_.transid, rowOf(rows, i)));
        if (running_ == 0 && outstanding_.count(transid) == 0) continue;
        if (--outstanding_[transid] == 0) outstanding_.erase(transid);
    }
}

void TaskWatch::holdAfterTask() {
    if (!counting_ || holding_) return;
    // Live objects get rows in the order in which they came, so this one is the last.
    holding_ = oxa::subscribe(kOutcomeTable, {}, [this](const oxa::Rows&) {
        embedded::MutexLock lock(lock_);
        held_ = true;
        while (!letGo_)
            lock.wait(released_);
        return static_cast<int>(OXA_OK);
    });
}

bool TaskWatch::quiet() const {
    const embedded::MutexLock lock(lock_);
    if (running_ > 0) return false;
    return held_ || std::all_of(outstanding_.begin(), outstanding_.end(),
                                [](const auto& entry) { return entry.second <= 0; });
}

}  // namespace host

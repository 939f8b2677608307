/// Whether the plug-in is at work, so that the host does not end in the middle of a task.
#pragma once

#include <map>
#include <memory>
#include <string>

#include "embedded/mutex.h"
#include "embedded/oxa_host.h"
#include "host/outcomes/outcome_feed.h"
#include "host/tables/table_set.h"

namespace host {

/// Knows two kinds of work: queries that a thread of the host is running now, and tasks that the
/// request table has accepted and whose outcome has not been published yet.
///
/// A task counts from the reply that accepts it until an outcome with its TRANSID comes. A request
/// whose own conditions hide its reply row is not counted.
class TaskWatch {
public:
    /// Both outlive this object. Without a request table and an outcome table that have the columns
    /// that matter, no task is ever counted.
    TaskWatch(const TableSet& tables, OutcomeFeed& feed);
    TaskWatch(const TaskWatch&) = delete;
    TaskWatch& operator=(const TaskWatch&) = delete;

    /// One query, for as long as it runs. Any thread.
    class Request {
    public:
        Request(TaskWatch& watch, const oxa::Table& table);
        ~Request();
        Request(const Request&) = delete;
        Request& operator=(const Request&) = delete;
        /// The query has been answered with these rows.
        void answered(const oxa::Rows& rows);

    private:
        TaskWatch& watch_;
        const oxa::Table& table_;
    };

    /// True when no query runs and either no task is outstanding or the feed holds the executor.
    /// `willNotEnd`: the task in hand waits for the host's end, so it is not waited for. Any
    /// thread.
    bool quiet(bool willNotEnd = false) const;

private:
    struct Columns {
        const oxa::Column* transid = nullptr;
        const oxa::Column* command = nullptr;
        const oxa::Column* retval = nullptr;
        const oxa::Column* outcomeTransid = nullptr;
        bool complete() const;
    };
    static Columns columnsOf(const oxa::Table& requests, const oxa::Table& outcomes);

    void began();
    void ended();
    void accepted(const std::string& transid);
    void published(const oxa::Rows& rows);

    OutcomeFeed& feed_;
    const oxa::Table* requests_ = nullptr;  ///< null: no task is counted
    Columns columns_;

    mutable embedded::Mutex lock_;
    unsigned running_ ZAV_GUARDED_BY(lock_) = 0;
    /// By TRANSID: tasks accepted less outcomes published. Negative when the outcome came before
    /// the thread that ran the query got to report that the task was accepted.
    std::map<std::string, int> outstanding_ ZAV_GUARDED_BY(lock_);

    std::unique_ptr<OutcomeFeed::Subscription> outcomes_;  ///< last, so that it ends first
};

}  // namespace host

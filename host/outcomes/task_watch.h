/// Knows whether the plug-in is at work, so that the host does not end in the middle of a task.
#pragma once

#include <condition_variable>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "embedded/mutex.h"
#include "embedded/oxa_host.h"

namespace host {

/// Two kinds of work are known: requests that a thread of the host is sampling now, and tasks that
/// the request table accepted and whose outcome the deploy status table has not published yet.
///
/// A task is counted when the reply to its request says so (RETVAL 0 of a queued command) and
/// leaves the count with the outcome of its TRANSID. A request whose own conditions hide its reply
/// row is not counted.
class TaskWatch {
public:
    /// `tables`: those of the plug-in, which outlive this object; without a request table or a
    /// deploy status table nothing is ever queued.
    explicit TaskWatch(const std::vector<oxa::Table>& tables);
    ~TaskWatch();
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

    /// From now on the executor is held when it publishes an outcome, after every other subscriber
    /// has got it: the next task is not begun only to be cut off. Subscriptions on the deploy
    /// status table must be neither opened nor closed afterwards, their table being locked while
    /// the executor is held.
    void holdAfterTask();
    /// Lets a held executor go, and holds none any more.
    void release();
    /// No request runs, and no task is in hand: none is outstanding, or the executor is held.
    bool quiet() const;

private:
    struct Columns {
        const oxa::Column* transid = nullptr;
        const oxa::Column* command = nullptr;
        const oxa::Column* retval = nullptr;
    };
    static Columns columnsOf(const oxa::Table& table);

    void began();
    void ended();
    void accepted(const std::string& transid);
    void published(const oxa::Rows& rows);

    const oxa::Table* requests_ = nullptr;
    const oxa::Table* outcomes_ = nullptr;
    Columns requestColumns_;
    Columns outcomeColumns_;

    mutable embedded::Mutex lock_;
    std::condition_variable released_;
    unsigned running_ ZAV_GUARDED_BY(lock_) = 0;
    /// Tasks accepted less outcomes published. Negative: the outcome came before the thread that
    /// sampled the request got to say that it was accepted.
    std::map<std::string, int> outstanding_ ZAV_GUARDED_BY(lock_);
    bool held_ ZAV_GUARDED_BY(lock_) = false;
    bool letGo_ ZAV_GUARDED_BY(lock_) = false;

    std::unique_ptr<oxa::Subscription> counting_;
    std::unique_ptr<oxa::Subscription> holding_;
};

}  // namespace host

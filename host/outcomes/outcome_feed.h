/// Rows of the outcome table for everybody inside the host.
#pragma once

#include <condition_variable>
#include <cstdint>
#include <map>
#include <memory>
#include <vector>

#include "embedded/mutex.h"
#include "embedded/oxa_host.h"
#include "host/tables/table_set.h"

namespace host {

/// Holds the one subscription to the plug-in's outcome table and hands each row to its own
/// subscribers, one after the other, in the order in which they came.
///
/// Any thread may use it. Subscribers are called on the thread that publishes the row, the
/// plug-in's executor, which goes on when the last of them has returned. No lock is held meanwhile,
/// neither the feed's nor the table's.
class OutcomeFeed {
public:
    /// `tables` outlives the feed. Without an outcome table among them nothing ever comes.
    explicit OutcomeFeed(const TableSet& tables);
    /// Lets a held executor go, and waits for rows on their way. Every subscription has ended
    /// before.
    ~OutcomeFeed();
    OutcomeFeed(const OutcomeFeed&) = delete;
    OutcomeFeed& operator=(const OutcomeFeed&) = delete;

    /// Ends with the object: once the destructor has returned, the sink is not called any more and
    /// has been destroyed. The destructor waits for a call of this sink in progress, so it must not
    /// run in a sink, nor under a lock that the sink takes.
    class Subscription {
    public:
        Subscription(OutcomeFeed& feed, std::uint64_t number) : feed_(feed), number_(number) {}
        ~Subscription() { feed_.remove(number_); }
        Subscription(const Subscription&) = delete;
        Subscription& operator=(const Subscription&) = delete;

    private:
        OutcomeFeed& feed_;
        const std::uint64_t number_;
    };

    /// Subscribes to the rows that satisfy all conditions, judged as the table judges them. Rows
    /// whose publication begins after the return reach the sink. What it answers or
    /// throws is ignored. Null when there is no outcome table or it makes no filter.
    std::unique_ptr<Subscription> subscribe(const std::vector<oxa::Predicate>& where,
                                            oxa::Sink sink);

    /// From now on the executor is held as soon as every subscriber has got the row that is being
    /// published, or the next one: it begins no other task, which would only be cut off.
    void holdAfterOutcome();
    /// Lets a held executor go, and holds none any more.
    void release();
    /// Whether the executor is held.
    bool holding() const;

private:
    struct Subscriber {
        std::unique_ptr<oxa::Filter> filter;  ///< null: takes every row
        oxa::Sink sink;
    };

    void deliver(const oxa::Rows& rows);
    void deliverInTurn(std::uint64_t place, const oxa::Rows& rows);
    void deliverToAll(const oxa::Rows& rows);
    static void deliverTo(const Subscriber& subscriber, const oxa::Rows& rows) noexcept;
    void remove(std::uint64_t number);
    void holdIfWanted();

    const oxa::Table* const table_;  ///< null: there is none

    mutable embedded::Mutex lock_;
    std::condition_variable changed_;
    /// By number, and numbers grow: so this is the order in which they came.
    std::map<std::uint64_t, Subscriber> subscribers_ ZAV_GUARDED_BY(lock_);
    std::uint64_t nextNumber_ ZAV_GUARDED_BY(lock_) = 1;
    std::uint64_t called_ ZAV_GUARDED_BY(lock_) = 0;     ///< whose sink runs now; 0: none
    std::uint64_t came_ ZAV_GUARDED_BY(lock_) = 0;       ///< dispatches so far
    std::uint64_t delivered_ ZAV_GUARDED_BY(lock_) = 0;  ///< those that everybody has got
    bool wanted_ ZAV_GUARDED_BY(lock_) = false;
    bool holding_ ZAV_GUARDED_BY(lock_) = false;
    bool released_ ZAV_GUARDED_BY(lock_) = false;

    std::unique_ptr<oxa::Subscription> source_;
};

}  // namespace host

/// The tasks of this run of the host, in memory.
#pragma once

#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "embedded/mutex.h"
#include "embedded/oxa_host.h"
#include "host/commands/recorder.h"
#include "host/outcomes/outcome_feed.h"
#include "host/outcomes/task.h"
#include "host/tables/query.h"
#include "host/tables/table_set.h"

namespace host {

/// Follows each request on the request table to its end. Of tasks that are over only the last ones
/// are kept, and the commands of the oldest go when all of them together are too large.
///
/// The executor takes tasks in the order of their acceptance, so the oldest one without an outcome
/// is the one that runs, and what is heard on the executor's thread until that outcome is its work.
/// Any thread may call.
class TaskList {
public:
    static constexpr std::size_t kKept = 1000;

    /// Both outlive this object, and nobody has subscribed to the feed before: whoever gets an
    /// outcome finds it here. Without a request table and an outcome table that have the columns
    /// that matter, there are never any tasks.
    /// `seesThrough`: a success in whose course a command failed unseen counts as failed.
    TaskList(const TableSet& tables, OutcomeFeed& feed, bool seesThrough);
    TaskList(const TaskList&) = delete;
    TaskList& operator=(const TaskList&) = delete;

    /// One query, for as long as it runs on its thread; a task if it is one on the request table.
    /// Without an answer there was no task.
    class Request {
    public:
        Request(TaskList& list, const Query& query, std::string asker);
        ~Request();
        Request(const Request&) = delete;
        Request& operator=(const Request&) = delete;
        /// The query has been answered with these rows, and this was heard on its thread.
        void answered(const oxa::Rows& rows, const Heard& heard);

    private:
        TaskList& list_;
        std::uint64_t number_ = 0;  ///< 0: not on the request table
    };

    struct Filter {
        std::optional<TaskState> state{};
        std::optional<std::string> product{};
        std::optional<std::string> command{};
        std::size_t limit = kKept;
    };
    /// The tasks that satisfy all conditions, newest first, without their rows and
    /// commands.
    std::vector<Task> newest(const Filter& filter) const;

    /// Whether an accepted task for the product, in upper or lower case, is not over. False for no
    /// product.
    bool unfinished(const std::string& product) const;

    /// The task with this identifier, or else the newest one with this TRANSID. The commands of a
    /// running one are those so far.
    std::optional<Task> find(std::string_view name) const;

    /// Gets the task once it is over, on the thread that ends it. Must return quickly.
    using WhenOver = std::function<void(const Task& task)>;
    /// Calls `whenOver` as soon as the task with this identifier is over: at once if it is, never
    /// if there is none. Returns a number for cancel().
    std::uint64_t awaitEnd(const std::string& id, WhenOver whenOver);
    /// Forgets one that was not called; a call may be in progress.
    void cancel(std::uint64_t waiter);

private:
    struct Columns {
        const oxa::Column* transid = nullptr;
        const oxa::Column* retval = nullptr;
        const oxa::Column* context = nullptr;  ///< may be missing
        const oxa::Column* outcomeTransid = nullptr;
        const oxa::Column* outcomeRetval = nullptr;
        bool complete() const;
    };
    struct Entry {
        Task task;                          ///< without its rows
        std::string reply;                  ///< packed
        std::vector<std::string> outcomes;  ///< packed
        std::string transid;                ///< as the outcome will have it
        std::uint64_t turn = 0;  ///< place in the executor's queue; 0: not accepted, or ran at once
        bool answered = false;
        bool overAtFirst = true;  ///< its first outcome with RETVAL 0 is its last
        int retval = 0;           ///< of its last outcome
        bool ended = false;       ///< its last outcome has come
        std::size_t weight = 0;   ///< bytes of its commands, once it is over

        Task whole() const;
        Task summary() const;  ///< without rows and commands
    };
    struct Waiter {
        std::string id;
        WhenOver whenOver;
    };
    /// Waiters and the task that they get, to be called without the lock.
    struct Calls {
        std::vector<WhenOver> waiters;
        Task task;
        void operator()() const;
    };
    using Entries = std::map<std::uint64_t, Entry>;

    std::uint64_t add(const Query& query, std::string asker);
    void forget(std::uint64_t number);
    Calls answer(std::uint64_t number, const oxa::Rows& rows, const Heard& heard);
    void take(const std::string& row, std::vector<Command> commands);

    Entries::iterator awaiting(std::string_view transid) ZAV_REQUIRES(lock_);
    Entries::const_iterator entryOf(std::string_view name) const ZAV_REQUIRES(lock_);
    void startNext() ZAV_REQUIRES(lock_);
    Calls finish(std::uint64_t number, TaskState state) ZAV_REQUIRES(lock_);
    TaskState judge(const Entry& entry) const;
    void trim() ZAV_REQUIRES(lock_);

    const bool seesThrough_;
    const std::string run_;                 ///< what the identifiers of this run have in common
    const oxa::Table* requests_ = nullptr;  ///< null: there are no tasks
    Columns columns_;

    mutable embedded::Mutex lock_;
    Entries entries_ ZAV_GUARDED_BY(lock_);
    std::deque<std::uint64_t> over_ ZAV_GUARDED_BY(lock_);  ///< in the order of their ends
    std::size_t weight_ ZAV_GUARDED_BY(lock_) = 0;          ///< of all of them together
    std::uint64_t lastNumber_ ZAV_GUARDED_BY(lock_) = 0;
    std::uint64_t lastTurn_ ZAV_GUARDED_BY(lock_) = 0;
    std::map<std::uint64_t, Waiter> waiters_ ZAV_GUARDED_BY(lock_);
    std::uint64_t lastWaiter_ ZAV_GUARDED_BY(lock_) = 0;

    std::unique_ptr<OutcomeFeed::Subscription> outcomes_;  ///< last, so that it ends first
};

}  // namespace host

/// The tasks: each request on the request table, followed to its end.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "embedded/mutex.h"
#include "embedded/oxa_host.h"
#include "host/commands/command_ending.h"
#include "host/commands/recorder.h"
#include "host/outcomes/outcome_feed.h"
#include "host/outcomes/task.h"
#include "host/outcomes/task_counts.h"
#include "host/outcomes/task_keeper.h"
#include "host/tables/query.h"
#include "host/tables/table_set.h"

namespace host {

/// Has every change of a task kept before anybody can see it, and holds in memory only what the
/// plug-in has been given and has not finished.
///
/// The executor takes tasks in the order of their acceptance, so the oldest one without an outcome
/// is the one that runs, and what is heard on the executor's thread until that outcome is its work.
/// Any thread may call.
class TaskList {
public:
    using Filter = TaskFilter;

    /// All of them outlive this object, and nobody has subscribed to the feed before: an outcome is
    /// kept before anybody else gets it, and before the executor begins its next task. Without a
    /// request table and an outcome table that have the columns that matter, there are never any
    /// tasks, and outcomes belong to none.
    /// `guarded`: a success in whose course a command failed unseen counts as failed, and a request
    /// that cannot be kept is not handed over.
    TaskList(const TableSet& tables, OutcomeFeed& feed, TaskKeeper& keeper, bool guarded);
    TaskList(const TaskList&) = delete;
    TaskList& operator=(const TaskList&) = delete;

    /// One query, for as long as it runs on its thread; a task if it is one on the request table.
    /// Without an answer there was no task.
    ///
    /// A request that will be queued is kept first. Until its query has been answered the next one
    /// waits, so that the order in which they are kept is the one in which the plug-in gets them.
    class Request {
    public:
        /// Throws NotKept; unguarded, the request goes on and is no task.
        /// `forced`: with a guard passed by, should it be handed over again after a kill.
        Request(TaskList& list, const Query& query, std::string asker, bool forced = false);
        /// Hands over a task that has been entered. Throws what TaskKeeper::handOver() throws.
        Request(TaskList& list, Task task);
        ~Request();
        Request(const Request&) = delete;
        Request& operator=(const Request&) = delete;
        /// The query has been answered with these rows, and this was heard on its thread. Returns
        /// false when that does not say whether the plug-in has the task.
        bool answered(const oxa::Rows& rows, const Heard& heard);

    private:
        TaskList& list_;
        std::unique_lock<std::mutex> turn_;
        std::uint64_t number_ = 0;  ///< 0: no task
    };

    /// The tasks that satisfy all conditions, newest first, without their commands.
    std::vector<Task> newest(const TaskFilter& filter) const { return keeper_.newest(filter); }

    /// Whether an accepted task for the product, in upper or lower case, is not over and may change
    /// whether it is installed or which instances it has. False for no product.
    bool mayChange(const std::string& product) const;
    /// Whether the plug-in has any accepted task that is not over.
    bool anyAtWork() const;

    /// Whether a task whose turn has come shall not be handed over yet: what the plug-in got by a
    /// query meanwhile may change what the guards would see, or leaves the result of an install
    /// that may restart the host where this one's result belongs.
    bool mustWait(const Task& task) const;

    /// Whether an install has begun that may restart the host: it waits for the host's end, or for
    /// its own.
    bool restartsHost() const;
    /// Whether the plug-in has such an install, begun or not.
    bool mayRestartHost() const;

    /// The task with this identifier, or else the newest one with this TRANSID. The commands of a
    /// running one are those so far.
    std::optional<Task> find(std::string_view name) const;

    /// A task that has been entered ends without having been handed over. Throws NotKept.
    void end(const Task& task);
    /// The same, for one whose end has been kept already.
    void hasEnded(const Task& task) { tellOfEnd(task); }

    /// The tasks that have ended in this run of the host.
    const TaskCounts& counts() const { return counts_; }

    /// Ends what this task's commands have started, and each further one at its start: now, or when
    /// the task begins. That somebody wants it has been kept. The task is cancelled if a signal
    /// reached any of it; if none did, it ends as it would have. Nothing happens when it is too
    /// late.
    void endCommandsOf(std::int64_t number);

    /// Gets what the commands of a task write, on the thread that runs them. Must return quickly.
    using Follower = std::function<void(const OutputPiece& piece)>;
    /// From now on calls `follower` with what the commands of the task with this number write.
    /// Returns a number for unfollow().
    std::uint64_t follow(std::int64_t number, Follower follower);
    /// Forgets it; a call may be in progress.
    void unfollow(std::uint64_t follower);

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
    static Columns columnsOf(const oxa::Table& requests, const oxa::Table& outcomes);
    struct Entry {
        Task task;
        std::uint64_t turn = 0;   ///< place in the executor's queue; 0: not accepted yet
        bool overAtFirst = true;  ///< its first outcome with RETVAL 0 is its last
        int retval = 0;           ///< of its last outcome
        bool answered = false;
        bool cancelled = false;  ///< somebody wants it to be over
        bool closing = false;    ///< its last outcome is on its way: nothing runs for it any more
        bool reached = false;    ///< a signal reached what its commands had started
        bool tooMuchOutput = false;  ///< its commands wrote too much, and were ended
        bool ended = false;          ///< its last outcome has come
        bool kept = false;           ///< and is durable
    };
    struct Waiter {
        std::string id;
        WhenOver whenOver;
    };
    struct Following {
        std::int64_t number = 0;  ///< the task's
        std::shared_ptr<const Follower> follower;
    };
    using Entries = std::map<std::uint64_t, Entry>;

    std::uint64_t add(const Query& query, std::string asker, bool forced);
    std::uint64_t addHandedOver(Task task);
    std::uint64_t insert(Task task);
    void forget(std::uint64_t number);
    std::optional<int> readAnswer(Entry& entry, const oxa::Rows& rows, const Heard& heard);
    bool answer(std::uint64_t number, const oxa::Rows& rows, const Heard& heard);
    void endAnswered(Entry entry, const Heard& heard);
    void keepRefusal(const Task& task);
    void take(const std::string& row, Heard heard);
    std::vector<Task> takeInto(std::uint64_t number, const std::string& row, Heard heard)
        ZAV_REQUIRES(lock_);
    bool isLast(const Entry& entry, const std::string& row) const;
    /// The task that an outcome ends or tells of; 0: none.
    struct Addressee {
        std::uint64_t number = 0;
        std::unique_ptr<CommandEnding> ending;  ///< of its commands; null if nobody wants that
    };
    Addressee close(const std::string& row);
    void beginEnding(std::uint64_t number, Entry& entry) ZAV_REQUIRES(lock_);
    void noteKept(std::uint64_t number, bool answeredMeanwhile);

    Entries::iterator awaiting(std::string_view transid) ZAV_REQUIRES(lock_);
    std::optional<Task> startNext(std::uint64_t except) ZAV_REQUIRES(lock_);
    TaskState judge(const Entry& entry) const;
    static std::string reasonOf(const Entry& entry);
    void tellOfEnd(const Task& task);
    void tellFollowers(const OutputPiece& piece);
    std::int64_t atWork() const ZAV_REQUIRES(lock_);
    bool isAtWork(std::int64_t number) const;

    const bool guarded_;
    TaskKeeper& keeper_;
    const oxa::Table* requests_ = nullptr;  ///< null: there are no tasks
    const oxa::Table* outcomeTable_ = nullptr;
    Columns columns_;

    TaskCounts counts_;
    std::mutex turns_;  ///< held while one request is handed over

    mutable embedded::Mutex lock_;
    Entries entries_ ZAV_GUARDED_BY(lock_);  ///< what the plug-in has, in the order of its coming
    std::uint64_t lastNumber_ ZAV_GUARDED_BY(lock_) = 0;
    std::uint64_t lastTurn_ ZAV_GUARDED_BY(lock_) = 0;
    std::unique_ptr<CommandEnding> ending_ ZAV_GUARDED_BY(lock_);  ///< null: nothing is ended
    std::uint64_t endingOf_ ZAV_GUARDED_BY(lock_) = 0;             ///< whose commands end
    /// Numbers of cancelled tasks that are on their way to the plug-in, or went on without the
    /// host.
    std::set<std::int64_t> cancelled_ ZAV_GUARDED_BY(lock_);
    std::map<std::uint64_t, Waiter> waiters_ ZAV_GUARDED_BY(lock_);
    std::uint64_t lastWaiter_ ZAV_GUARDED_BY(lock_) = 0;
    std::map<std::uint64_t, Following> followers_ ZAV_GUARDED_BY(lock_);
    std::shared_ptr<const Follower> heard_;  ///< gets what all tasks' commands write

    std::unique_ptr<OutcomeFeed::Subscription> outcomes_;  ///< last, so that it ends first
};

}  // namespace host

/// The journal: what was accepted is never forgotten.
#pragma once

#include <atomic>
#include <chrono>
#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "embedded/mutex.h"
#include "host/journal/database.h"
#include "host/journal/event_log.h"
#include "host/journal/event_position.h"
#include "host/journal/recovery.h"
#include "host/journal/state_directory.h"
#include "host/journal/writer.h"
#include "host/outcomes/task_keeper.h"

namespace host {

/// All tasks of all runs of the host, with their outcomes, in one SQLite database. One thread
/// writes; readers have a connection of their own and see only what is durable.
///
/// Any thread may call.
class Journal final : public TaskKeeper {
public:
    struct Settings {
        std::string directory;          ///< empty: in memory, for the life of this object
        bool rerunInterrupted = false;  ///< the task that an unclean end cut off runs again
        int keepDays = 30;              ///< tasks that have been over for longer are removed
        int keepRows = 10'000;          ///< of older outcomes the rows are removed
        bool mayYield = false;          ///< in memory, too, when another host uses the directory
        /// How often, at least, what is too old is removed.
        std::chrono::milliseconds pruneEvery = std::chrono::hours(1);
        std::string boot{};  ///< names the start of the machine; empty: the system says
    };

    /// Opens the journal or makes a new one, sets a damaged one aside, and settles what the last
    /// run left unfinished. Throws StartError.
    explicit Journal(const Settings& settings);
    ~Journal() override;

    /// What was found at the start.
    const Recovered& recovered() const { return recovered_; }
    /// Writes down that this run ends in good order. `quiet`: the plug-in is at work on nothing, so
    /// what it has in its queue did not begin. Errors are ignored: the next start then looks more
    /// closely.
    void endCleanly(bool quiet) noexcept;
    /// No outcome is recorded any more: who brings one waits for the end of the process. So what is
    /// cut off on purpose is interrupted at the next start, not failed.
    void close() { closed_.store(true); }

    const std::string& identity() const override { return identity_; }
    std::int64_t run() const override { return recovered_.run; }

    void enter(Task& task) override;
    void enterSoon(Task task) override;
    void save(const Task& task) override;
    void handOver(const Task& task) override;
    void handsOver(std::int64_t number) override;
    void saveOutcome(const std::vector<Task>& tasks, const std::string& row) override;
    void saveSoon(Task task) override;
    void keepRow(const std::string& kept, const std::string& row) override;
    void forget(std::int64_t number) override;
    std::vector<Task> newest(const TaskFilter& filter) override;
    std::optional<Task> find(std::string_view name) override;

    /// Every row of the outcome table and every end of a task is an event, once it is durable.
    /// Their numbers have gaps only where some are not kept any more. The position behind the
    /// newest one.
    EventPosition lastEvent() const { return {identity_, events_->last()}; }
    /// The oldest events behind this position of this journal that are still kept, at most `most`
    /// of them. Rows are as the plug-in gave them while memory has them, else masked. Throws
    /// DatabaseError.
    std::vector<JournalEvent> eventsAfter(std::int64_t position, std::size_t most);
    /// From now on calls this after each transaction, on the journal's own thread, and when a task
    /// has begun, on any thread and with its locks. It must return at once and not call back.
    void whenChanged(std::function<void()> call);
    /// See EventLog::whenNew().
    void whenEvents(std::function<void()> call) { events_->whenNew(std::move(call)); }

    /// The oldest task that waits for the host to hand it over.
    std::optional<Task> nextInLine();
    /// With `wanted`, the transaction that records the end of a task which was handed over in its
    /// turn also records that the next in line is handed over, unless that is too late.
    void handOverWithOutcomes(bool wanted) { handsOver_.store(wanted); }
    /// The number of the task that was so recorded, which is to be handed over now; 0: none.
    std::int64_t takeHandedOver() { return handedOver_.exchange(0); }
    /// It is not to be handed over now after all and waits in line again. Throws NotKept.
    void takeBack(std::int64_t number);
    /// The task with this number, as far as it is durable.
    std::optional<Task> byNumber(std::int64_t number);
    /// The time by which tasks expire. It never goes back, not even behind what an earlier run has
    /// written down.
    WallClock::time_point latestTime();
    /// Whether it must not begin any more.
    bool isTooLate(const Task& task);
    /// How many tasks wait so.
    std::int64_t waiting();
    /// How many have not begun, those in the plug-in's queue among them. Unlike newest(), this and
    /// running() make nothing be written sooner.
    std::int64_t notBegun();
    /// The tasks that run.
    std::vector<Task> running();
    /// The tasks that are not over.
    struct Unfinished {
        std::int64_t queued = 0;  ///< have not begun
        std::int64_t running = 0;
        /// When the oldest one that has not begun was accepted.
        std::optional<WallClock::time_point> oldestQueued;
    };
    /// As far as it is durable: what has changed may show a second later. Waits for no disk that
    /// hangs. Throws DatabaseError.
    Unfinished unfinished();
    /// Whether a task that the host hands over in its turn is not over and may change whether this
    /// product, in upper or lower case, is installed or which instances it has.
    bool mayChange(const std::string& product);
    /// What becomes of the wish that a task be over.
    enum class Cancel {
        Ended,     ///< it waited in line and never runs
        Asked,     ///< it is in hand; the wish is durable, and after a kill the task is cancelled
        InPlugin,  ///< the plug-in has it in its queue and cannot be told to forget it
        Over,      ///< it is over
        Unknown,   ///< there is no such task
    };
    /// Returns when that is durable. Throws NotKept.
    Cancel cancel(std::int64_t number);
    /// Whether somebody wants this task, which is in hand, to be over.
    bool isToBeCancelled(std::int64_t number);
    /// The hash by which the content of a request is recognised.
    std::string hashOf(std::string_view content) const;
    /// Enters a task unless there is one with the same TRANSID that answers its repetitions;
    /// returns that one. Throws NotKept.
    std::optional<Task> enterOnce(Task& task);
    /// The first task with this TRANSID that answers its repetitions.
    std::optional<Task> findOnce(std::string_view transid);

    /// Why the last change could not be written down; empty if nothing is wrong. Writes something
    /// to see whether that is still so.
    std::string trouble();
    /// Whether there is room for what an outcome may need.
    bool hasRoom() const { return !directory_ || directory_->takeReserve(); }
    /// Since when a commit that is being written has been; nothing if none is. Never waits.
    std::optional<std::chrono::steady_clock::time_point> commitBegan() const {
        return writer_->busySince();
    }
    /// Transactions so far.
    std::uint64_t transactions() const { return writer_->transactions(); }
    /// See Writer.
    const metrics::Histogram& commitTimes() const { return writer_->commitTimes(); }
    const metrics::Counter& failedCommits() const { return writer_->failures(); }

private:
    template <typename Reader>
    auto read(const Reader& reader);
    void takeDirectory();
    void begin();
    void open();
    void beginRun();
    void replaceDamaged(const std::string& fault);
    void commit(Writer::Change change);
    void noteTrouble(const std::string& trouble);
    void commitOutcome(const Writer::Change& change);
    bool commitOutcomeOnce(const Writer::Change& change);
    void insistOnReserve();
    Writer::Change updateOf(std::vector<Task> tasks);
    std::int64_t handOverNext(Database& database);
    std::int64_t enterInto(Database& database, const Task& task) const;
    void tellOfCommit(Database& database);
    void tellOfChange();
    void writeSoon(Writer::Change change, std::chrono::milliseconds within);
    void submitSoon(std::uint64_t number, Writer::Change change, std::chrono::milliseconds within);
    bool awaitsHidden() const;
    std::map<std::int64_t, Task> begunTasks() const;
    std::string begunNumbers() const;
    void beginTransaction();
    void tellOfEvents(Database& database);
    Writer::Change pruning();

    const Settings settings_;
    std::optional<StateDirectory> directory_;
    std::unique_ptr<Database> database_;  ///< the writer's
    std::unique_ptr<Database> reader_;    ///< null: in memory, there is only one
    std::string identity_;
    std::string key_;
    Recovered recovered_;

    std::atomic<bool> closed_{false};
    std::atomic<bool> handsOver_{false};
    std::atomic<std::int64_t> handedOver_{0};
    /// Recorded as handed over, and not with the plug-in yet; 0: none.
    std::atomic<std::int64_t> ahead_{0};
    std::atomic<WallClock::rep> latest_{0};

    std::optional<EventLog> events_;
    // Of the writer's thread alone.
    std::map<std::int64_t, std::string> asGiven_;  ///< rows of the transaction, by their events
    std::vector<std::uint64_t> written_;           ///< the changes of `soon_` in the transaction
    std::size_t sincePrune_ = 0;                   ///< events
    std::size_t rowsSincePrune_ = 0;               ///< the same since old rows were removed

    /// The changes that wait for a transaction, or are in the one that is being written.
    struct Soon {
        std::map<std::uint64_t, Task> begun;  ///< what they say of tasks: told from here meanwhile
        std::set<std::uint64_t> hidden;       ///< who asks for a task has these written first
        std::uint64_t last = 0;               ///< changes are numbered, so that a later one stays
    };
    mutable embedded::Mutex soonLock_;
    Soon soon_ ZAV_GUARDED_BY(soonLock_);

    embedded::Mutex changedLock_;
    std::function<void()> whenChanged_ ZAV_GUARDED_BY(changedLock_);
    mutable embedded::Mutex troubleLock_;
    std::string trouble_ ZAV_GUARDED_BY(troubleLock_);
    std::atomic<bool> troubled_{false};      ///< whether there is any
    std::atomic<bool> lacksReserve_{false};  ///< since a request was not recorded for that

    embedded::Mutex readLock_;        ///< around the connection that reads
    std::unique_ptr<Writer> writer_;  ///< last, so that it ends first
};

}  // namespace host

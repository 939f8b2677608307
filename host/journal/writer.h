/// The one thread that changes the journal.
#pragma once

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <exception>
#include <functional>
#include <future>
#include <mutex>
#include <optional>
#include <thread>
#include <utility>
#include <vector>

#include "embedded/mutex.h"
#include "host/journal/database.h"
#include "metrics/counter.h"
#include "metrics/histogram.h"

namespace host {

/// Carries out changes in the order in which they are handed over. Those that wait while another
/// transaction is being written to the disk share the next one, so that many callers share its
/// cost.
///
/// Any thread may call; a change may call wipeSoon() only.
class Writer {
public:
    /// One part of a transaction: it is carried out as a whole or not at all.
    using Change = std::function<void(Database& database)>;

    /// Who wants to know how a transaction proceeds, on the writer's thread. Both may be empty.
    struct Watch {
        std::function<void()> begins;
        /// It is durable, and nobody who waits for it has been told yet.
        std::function<void(Database& database)> committed;
        /// May be empty. Carried out as submitLater() does, each time that this time is over, which
        /// no change of the date moves.
        Change regular{};
        std::chrono::milliseconds every = std::chrono::hours(1);
        /// How long a transaction waits for more of those who come at the same time, where the disk
        /// would be faster than they are, and so again while more come, five times at most. A
        /// caller who comes alone does not wait.
        std::chrono::milliseconds gather{2};
    };

    /// The database outlives the writer, which alone uses it from now on; unless `shared` is given,
    /// which it holds whenever it does.
    explicit Writer(Database& database, embedded::Mutex* shared = nullptr)
        : Writer(database, shared, Watch()) {}
    Writer(Database& database, embedded::Mutex* shared, Watch watch);
    /// Carries out what was handed over, and ends.
    ~Writer();
    Writer(const Writer&) = delete;
    Writer& operator=(const Writer&) = delete;

    /// The future is ready once the change is durable; it throws what the change threw, or
    /// DatabaseError when the transaction could not be written.
    std::future<void> submit(Change change);
    /// Carried out with the next change that somebody waits for, or when this time is over. When it
    /// fails it is tried again, a second later.
    void submitLater(Change change, std::chrono::milliseconds within = std::chrono::seconds(1));
    /// Carries out what submitLater() got. Returns when it is durable or could not be written.
    void flush() noexcept;

    /// A secret was removed: within a second the log of changes is cut, which still holds it.
    void wipeSoon();

    /// Carries out what is left to do, cutting the log included, and returns then. Somebody who
    /// reads for long can keep the log from being cut; it is tried once.
    void settle() noexcept;

    /// Since when the writer has been at the transaction, or the cutting of the log, that it is at;
    /// nothing if it has nothing to do. Never waits.
    std::optional<std::chrono::steady_clock::time_point> busySince() const;

    /// Transactions that were written so far.
    std::uint64_t transactions() const;
    /// How long each of them took, from its begin until it was durable.
    const metrics::Histogram& commitTimes() const { return commitTimes_; }
    /// Transactions that could not be written; each new try of the same changes is one.
    const metrics::Counter& failures() const { return failures_; }

private:
    struct Job {
        Change change;
        std::promise<void> done;
        std::exception_ptr failure;
    };
    using Jobs = std::vector<Job>;
    using Clock = std::chrono::steady_clock;

    void work();
    bool awaitWork(std::unique_lock<std::mutex>& lock);
    void addRegular(Clock::time_point now);
    Clock::time_point nextDue() const;
    void gather(std::unique_lock<std::mutex>& lock);
    void writeAlone(Jobs& jobs, std::vector<Change>& later);
    void write(Jobs& jobs, std::vector<Change>& later);
    std::vector<Change> tryWrite(Jobs& jobs, const std::vector<Change>& later);
    std::exception_ptr attempt(const Change& change);
    void tellOfCommit() noexcept;
    bool wipe() noexcept;

    Database& database_;
    embedded::Mutex* const shared_;  ///< may be null
    const Watch watch_;

    std::atomic<Clock::rep> busySince_{0};  ///< 0: it has nothing to do
    metrics::Histogram commitTimes_;
    metrics::Counter failures_;

    mutable std::mutex lock_;  // around everything below
    std::condition_variable changed_;
    Jobs jobs_;
    std::vector<Change> later_;
    bool writesLater_ = false;  ///< some of them are being written
    Clock::time_point laterDue_{};
    Clock::time_point regularDue_ = Clock::time_point::max();
    bool isCrowded_ = false;  ///< several have waited for the last transaction
    bool wiping_ = false;
    Clock::time_point wipeDue_{};
    std::uint64_t transactions_ = 0;
    std::uint64_t wipes_ = 0;  ///< tries
    bool ending_ = false;

    std::thread thread_;  ///< last, so that it finds everything else
};

}  // namespace host

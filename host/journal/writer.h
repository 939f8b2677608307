/// The one thread that changes the journal.
#pragma once

#include <condition_variable>
#include <exception>
#include <functional>
#include <future>
#include <thread>
#include <vector>

#include "embedded/mutex.h"
#include "host/journal/database.h"

namespace host {

/// Carries out changes in the order in which they are handed over. Those that wait while another
/// transaction is being written to the disk share the next one, so that many callers share its cost.
///
/// Any thread may call; a change may call wipeSoon() only.
class Writer {
public:
    /// One part of a transaction: it is carried out as a whole or not at all.
    using Change = std::function<void(Database& database)>;

    /// The database outlives the writer, which alone uses it from now on; unless `shared` is given,
    /// which it holds whenever it does.
    explicit Writer(Database& database, embedded::Mutex* shared = nullptr);
    /// Carries out what was handed over, and ends.
    ~Writer();
    Writer(const Writer&) = delete;
    Writer& operator=(const Writer&) = delete;

    /// The future is ready once the change is durable; it throws what the change threw, or
    /// DatabaseError when the transaction could not be written.
    std::future<void> submit(Change change);
    /// Carried out with the next change that somebody waits for, or after a second. When it fails it
    /// is tried again, a second later.
    void submitLater(Change change);
    /// Carries out what submitLater() got. Returns when it is durable or could not be written.
    void flush() noexcept;

    /// A secret was removed: within a second the log of changes is cut, which still holds it.
    void wipeSoon();

    /// Transactions that were written so far.
    std::uint64_t transactions() const;

private:
    struct Job {
        Change change;
        std::promise<void> done;
        std::exception_ptr failure;
    };
    using Jobs = std::vector<Job>;
    using Clock = std::chrono::steady_clock;

    void work();
    bool awaitWork(embedded::MutexLock& lock) ZAV_REQUIRES(lock_);
    void writeAlone(Jobs& jobs, std::vector<Change>& later);
    void write(Jobs& jobs, std::vector<Change>& later);
    std::vector<Change> tryWrite(Jobs& jobs, const std::vector<Change>& later);
    std::exception_ptr attempt(const Change& change);
    bool wipe() noexcept;

    Database& database_;
    embedded::Mutex* const shared_;  ///< may be null

    mutable embedded::Mutex lock_;
    std::condition_variable changed_;
    Jobs jobs_ ZAV_GUARDED_BY(lock_);
    std::vector<Change> later_ ZAV_GUARDED_BY(lock_);
    Clock::time_point laterDue_ ZAV_GUARDED_BY(lock_){};
    bool wiping_ ZAV_GUARDED_BY(lock_) = false;
    Clock::time_point wipeDue_ ZAV_GUARDED_BY(lock_){};
    std::uint64_t transactions_ ZAV_GUARDED_BY(lock_) = 0;
    bool ending_ ZAV_GUARDED_BY(lock_) = false;

    std::thread thread_;  ///< last, so that it finds everything else
};

}  // namespace host

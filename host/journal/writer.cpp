#include "host/journal/writer.h"

#include <algorithm>
#include <chrono>
#include <utility>

#include "host/journal/commit_step.h"
#include "host/process/log.h"

namespace host {
namespace {

constexpr std::chrono::seconds kNextTry{1};
/// A reader in the way may delay the log's cutting, which then is tried again.
constexpr std::chrono::milliseconds kWipeDelay{500};
/// A transaction waits for this many times Watch::gather at most.
constexpr int kMostGathers = 5;

/// From a solid-state disk to one that hangs.
std::vector<metrics::Histogram::Duration> commitBounds() {
    using std::chrono::milliseconds;
    return {std::chrono::microseconds(500),
            milliseconds(1),
            milliseconds(2),
            milliseconds(5),
            milliseconds(10),
            milliseconds(25),
            milliseconds(50),
            milliseconds(100),
            milliseconds(250),
            milliseconds(500),
            milliseconds(1'000),
            milliseconds(5'000),
            milliseconds(30'000)};
}

void rollBack(Database& database) noexcept {
    try {
        if (database.inTransaction()) database.run("ROLLBACK");
    } catch (const DatabaseError&) {
        // The next BEGIN says what is wrong.
    }
}

/// Another try may succeed then.
bool isDatabasesFault(const std::exception_ptr& failure) {
    try {
        if (failure) std::rethrow_exception(failure);
    } catch (const DatabaseError&) {
        return true;
    } catch (const std::exception& error) {
        say(Priority::Error, std::string("the journal refused a change: ") + error.what());
    }
    return false;
}

}  // namespace

Writer::Writer(Database& database, embedded::Mutex* shared, Watch watch)
    : database_(database), shared_(shared), watch_(std::move(watch)), commitTimes_(commitBounds()) {
    if (watch_.regular) regularDue_ = Clock::now() + watch_.every;
    thread_ = std::thread([this] { work(); });
}

Writer::~Writer() {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        ending_ = true;
    }
    changed_.notify_all();
    thread_.join();
}

std::future<void> Writer::submit(Change change) {
    Job job{std::move(change), {}, nullptr};
    std::future<void> done = job.done.get_future();
    {
        const std::lock_guard<std::mutex> lock(lock_);
        jobs_.push_back(std::move(job));
    }
    changed_.notify_all();
    return done;
}

void Writer::submitLater(Change change, std::chrono::milliseconds within) {
    const Clock::time_point due = Clock::now() + within;
    {
        const std::lock_guard<std::mutex> lock(lock_);
        laterDue_ = later_.empty() ? due : std::min(laterDue_, due);
        later_.push_back(std::move(change));
    }
    changed_.notify_all();
}

void Writer::flush() noexcept {
    try {
        {
            const std::lock_guard<std::mutex> lock(lock_);
            if (later_.empty() && !writesLater_) return;
        }
        submit([](Database&) {}).get();
    } catch (const std::exception&) {
        // It waits for the next try.
    }
}

void Writer::wipeSoon() {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        if (wiping_) return;
        wiping_ = true;
        wipeDue_ = Clock::now() + kWipeDelay;
    }
    changed_.notify_all();
}

void Writer::settle() noexcept {
    flush();
    std::unique_lock<std::mutex> lock(lock_);
    wiping_ = true;
    wipeDue_ = Clock::now();
    const std::uint64_t before = wipes_;
    changed_.notify_all();
    while (wipes_ == before)
        changed_.wait(lock);
}

std::optional<std::chrono::steady_clock::time_point> Writer::busySince() const {
    const Clock::rep since = busySince_.load();
    if (since == 0) return std::nullopt;
    return Clock::time_point(Clock::duration(since));
}

std::uint64_t Writer::transactions() const {
    const std::lock_guard<std::mutex> lock(lock_);
    return transactions_;
}

/// With the lock held.
void Writer::addRegular(Clock::time_point now) {
    if (now < regularDue_) return;
    regularDue_ = now + watch_.every;
    if (later_.empty()) laterDue_ = now;
    later_.push_back(watch_.regular);
}

/// With the lock held: when something is to be done though nobody comes.
Writer::Clock::time_point Writer::nextDue() const {
    Clock::time_point due = regularDue_;
    if (!later_.empty()) due = std::min(due, laterDue_);
    if (wiping_) due = std::min(due, wipeDue_);
    return due;
}

/// Returns false at the end, when nothing is left to do.
bool Writer::awaitWork(std::unique_lock<std::mutex>& lock) {
    for (;;) {
        const auto now = Clock::now();
        if (!ending_) addRegular(now);
        if (!jobs_.empty()) return true;
        const bool due = (!later_.empty() && now >= laterDue_) || (wiping_ && now >= wipeDue_);
        if (due) return true;
        if (ending_) return !later_.empty() || wiping_;
        const Clock::time_point until = nextDue();
        if (until == Clock::time_point::max()) {
            changed_.wait(lock);
        } else {
            changed_.wait_until(lock, until);
        }
    }
}

/// With the lock held, which is let go meanwhile. As long as more keep coming, they are waited for.
void Writer::gather(std::unique_lock<std::mutex>& lock) {
    if (isCrowded_ && !jobs_.empty()) {
        const Clock::time_point end = Clock::now() + kMostGathers * watch_.gather;
        for (std::size_t before = 0; jobs_.size() > before && Clock::now() < end;) {
            before = jobs_.size();
            const Clock::time_point next = std::min(end, Clock::now() + watch_.gather);
            changed_.wait_until(lock, next, [&] { return ending_ || Clock::now() >= next; });
            if (ending_) break;
        }
    }
    isCrowded_ = jobs_.size() > 1;
}

void Writer::work() {
    std::unique_lock<std::mutex> lock(lock_);
    while (awaitWork(lock)) {
        gather(lock);
        Jobs jobs = std::exchange(jobs_, {});
        std::vector<Change> later = std::exchange(later_, {});
        writesLater_ = !later.empty();
        const bool wipes = wiping_ && (ending_ || Clock::now() >= wipeDue_);
        lock.unlock();
        busySince_.store(Clock::now().time_since_epoch().count());
        if (!jobs.empty() || !later.empty()) writeAlone(jobs, later);
        const bool wiped = wipes && wipe();
        busySince_.store(0);
        lock.lock();
        writesLater_ = false;  // after a failure they wait again
        if (wipes) {
            ++wipes_;
            changed_.notify_all();
        }
        if (wiped || (wipes && ending_)) {
            wiping_ = false;
        } else if (wipes) {
            wipeDue_ = Clock::now() + kWipeDelay;
        }
        if (ending_) later.clear();
        if (!later.empty()) {
            laterDue_ = Clock::now() + kNextTry;
            later_.insert(later_.begin(), std::make_move_iterator(later.begin()),
                          std::make_move_iterator(later.end()));
        }
    }
}

void Writer::writeAlone(Jobs& jobs, std::vector<Change>& later) {
    if (shared_ == nullptr) {
        write(jobs, later);
    } else {
        const embedded::MutexLock lock(*shared_);
        write(jobs, later);
    }
}

/// Writes all of them in one transaction. What came later stays in `later` when it could not be
/// written.
void Writer::write(Jobs& jobs, std::vector<Change>& later) {
    std::exception_ptr failure;
    try {
        later = tryWrite(jobs, later);
    } catch (...) {
        failure = std::current_exception();
        failures_.add();
        rollBack(database_);
    }
    for (Job& job : jobs) {
        if (failure || job.failure) {
            job.done.set_exception(failure ? failure : job.failure);
        } else {
            job.done.set_value();
        }
    }
}

/// Throws when nothing of it was written. Returns what of `later` has to be tried again.
std::vector<Writer::Change> Writer::tryWrite(Jobs& jobs, const std::vector<Change>& later) {
    if (watch_.begins) watch_.begins();
    const Clock::time_point begun = Clock::now();
    database_.run("BEGIN IMMEDIATE");
    std::vector<Change> again;
    for (const Change& change : later) {
        if (isDatabasesFault(attempt(change))) again.push_back(change);
    }
    for (Job& job : jobs)
        job.failure = attempt(job.change);
    reached(CommitStep::BeforeCommit);
    database_.run("COMMIT");
    commitTimes_.observe(Clock::now() - begun);
    reached(CommitStep::AfterCommit);
    tellOfCommit();
    const std::lock_guard<std::mutex> lock(lock_);
    ++transactions_;
    writesLater_ = false;
    return again;
}

/// One part of the transaction; its failure leaves the others alone, unless SQLite has given up all
/// of them.
std::exception_ptr Writer::attempt(const Change& change) {
    std::exception_ptr failure;
    database_.run("SAVEPOINT part");
    try {
        change(database_);
    } catch (...) {
        if (!database_.inTransaction()) throw;
        failure = std::current_exception();
        database_.run("ROLLBACK TO part");
    }
    database_.run("RELEASE part");
    return failure;
}

/// The transaction is durable, whatever happens here.
void Writer::tellOfCommit() noexcept {
    try {
        if (watch_.committed) watch_.committed(database_);
    } catch (const std::exception& error) {
        say(Priority::Warning, std::string("events of the journal come late: ") + error.what());
    }
}

bool Writer::wipe() noexcept {
    try {
        // The first column says whether somebody was in the way.
        return database_.number("PRAGMA wal_checkpoint(TRUNCATE)") == 0;
    } catch (const DatabaseError&) {
        return false;
    }
}

}  // namespace host

#include "host/outcomes/outcome_feed.h"

#include <new>
#include <utility>

#include "host/tables/plugin_facts.h"

namespace host {
namespace {

/// The rows that the filter takes.
oxa::Rows chosen(oxa::Filter& filter, const oxa::Rows& rows) {
    oxa::Rows found;
    found.rowSize = rows.rowSize;
    for (std::size_t i = 0; i < rows.count(); ++i) {
        if (filter.takes(rows.row(i))) found.bytes.append(rows.row(i), rows.rowSize);
    }
    return found;
}

}  // namespace

OutcomeFeed::OutcomeFeed(const TableSet& tables) : table_(tables.find(plugin::kOutcomeTable)) {
    if (table_ == nullptr) return;
    source_ = oxa::subscribe(table_->name, {}, [this](const oxa::Rows& rows) {
        deliver(rows);
        return static_cast<int>(OXA_OK);
    });
}

OutcomeFeed::~OutcomeFeed() {
    release();
    source_.reset();
    embedded::MutexLock lock(lock_);
    while (delivered_ != came_)
        lock.wait(changed_);
}

std::unique_ptr<OutcomeFeed::Subscription> OutcomeFeed::subscribe(
    const std::vector<oxa::Predicate>& where, oxa::Sink sink) {
    if (!source_) return nullptr;
    Subscriber subscriber{nullptr, std::move(sink)};
    if (!where.empty()) {
        subscriber.filter = oxa::makeFilter(table_->name, where);
        if (!subscriber.filter) return nullptr;
    }
    const embedded::MutexLock lock(lock_);
    const std::uint64_t number = nextNumber_++;
    auto subscription = std::make_unique<Subscription>(*this, number);
    subscribers_.emplace(number, std::move(subscriber));
    return subscription;
}

void OutcomeFeed::remove(std::uint64_t number) {
    std::map<std::uint64_t, Subscriber>::node_type removed;  // destroyed without the lock
    embedded::MutexLock lock(lock_);
    while (called_ == number)
        lock.wait(changed_);
    removed = subscribers_.extract(number);
    lock.unlock();
}

/// Under the table's lock, which sees to it that dispatches come one after the other. A subscriber
/// may take long, if only because a disk is full, so nobody is called before the lock is free.
void OutcomeFeed::deliver(const oxa::Rows& rows) {
    embedded::MutexLock lock(lock_);
    const std::uint64_t place = came_++;
    lock.unlock();
    try {
        oxa::whenUnlocked([this, place, rows] { deliverInTurn(place, rows); });
    } catch (const std::bad_alloc&) {
        deliverInTurn(place, rows);  // then the lock has to wait: better than a lost outcome
    }
}

void OutcomeFeed::deliverInTurn(std::uint64_t place, const oxa::Rows& rows) {
    embedded::MutexLock lock(lock_);
    while (delivered_ != place)
        lock.wait(changed_);
    lock.unlock();
    deliverToAll(rows);
    holdIfWanted();
    lock.lock();
    ++delivered_;
    changed_.notify_all();
}

void OutcomeFeed::deliverToAll(const oxa::Rows& rows) {
    embedded::MutexLock lock(lock_);
    const std::uint64_t end = nextNumber_;  // who subscribes from now on gets the next row
    auto at = subscribers_.begin();
    while (at != subscribers_.end() && at->first < end) {
        called_ = at->first;
        const Subscriber& subscriber = at->second;
        lock.unlock();
        deliverTo(subscriber, rows);
        lock.lock();
        ++at;  // the one that was called is still there: who removes it waits until now
        called_ = 0;
        changed_.notify_all();
    }
}

void OutcomeFeed::deliverTo(const Subscriber& subscriber, const oxa::Rows& rows) noexcept {
    try {
        const oxa::Rows wanted = subscriber.filter ? chosen(*subscriber.filter, rows) : rows;
        if (wanted.count() > 0) subscriber.sink(wanted);
    } catch (...) {
        // The others get the rows all the same.
    }
}

void OutcomeFeed::holdIfWanted() {
    embedded::MutexLock lock(lock_);
    if (!wanted_ || released_) return;
    holding_ = true;
    while (!released_)
        lock.wait(changed_);
    holding_ = false;
}

void OutcomeFeed::holdAfterOutcome() {
    const embedded::MutexLock lock(lock_);
    wanted_ = true;
}

void OutcomeFeed::release() {
    {
        const embedded::MutexLock lock(lock_);
        released_ = true;
    }
    changed_.notify_all();
}

bool OutcomeFeed::holding() const {
    const embedded::MutexLock lock(lock_);
    return holding_;
}

}  // namespace host

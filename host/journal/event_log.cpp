#include "host/journal/event_log.h"

#include <algorithm>
#include <utility>

#include "host/outcomes/packed_row.h"

namespace host {

void EventLog::append(const std::vector<JournalEvent>& events) {
    std::function<void()> call;
    {
        const embedded::MutexLock lock(lock_);
        for (const JournalEvent& event : events)
            add(event);
        call = whenNew_;
    }
    if (call) call();
}

void EventLog::add(const JournalEvent& event) {
    JournalEvent& added = events_.emplace_back(event);
    added.row = packRow(event.row);
    bytes_ += added.row.size();
    last_ = event.number;
    while (events_.size() > limits_.events || (bytes_ > limits_.bytes && events_.size() > 1)) {
        bytes_ -= events_.front().row.size();
        events_.pop_front();
    }
}

std::int64_t EventLog::last() const {
    const embedded::MutexLock lock(lock_);
    return last_;
}

std::optional<std::vector<JournalEvent>> EventLog::after(std::int64_t position,
                                                         std::size_t most) const {
    std::vector<JournalEvent> found;
    const embedded::MutexLock lock(lock_);
    if (position >= last_) return found;
    if (events_.empty() || position < events_.front().number - 1) return std::nullopt;
    auto next = std::upper_bound(
        events_.begin(), events_.end(), position,
        [](std::int64_t number, const JournalEvent& event) { return number < event.number; });
    for (; next != events_.end() && found.size() < most; ++next) {
        JournalEvent& copy = found.emplace_back(*next);
        copy.row = unpackRow(copy.row);
    }
    return found;
}

void EventLog::whenNew(std::function<void()> call) {
    const embedded::MutexLock lock(lock_);
    whenNew_ = std::move(call);
}

}  // namespace host

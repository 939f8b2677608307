#include "host/outcomes/event_queue.h"

#include <algorithm>
#include <exception>
#include <utility>

namespace host {

EventQueue::EventQueue(Limits limits, std::function<void()> wake)
    : limits_(limits), wake_(std::move(wake)) {}

std::size_t EventQueue::room(std::size_t count, unsigned rowSize) const {
    if (held_.lost > 0 || (held_.rows.rowSize != 0 && held_.rows.rowSize != rowSize)) return 0;
    const std::size_t heldBytes = held_.rows.bytes.size();
    const std::size_t byCount = limits_.rows - std::min(limits_.rows, held_.rows.count());
    const std::size_t byBytes = (limits_.bytes - std::min(limits_.bytes, heldBytes)) / rowSize;
    // A row wider than the whole queue still passes one at a time.
    return std::min({count, byCount, heldBytes == 0 ? std::max<std::size_t>(byBytes, 1) : byBytes});
}

int EventQueue::push(const oxa::Rows& rows) noexcept {
    const std::size_t count = rows.count();
    if (count == 0) return OXA_OK;
    const embedded::MutexLock lock(lock_);
    const bool first = held_.empty();
    std::size_t taken = room(count, rows.rowSize);
    try {
        held_.rows.bytes.append(rows.bytes, 0, taken * rows.rowSize);
        held_.rows.rowSize = rows.rowSize;
    } catch (const std::exception&) {
        taken = 0;
    }
    held_.lost += count - taken;
    try {
        if (first) wake_();
    } catch (const std::exception&) {
        // Without a wake-up the rows would stay for ever, and later ones would not wake either.
        held_ = {};
        return OXA_OVERFLOW;
    }
    return taken == count ? OXA_OK : OXA_OVERFLOW;
}

EventQueue::Batch EventQueue::take() {
    const embedded::MutexLock lock(lock_);
    return std::exchange(held_, {});
}

bool EventQueue::empty() const {
    const embedded::MutexLock lock(lock_);
    return held_.empty();
}

}  // namespace host

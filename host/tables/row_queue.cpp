#include "host/tables/row_queue.h"

#include <algorithm>
#include <exception>
#include <utility>

namespace host {

void RowQueue::onContent(Wake wake) {
    auto shared = std::make_shared<const Wake>(std::move(wake));
    bool first = false;
    {
        const embedded::MutexLock lock(lock_);
        wake_ = shared;
        first = !held_.empty();
    }
    if (first) (*shared)();
}

std::size_t RowQueue::room(std::size_t count, unsigned rowSize) const {
    if (held_.lost > 0 || (held_.rows.rowSize != 0 && held_.rows.rowSize != rowSize)) return 0;
    const std::size_t heldBytes = held_.rows.bytes.size();
    const std::size_t byCount = limits_.rows - std::min(limits_.rows, held_.rows.count());
    const std::size_t byBytes = (limits_.bytes - std::min(limits_.bytes, heldBytes)) / rowSize;
    // A row wider than the whole queue still passes one at a time.
    return std::min({count, byCount, heldBytes == 0 ? std::max<std::size_t>(byBytes, 1) : byBytes});
}

std::size_t RowQueue::store(const oxa::Rows& rows) noexcept {
    const std::size_t count = rows.count();
    std::size_t taken = room(count, rows.rowSize);
    try {
        held_.rows.bytes.append(rows.bytes, 0, taken * rows.rowSize);
        held_.rows.rowSize = rows.rowSize;
    } catch (const std::exception&) {
        taken = 0;
    }
    held_.lost += count - taken;
    return taken;
}

int RowQueue::push(const oxa::Rows& rows) noexcept {
    if (rows.count() == 0) return OXA_OK;
    std::shared_ptr<const Wake> wake;
    std::size_t taken = 0;
    {
        const embedded::MutexLock lock(lock_);
        if (held_.empty()) wake = wake_;
        taken = store(rows);
    }
    try {
        if (wake) (*wake)();
    } catch (const std::exception&) {
        // Nobody would ever take these rows, and later ones would not wake the reader either.
        const embedded::MutexLock lock(lock_);
        held_ = {};
        return OXA_OVERFLOW;
    }
    return taken == rows.count() ? OXA_OK : OXA_OVERFLOW;
}

RowQueue::Batch RowQueue::take() {
    const embedded::MutexLock lock(lock_);
    return std::exchange(held_, {});
}

bool RowQueue::empty() const {
    const embedded::MutexLock lock(lock_);
    return held_.empty();
}

}  // namespace host

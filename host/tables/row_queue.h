/// The rows of one subscription on their way to their reader.
#pragma once

#include <cstddef>
#include <functional>
#include <memory>

#include "embedded/mutex.h"
#include "embedded/oxa_host.h"

namespace host {

/// Bounded, because the thread that publishes rows never waits for a reader. When rows do not fit
/// they are lost and counted, and so are all later ones until the reader has taken what is there.
/// So a loss has one place in the order of the rows: behind those of the batch that reports it.
///
/// Any thread may push; one thread takes.
class RowQueue {
public:
    struct Limits {
        std::size_t rows = 256;
        std::size_t bytes = 256 * 1024;  ///< an empty queue takes one row of any size
    };
    struct Batch {
        oxa::Rows rows;
        std::size_t lost = 0;  ///< rows that came after `rows` and did not fit
        bool empty() const { return rows.bytes.empty() && lost == 0; }
    };
    using Wake = std::function<void()>;

    explicit RowQueue(Limits limits) : limits_(limits) {}

    /// From now on calls `wake` on the pushing thread, without a lock, when an empty queue gets its
    /// first content; and once here if there is content already. It must return at once.
    void onContent(Wake wake);
    /// Takes the rows of one dispatch. Returns 0, or OXA_OVERFLOW when some were lost. Never
    /// throws.
    int push(const oxa::Rows& rows) noexcept;
    /// Takes out everything.
    Batch take();
    bool empty() const;

private:
    /// How many of `count` rows have room.
    std::size_t room(std::size_t count, unsigned rowSize) const ZAV_REQUIRES(lock_);
    /// Stores what fits; returns how many rows did.
    std::size_t store(const oxa::Rows& rows) noexcept ZAV_REQUIRES(lock_);

    const Limits limits_;
    mutable embedded::Mutex lock_;
    Batch held_ ZAV_GUARDED_BY(lock_);
    std::shared_ptr<const Wake> wake_ ZAV_GUARDED_BY(lock_);  ///< null until there is a reader
};

}  // namespace host

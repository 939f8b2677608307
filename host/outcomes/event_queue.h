/// The rows of one subscription on their way to its stream.
#pragma once

#include <cstddef>
#include <functional>
#include <string>

#include "embedded/mutex.h"
#include "embedded/oxa_host.h"

namespace host {

/// Bounded: who dispatches rows never waits for a reader. When rows do not fit they are lost and
/// counted, and so are all that follow until the reader has taken what is there; so the loss has
/// one place in the order of the rows, behind those of the batch that reports it.
class EventQueue {
public:
    struct Limits {
        std::size_t rows = 256;
        std::size_t bytes = 256 * 1024;  ///< one dispatch of any size fits an empty queue
    };
    struct Batch {
        oxa::Rows rows;
        std::size_t lost = 0;  ///< rows that came after `rows` and did not fit
        bool empty() const { return rows.bytes.empty() && lost == 0; }
    };

    /// `wake` is called by the dispatching thread when an empty queue gets its first content; it
    /// must return at once and not call back.
    EventQueue(Limits limits, std::function<void()> wake);

    /// Takes the rows of one dispatch. Returns 0, or OXA_OVERFLOW when some were lost. Never
    /// throws.
    int push(const oxa::Rows& rows) noexcept;
    /// Takes out everything.
    Batch take();
    bool empty() const;

private:
    /// How many of `count` rows have room.
    std::size_t room(std::size_t count, unsigned rowSize) const ZAV_REQUIRES(lock_);

    const Limits limits_;
    const std::function<void()> wake_;
    mutable embedded::Mutex lock_;
    Batch held_ ZAV_GUARDED_BY(lock_);
};

}  // namespace host

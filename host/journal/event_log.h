/// The newest events of the journal, in memory.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "embedded/mutex.h"

namespace host {

/// The numbers are those of the journal.
enum class EventKind {
    Row = 0,      ///< a row of the outcome table
    TaskEnd = 1,  ///< a task is over
};

/// Events have numbers, which grow by one.
struct JournalEvent {
    std::int64_t number = 0;
    EventKind kind = EventKind::Row;
    std::int64_t task = 0;  ///< the number of the task; 0: the row belongs to none
    std::string row;        ///< empty if a task is over
};

/// Holds rows as the plug-in gave them, for readers that keep up. What it has let go is in the
/// journal, masked.
///
/// Any thread may call.
class EventLog {
public:
    struct Limits {
        std::size_t events = 4096;
        std::size_t bytes = std::size_t{1} << 20;  ///< of rows without their runs of blanks
    };

    /// `last`: the number of the newest event so far.
    explicit EventLog(std::int64_t last) : EventLog(last, Limits()) {}
    EventLog(std::int64_t last, Limits limits) : limits_(limits), last_(last) {}

    /// Adds events, in the order of their numbers; then calls what whenNew() was given.
    void append(const std::vector<JournalEvent>& events);
    /// The number of the newest event.
    std::int64_t last() const;
    /// The oldest events with greater numbers than `position`, at most `most` of them; nothing when
    /// it has let some of them go.
    std::optional<std::vector<JournalEvent>> after(std::int64_t position, std::size_t most) const;
    /// From now on calls this on the thread that adds events. It must return at once and may be
    /// called once more after it was replaced.
    void whenNew(std::function<void()> call);

private:
    void add(const JournalEvent& event) ZAV_REQUIRES(lock_);

    const Limits limits_;
    mutable embedded::Mutex lock_;
    std::deque<JournalEvent> events_ ZAV_GUARDED_BY(lock_);  ///< with packed rows
    std::size_t bytes_ ZAV_GUARDED_BY(lock_) = 0;
    std::int64_t last_ ZAV_GUARDED_BY(lock_);
    std::function<void()> whenNew_ ZAV_GUARDED_BY(lock_);
};

}  // namespace host

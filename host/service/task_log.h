/// One line when a task begins and one when it ends.
#pragma once

#include <cstdint>
#include <functional>
#include <set>
#include <string>

#include "host/journal/journal.h"
#include "host/outcomes/task.h"
#include "host/process/log.h"

namespace host {

/// Reads the journal, so it says only what is durable, and no task waits for it.
/// One thread at a time.
class TaskLog {
public:
    using Say =
        std::function<void(Priority priority, const std::string& line, const std::string& task)>;

    /// The journal outlives this object. What ended before is not told.
    TaskLog(Journal& journal, Say say);

    /// Tells what has begun and ended since the last look. A task that did both gets two lines.
    /// Throws DatabaseError; the next look then goes on where this one stopped.
    void look();

private:
    void tellEnds();
    void tellBegin(const Task& task);
    void tellEnd(const Task& task);

    Journal& journal_;
    const Say say_;
    std::int64_t position_;         ///< of the last event that was told
    std::set<std::int64_t> begun_;  ///< numbers of tasks whose end has not been told
};

}  // namespace host

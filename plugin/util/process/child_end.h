/// Noticing that a child has ended, without reaping children that others have started.
#pragma once

#include <sys/types.h>

#include "base/file_descriptor.h"

namespace ZAV {

/// Checks the child `pid` without waiting. When it has ended, reaps it, sets `status` as waitpid
/// does and returns its id. Returns 0 while it runs, and -1 with errno set when there is no such
/// child.
pid_t pollChild(pid_t pid, int& status);

/// Sleeps for a few milliseconds: the pause before asking the system again after it failed to
/// answer.
void shortPause();

/// Waits for the end of one child of this process.
class ChildWatch {
public:
    /// Nobody may reap `pid` while this object exists.
    explicit ChildWatch(pid_t pid) : pid_(pid) {}

    /// Returns when the child has ended, or after `milliseconds`. May return early.
    void pause(int milliseconds);

private:
    void pauseWithoutHandle(int milliseconds);

    pid_t pid_;
    bool asked_ = false;
    FileDescriptor handle_;  // a pidfd, readable once the child has ended; not open on old kernels
    int step_ = 1;           // milliseconds between two checks without a pidfd
};

/// Leaves the child for a later call of reapForgotten. Any thread.
void reapLater(pid_t pid) noexcept;

/// Reaps those children that were left to it and have ended. Does not wait. Any thread.
void reapForgotten() noexcept;

}  // namespace ZAV

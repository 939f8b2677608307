/// Noticing that children have ended, without a look at anybody else's.
#pragma once

#include <sys/types.h>

#include "base/file_descriptor.h"

namespace ZAV {

/// One look at the child `pid`: its id when it has ended, which reaps it and sets `status` as
/// waitpid does; 0 while it runs; -1 with errno when there is no such child.
pid_t pollChild(pid_t pid, int& status);

/// Lets the calling thread sleep for some milliseconds, before it asks again for what the system
/// could not tell.
void shortPause();

/// Lets a thread sleep until one child of this process ends.
class ChildWatch {
public:
    /// `pid` must not have been reaped while this exists.
    explicit ChildWatch(pid_t pid) : pid_(pid) {}

    /// Returns when the child has ended, after `milliseconds` at the latest; may return early.
    void pause(int milliseconds);

private:
    void pauseWithoutHandle(int milliseconds);

    pid_t pid_;
    bool asked_ = false;
    FileDescriptor handle_;  // readable once the child has ended; not open on kernels without it
    int step_ = 1;           // milliseconds between two looks there
};

/// Leaves the child to a later call of reapForgotten. Any thread.
void reapLater(pid_t pid) noexcept;

/// Reaps those of the children left to it that have ended. Does not wait. Any thread.
void reapForgotten() noexcept;

}  // namespace ZAV

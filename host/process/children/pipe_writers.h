/// The processes that can still write into a pipe.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <set>

namespace host {

/// The pipes that another process can write to; none when this process may not see them. Any
/// thread.
std::set<ino_t> pipesToWrite(pid_t process);

/// Whether anybody has one of these pipes, which this process reads from, open for writing. Any
/// thread.
bool haveWriters(const std::set<ino_t>& pipes);

/// Kills the processes, this one excepted, that have one of these pipes open for writing, whatever
/// session they have. Returns how many. Those whose files this process may not see, and all of them
/// where the kernel has no descriptors of processes, live on. Any thread.
std::size_t killWritersTo(const std::set<ino_t>& pipes);

}  // namespace host

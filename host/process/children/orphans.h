/// Processes that the plug-in's commands leave behind.
///
/// A guarded host is a subreaper: when a process below one of its commands ends, that process's
/// children become the host's. The kernel gives them to the main thread. The commands themselves
/// are children of the threads that started them, which are never the main thread. So what is
/// waited for as a child of the main thread alone is never a command, however early that ends, and
/// the plug-in never misses an exit code.
#pragma once

#include <sys/types.h>

#include <vector>

namespace host {

/// Makes this process the new parent of orphans below it. Call it on the main thread, and have no
/// children started there from then on. Throws StartError.
void adoptOrphans();

/// Reaps the adopted orphans that have ended; waits for none. On the main thread.
void reapOrphans();

/// The adopted orphans of this moment, those that have ended among them; none in a process that
/// adopts none. Any thread.
std::vector<pid_t> orphans();

/// Whether this process adopts orphans. Any thread.
bool adoptsOrphans();

/// The children that threads other than the main one have started and nobody has reaped. Any
/// thread.
std::vector<pid_t> commands();

/// The children that this thread of the process has started and nobody has reaped. Any thread.
std::vector<pid_t> childrenOf(pid_t thread);

}  // namespace host

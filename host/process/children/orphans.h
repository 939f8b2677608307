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

/// The adopted orphans of this moment, those that have ended among them. Any thread.
std::vector<pid_t> orphans();

/// Kills everything that a command has started, down to the last descendant, because it has run too
/// long: its own processes, and those of the orphans that came after `orphansBefore` was taken,
/// just before the command started. Spares what has made a session of its own, as agents do. The
/// command itself is only stopped, so that it starts nothing more; whoever has started it must kill
/// it. Any thread.
///
/// While another command runs at the same time, an orphan may be of either: both are the host's
/// children then. Commands that leave a child behind without a session of its own are rare, and so
/// are time-outs.
void killDescendants(pid_t command, const std::vector<pid_t>& orphansBefore);

}  // namespace host

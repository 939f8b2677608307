/// The task manager's global state. Each variable is exported under its plain name: the host
/// process may look at it.
#pragma once

#include <pthread.h>

#include <mutex>
#include <queue>
#include <vector>

#include "base/zavstr.h"
#include "tasks/zavtqelm.h"

/// The supported commands. Start-up fills the list once; after that it is only read. Without a
/// depot directory it stays empty, so that nothing is queued that nobody would run. Guarded by
/// ZAV::commandsMutex, because requests may arrive before start-up has filled it.
///
/// This list, the queue and the depot directory are references to objects that are never destroyed:
/// nobody joins the executor, so it may still use them while the process exits.
[[gnu::visibility("default")]] extern std::vector<ZAV::String>& commands;

namespace ZAV {

/// Guards `commands`. Locks of the trace and of the locale may be taken under it, never the
/// reverse.
extern std::mutex commandsMutex;

}  // namespace ZAV

/// The tasks that wait for the executor, guarded by queue_mutex.
[[gnu::visibility("default")]] extern std::queue<TaskQueueElem>& taskQueue;
[[gnu::visibility("default")]] extern pthread_mutex_t queue_mutex;
/// Signalled when a task has been queued. Used with queue_mutex.
[[gnu::visibility("default")]] extern pthread_cond_t worktodo;

/// Whether the task manager has been started. Only start-up reads and writes it.
[[gnu::visibility("default")]] extern bool initialized;

/// The agent depot directory, with a "/" at its end. Start-up sets it before it fills `commands`;
/// after that it is only read, by any thread.
[[gnu::visibility("default")]] extern ZAV::String& depotDir;

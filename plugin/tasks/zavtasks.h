/// The task manager: checks requests, runs the quick commands at once and hands the long ones to
/// the executor, one thread that runs them one at a time in the order in which they came.
#pragma once

#include <pthread.h>

#include <queue>
#include <vector>

#include "base/zavstr.h"
#include "tasks/return_codes.h"
#include "tasks/zavtqelm.h"

/// The commands that are supported; filled once by start-up and only read afterwards. Without a
/// depot directory it stays empty, so that nothing is queued which nobody would run.
///
/// This list, the queue and the depot directory are never destroyed, and that is why they are
/// references: the executor is not joined, so it may use them while the process ends.
[[gnu::visibility("default")]] extern std::vector<ZAV::String>& commands;

/// The tasks that wait for the executor, guarded by queue_mutex.
[[gnu::visibility("default")]] extern std::queue<TaskQueueElem>& taskQueue;
[[gnu::visibility("default")]] extern pthread_mutex_t queue_mutex;
/// Signalled when a task has been queued.
[[gnu::visibility("default")]] extern pthread_cond_t worktodo;

/// Whether the manager has been started. Only start-up uses it.
[[gnu::visibility("default")]] extern bool initialized;

/// The agent depot directory, "/" at its end; set once by start-up.
[[gnu::visibility("default")]] extern ZAV::String& depotDir;

/// Finds the depot directory and starts the executor. Does nothing when it has done so before, and
/// nothing but a trace line without a depot directory. One thread at a time.
void zav_taskmgr_init();

/// Checks a request, runs its command or queues a copy, and fills the request's answer (see
/// TaskQueueElem::ReturnStatus). Returns the code that is in the answer. Any thread; blocks for as
/// long as a command that runs at once takes. What a handler throws is traced and answered.
TASK_RC runTask(TaskQueueElem& task);

/// Gives a task to the executor. Any thread.
void queueTask(TaskQueueElem task);

/// The executor's body: takes tasks off the queue, runs them and publishes their outcomes. Never
/// returns, and lets no exception end it.
void* executor_thread(void* unused);

/// Runs a queued command; called by the executor. Returns the task's code, and leaves the message
/// of a failure in the task; that of a handler which throws is the command itself. Publishes
/// nothing.
TASK_RC processAsyncTask(TaskQueueElem& task);

/// `current` when there is a value. Else leaves the failure's message in the task and returns
/// `failure`. `name` is the parameter's, for the trace.
TASK_RC requiredParameterOk(const ZAV::String& name, const ZAV::String& value, TaskQueueElem& task,
                            TASK_RC current, TASK_RC failure);

/// Whether the command is one of `commands`, spelled exactly so.
bool isSupportedTask(ZAV::String command);
/// Traces the commands that are supported.
void getSupportedTasks();

/// The queue between the requests and the executor: taskQueue under its lock.
#pragma once

#include "tasks/zavtqelm.h"

/// Appends a task and wakes the executor. Any thread. What fails on the way is traced, and the task
/// is queued all the same.
void queueTask(TaskQueueElem task);

namespace ZAV {

class Trace;

/// Prepares the queue's lock and condition; start-up calls it once, before anybody queues a task.
/// Failures are written to the caller's trace; the statically initialised objects then stay in use.
void initQueue(const Trace& trace);

/// Moves the oldest task into `task`. With an empty queue it waits once, and a wake-up for nothing
/// ends that wait too. Returns false when it got no task; the caller then tries again. Only the
/// executor calls it.
bool takeTask(TaskQueueElem& task);

}  // namespace ZAV

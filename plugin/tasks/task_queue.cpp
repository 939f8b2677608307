#include "tasks/task_queue.h"

#include <utility>

#include "base/zavtrace.h"
#include "tasks/task_state.h"

using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

/// Holds queue_mutex. The callers report it when locking or unlocking fails.
class QueueLock {
public:
    QueueLock() : status_(pthread_mutex_lock(&queue_mutex)), held_(status_ == 0) {}
    ~QueueLock() {
        if (held_) pthread_mutex_unlock(&queue_mutex);
    }
    QueueLock(const QueueLock&) = delete;
    QueueLock& operator=(const QueueLock&) = delete;

    /// 0, or the error number with which locking failed.
    int status() const { return status_; }
    /// Calls unlock even when locking failed. Returns 0 or an error number.
    int unlock() {
        held_ = false;
        return pthread_mutex_unlock(&queue_mutex);
    }

private:
    int status_;
    bool held_;
};

/// Waits until a task may have been queued. The caller holds the lock.
void awaitTask(const Trace& trace) {
    const int rc = pthread_cond_wait(&worktodo, &queue_mutex);
    if (rc == 0) {
        trace().detail("Executor awoken by signal");
    } else {
        trace().error("Failed to wait on condition, return code %d", rc);
    }
}

}  // namespace

void ZAV::initQueue(const Trace& trace) {
    int rc = pthread_mutex_init(&queue_mutex, nullptr);
    if (rc != 0) trace().error("Unable to initialize queue mutex, return code %d\n", rc);
    rc = pthread_cond_init(&worktodo, nullptr);
    if (rc != 0) trace().error("Unable to initialize condition variable, return code %d\n", rc);
}

void queueTask(TaskQueueElem task) {
    Trace trace(traceUnit);
    QueueLock lock;
    if (lock.status() != 0) {
        trace().error("Unable to get lock on queue mutex, return code %d\n", lock.status());
    }
    taskQueue.push(std::move(task));
    int rc = pthread_cond_signal(&worktodo);
    if (rc != 0) trace().error("Unable to signal executor thread, return code %d\n", rc);
    rc = lock.unlock();
    if (rc != 0) trace().error("Unable to unlock queue mutex, return code %d\n", rc);
}

bool ZAV::takeTask(TaskQueueElem& task) {
    Trace trace(traceUnit);
    QueueLock lock;
    if (lock.status() != 0) {
        trace().error("Failed to lock queue mutex, return code %d", lock.status());
        return trace.exit(false);
    }
    if (taskQueue.empty()) {
        awaitTask(trace);
    } else {
        trace().detail("Executor has %d items on queue", taskQueue.size());
    }
    const bool taken = !taskQueue.empty();
    if (taken) {
        task = std::move(taskQueue.front());
        taskQueue.pop();
    }
    const int rc = lock.unlock();
    if (rc != 0) trace().error("Failed to unlock queue mutex, return code %d", rc);
    return trace.exit(taken && rc == 0);
}

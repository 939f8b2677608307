#include "tasks/executor.h"

#include <csignal>

#include "base/zavtrace.h"
#include "platform/bss1.h"
#include "tasks/zavtasks.h"
#include "util/exceptions.h"

using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

constexpr int kAttempts = 5;
constexpr unsigned kPauseSeconds = 1;

/// Keeps signals from the threads that are created while it exists: those sent to the process are
/// its own business. Signals that report a fault of the thread itself stay deliverable.
class SignalsBlocked {
public:
    SignalsBlocked() {
        sigset_t blocked;
        sigfillset(&blocked);
        for (const int fault : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGTRAP, SIGABRT, SIGSYS}) {
            sigdelset(&blocked, fault);
        }
        pthread_sigmask(SIG_SETMASK, &blocked, &before_);
    }
    ~SignalsBlocked() { pthread_sigmask(SIG_SETMASK, &before_, nullptr); }
    SignalsBlocked(const SignalsBlocked&) = delete;
    SignalsBlocked& operator=(const SignalsBlocked&) = delete;

private:
    sigset_t before_;
};

/// Holds queue_mutex. Locking and unlocking may fail, which the caller reports.
class QueueLock {
public:
    QueueLock() : status_(pthread_mutex_lock(&queue_mutex)), held_(status_ == 0) {}
    ~QueueLock() {
        if (held_) pthread_mutex_unlock(&queue_mutex);
    }
    QueueLock(const QueueLock&) = delete;
    QueueLock& operator=(const QueueLock&) = delete;

    /// 0 or the error number of the attempt to lock.
    int status() const { return status_; }
    /// Unlocks, even what could not be locked; returns 0 or an error number.
    int unlock() {
        held_ = false;
        return pthread_mutex_unlock(&queue_mutex);
    }

private:
    int status_;
    bool held_;
};

/// Waits until a task may have been queued. The lock is held.
void awaitTask(const Trace& trace) {
    const int rc = pthread_cond_wait(&worktodo, &queue_mutex);
    if (rc == 0) {
        trace().detail("Executor awoken by signal");
    } else {
        trace().error("Failed to wait on condition, return code %d", rc);
    }
}

/// Moves the next task out of the queue, for which it waits once. False when there is none to run,
/// which the caller answers by trying again.
bool takeTask(TaskQueueElem& task) {
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

/// Runs `step`, again when it throws. Between a task's leaving the queue and its outcome nothing
/// throws once it has had its effect, and every task has its one outcome, also when there is no
/// memory for that at first.
template <typename Step>
auto untilItWorks(const Trace& trace, const Step& step) {
    for (int attempt = 1; attempt < kAttempts; ++attempt) {
        try {
            return step();
        } catch (...) {
            ZAV::traceException(trace);
        }
        BSS1_Sleep(kPauseSeconds);
    }
    return step();
}

/// Handlers' exceptions do not come this far; what does must not end the thread either.
void executeNextTask() noexcept {
    const Trace trace(traceUnit);
    try {
        TaskQueueElem task;
        if (!takeTask(task)) return;
        const TASK_RC rc = untilItWorks(trace, [&] { return processAsyncTask(task); });
        untilItWorks(trace, [&] { task.returnAsyncStatus(rc); });
    } catch (...) {
        ZAV::traceException(trace);
        // Without memory it would come back here at once.
        BSS1_Sleep(kPauseSeconds);
    }
}

}  // namespace

void startExecutor() {
    Trace trace(traceUnit);
    int rc = pthread_mutex_init(&queue_mutex, nullptr);
    if (rc != 0) trace().error("Unable to initialize queue mutex, return code %d\n", rc);
    rc = pthread_cond_init(&worktodo, nullptr);
    if (rc != 0) trace().error("Unable to initialize condition variable, return code %d\n", rc);
    const SignalsBlocked blocked;
    pthread_t executor;
    rc = pthread_create(&executor, nullptr, executor_thread, nullptr);
    if (rc != 0) trace().error("Unable to create executor thread, return code %d\n", rc);
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

void* executor_thread(void*) {
    for (;;)
        executeNextTask();
}

// What the task manager does and traces when its mutex, its condition or its thread fails. The
// definitions below replace the C library's in this program.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <pthread.h>

#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <string>
#include <vector>

#include "support/fake_sleep.h"
#include "support/host/outcomes.h"
#include "support/host/program.h"
#include "support/row_text.h"
#include "support/trace_capture.h"
#include "tasks/fake_handlers.h"
#include "tasks/zavtasks.h"

namespace {

/// The error that the next call of a function on the task manager's objects returns, once.
struct Failure {
    std::atomic<int> error{0};
    int take() { return error.exchange(0); }
};

Failure mutexInit, condInit, threadCreate, mutexLock, mutexUnlock, condSignal, condWait;

/// 32-bit C libraries have two versions of the functions for condition variables; takes the new
/// ones.
template <typename Function>
Function* original(const char* name) {
    void* found = ::dlvsym(RTLD_NEXT, name, "GLIBC_2.3.2");
    if (found == nullptr) found = ::dlsym(RTLD_NEXT, name);
    return reinterpret_cast<Function*>(found);
}

bool isTheQueues(const pthread_mutex_t* mutex) {
    return mutex == &queue_mutex;
}

}  // namespace

extern "C" {

int pthread_mutex_init(pthread_mutex_t* mutex, const pthread_mutexattr_t* attributes) noexcept {
    static auto* const next = original<decltype(pthread_mutex_init)>("pthread_mutex_init");
    const int error = isTheQueues(mutex) ? mutexInit.take() : 0;
    return error != 0 ? error : next(mutex, attributes);
}

int pthread_cond_init(pthread_cond_t* condition, const pthread_condattr_t* attributes) noexcept {
    static auto* const next = original<decltype(pthread_cond_init)>("pthread_cond_init");
    const int error = condition == &worktodo ? condInit.take() : 0;
    return error != 0 ? error : next(condition, attributes);
}

int pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*body)(void*),
                   void* argument) noexcept {
    static auto* const next = original<decltype(pthread_create)>("pthread_create");
    const int error = body == &executor_thread ? threadCreate.take() : 0;
    return error != 0 ? error : next(thread, attributes, body, argument);
}

int pthread_mutex_lock(pthread_mutex_t* mutex) noexcept {
    static auto* const next = original<decltype(pthread_mutex_lock)>("pthread_mutex_lock");
    const int error = isTheQueues(mutex) ? mutexLock.take() : 0;
    return error != 0 ? error : next(mutex);
}

/// A failing unlock unlocks all the same; otherwise nothing could go on.
int pthread_mutex_unlock(pthread_mutex_t* mutex) noexcept {
    static auto* const next = original<decltype(pthread_mutex_unlock)>("pthread_mutex_unlock");
    const int error = isTheQueues(mutex) ? mutexUnlock.take() : 0;
    const int rc = next(mutex);
    return error != 0 ? error : rc;
}

int pthread_cond_signal(pthread_cond_t* condition) noexcept {
    static auto* const next = original<decltype(pthread_cond_signal)>("pthread_cond_signal");
    const int error = condition == &worktodo ? condSignal.take() : 0;
    return error != 0 ? error : next(condition);
}

int pthread_cond_wait(pthread_cond_t* condition, pthread_mutex_t* mutex) {
    static auto* const next = original<decltype(pthread_cond_wait)>("pthread_cond_wait");
    const int error = condition == &worktodo ? condWait.take() : 0;
    return error != 0 ? error : next(condition, mutex);
}

}  // extern "C"

namespace {

using Texts = std::vector<std::string>;

class QueueFailures : public testing::Test {
protected:
    QueueFailures() {
        static ScratchDir& scratch = *new ScratchDir;
        ::setenv("QVSDEPLOY_AGENTDEPOT", scratch.makeDir("depot").c_str(), 1);
        fake_handlers::reset();
        fake_sleep::reset();
    }

    static TaskQueueElem request(const char* transid) {
        return TaskQueueElem("node", transid, "START", "ux", "", "INSTANCE", "", "", "", "i");
    }

    /// Starts the executor and waits until it is waiting for work.
    static void startExecutor() {
        zav_taskmgr_init();
        Outcomes outcomes;
        queueTask(request("warm-up"));
        ASSERT_EQ(outcomes.waitFor(1).size(), 1u);
    }

    static Texts transids(const std::vector<zav_kagdyst_data_t>& rows) {
        Texts found;
        for (const zav_kagdyst_data_t& row : rows)
            found.push_back(trimmedField(row.transid));
        return found;
    }

    static void awaitError(const TraceCapture& trace, const std::string& text) {
        EXPECT_TRUE(eventually([&] { return trace.count('E', text) > 0; }));
        EXPECT_EQ(trace.count('E', text), 1);
    }
};

TEST_F(QueueFailures, StartUpGoesOnWhateverFails) {
    if (initialized) GTEST_SKIP() << "started by an earlier case of this process";
    mutexInit.error = ENOMEM;
    condInit.error = EAGAIN;
    threadCreate.error = EPERM;
    TraceCapture trace;
    zav_taskmgr_init();
    EXPECT_EQ(trace.errors("zavtasks"),
              (Texts{"Command vector being initialized",
                     "Unable to initialize queue mutex, return code 12",
                     "Unable to initialize condition variable, return code 11",
                     "Unable to create executor thread, return code 1"}));
    EXPECT_TRUE(initialized);
    EXPECT_EQ(commands.size(), 9u);

    TaskQueueElem task = request("tx");
    EXPECT_EQ(runTask(task), 0);
    EXPECT_EQ(taskQueue.size(), 1u);
    taskQueue = {};
    commands.clear();
    initialized = false;
}

TEST_F(QueueFailures, ATaskIsQueuedWhateverFails) {
    if (initialized) GTEST_SKIP() << "started by an earlier case of this process";
    mutexLock.error = EINVAL;
    condSignal.error = EPERM;
    TraceCapture trace;
    queueTask(request("tx"));
    EXPECT_EQ(taskQueue.size(), 1u);
    const Texts errors = trace.errors("zavtasks");
    ASSERT_GE(errors.size(), 2u);
    EXPECT_EQ(errors[0], "Unable to get lock on queue mutex, return code 22");
    EXPECT_EQ(errors[1], "Unable to signal executor thread, return code 1");
    taskQueue = {};
    pthread_mutex_init(&queue_mutex, nullptr);  // it was unlocked without having been locked
}

TEST_F(QueueFailures, AFailedUnlockOfTheQueueIsTraced) {
    if (initialized) GTEST_SKIP() << "started by an earlier case of this process";
    mutexUnlock.error = EPERM;
    TraceCapture trace;
    queueTask(request("tx"));
    EXPECT_EQ(trace.errors("zavtasks"), (Texts{"Unable to unlock queue mutex, return code 1"}));
    EXPECT_EQ(taskQueue.size(), 1u);
    taskQueue = {};
}

TEST_F(QueueFailures, TheExecutorTriesAgainWhenItCannotLock) {
    startExecutor();
    Outcomes outcomes;
    TraceCapture trace;
    mutexLock.error = EINVAL;
    // The next thread to lock gets the error. Wake the executor, so that it is the one.
    pthread_cond_broadcast(&worktodo);
    awaitError(trace, "Failed to lock queue mutex, return code 22");
    queueTask(request("tx"));
    EXPECT_EQ(transids(outcomes.waitFor(1)), (Texts{"tx"}));
}

TEST_F(QueueFailures, TheExecutorTriesAgainWhenItCannotWait) {
    startExecutor();
    Outcomes outcomes;
    TraceCapture trace;
    condWait.error = EINVAL;
    pthread_cond_broadcast(&worktodo);
    awaitError(trace, "Failed to wait on condition, return code 22");
    queueTask(request("tx"));
    EXPECT_EQ(transids(outcomes.waitFor(1)), (Texts{"tx"}));
}

TEST_F(QueueFailures, ATaskWhoseUnlockFailsIsSkipped) {
    startExecutor();
    Outcomes outcomes;
    TraceCapture trace;
    pthread_mutex_lock(&queue_mutex);
    taskQueue.push(request("skipped"));
    mutexUnlock.error = EPERM;  // for the executor; this thread calls the original function
    static auto* const unlock = original<decltype(pthread_mutex_unlock)>("pthread_mutex_unlock");
    pthread_cond_signal(&worktodo);
    unlock(&queue_mutex);
    awaitError(trace, "Failed to unlock queue mutex, return code 1");
    queueTask(request("tx"));
    EXPECT_EQ(transids(outcomes.waitFor(1)), (Texts{"tx"}));
}

}  // namespace

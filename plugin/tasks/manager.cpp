#include "tasks/manager.h"

#include <pthread.h>

#include <csignal>

#include "base/zavtrace.h"
#include "tasks/command_table.h"
#include "tasks/executor.h"
#include "tasks/return_codes.h"
#include "tasks/task_queue.h"
#include "tasks/task_state.h"
#include "util/zavutil.h"

using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

/// While it exists, threads are created with signals blocked: a signal sent to the process is for
/// the host's own threads. Signals that report a fault of the thread itself stay deliverable.
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

/// Prepares the queue's lock and starts the thread, which nobody joins. Failures are only traced.
void startExecutor() {
    Trace trace(traceUnit);
    ZAV::initQueue(trace);
    const SignalsBlocked blocked;
    pthread_t executor;
    const int rc = pthread_create(&executor, nullptr, executor_thread, nullptr);
    if (rc != 0) trace().error("Unable to create executor thread, return code %d\n", rc);
}

}  // namespace

void zav_taskmgr_init() {
    Trace trace(traceUnit);
    if (initialized) return;
    if (!ZAV::Util::getAgentDepotDir(depotDir)) {
        trace().error("%s No Agent Depot directory set", rcToMsgId(TASK_NO_DEPOT));
        return;
    }
    trace().error("Command vector being initialized");
    initialized = true;
    // The tables are registered, so requests may arrive now. One that finds its command goes on to
    // the queue: nobody may see the list before it is complete and the queue's lock is ready.
    const std::lock_guard<std::mutex> lock(ZAV::commandsMutex);
    for (const Command& command : commandTable)
        commands.push_back(command.name);
    startExecutor();
}

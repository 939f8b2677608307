#include "tasks/executor.h"

#include "base/zavtrace.h"
#include "platform/bss1.h"
#include "tasks/dispatch.h"
#include "tasks/task_queue.h"
#include "tasks/zavtqelm.h"
#include "util/exceptions.h"

using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

constexpr int kAttempts = 5;
constexpr unsigned kPauseSeconds = 1;

/// Runs `step`, and runs it again when it throws. A step that throws has had no effect yet, so
/// repeating it is safe: a task still gets exactly one outcome when memory was short at first.
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

/// Exceptions of handlers are caught below. Whatever else arrives here must not end the thread.
void executeNextTask() noexcept {
    const Trace trace(traceUnit);
    try {
        TaskQueueElem task;
        if (!ZAV::takeTask(task)) return;
        const TASK_RC rc = untilItWorks(trace, [&] { return processAsyncTask(task); });
        untilItWorks(trace, [&] { task.returnAsyncStatus(rc); });
    } catch (...) {
        ZAV::traceException(trace);
        // Pauses, because without memory the next attempt would fail at once too.
        BSS1_Sleep(kPauseSeconds);
    }
}

}  // namespace

void* executor_thread(void*) {
    for (;;)
        executeNextTask();
}

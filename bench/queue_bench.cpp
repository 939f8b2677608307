// How long a task takes to be queued: the time per task must not grow with the queue.
#include <benchmark/benchmark.h>

#include "tasks/zavtasks.h"

namespace {

void QueueTasks(benchmark::State& state) {
    const TaskQueueElem task("node", "a-transaction-id", "START", "ux", "some context", "INSTANCE",
                             "", "", "062000000", "host:UX");
    for (auto _ : state) {
        for (std::int64_t i = 0; i < state.range(0); ++i)
            queueTask(task);
        state.PauseTiming();
        taskQueue = {};
        state.ResumeTiming();
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
    state.SetComplexityN(state.range(0));
}
BENCHMARK(QueueTasks)
    ->Arg(12500)
    ->Arg(25000)
    ->Arg(50000)
    ->Arg(100000)
    ->Unit(benchmark::kMillisecond)
    ->Complexity();

}  // namespace

BENCHMARK_MAIN();

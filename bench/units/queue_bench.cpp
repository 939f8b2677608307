// How the cost of accepting requests into the queue and taking them off again grows with its depth.
#include <benchmark/benchmark.h>

#include <vector>

#include "embedded/oxa_host.h"
#include "tables/zav01agt.h"
#include "tasks/zavtasks.h"

namespace {

/// Takes all tasks as the executor does it, without running them.
void takeAll() {
    while (!taskQueue.empty()) {
        TaskQueueElem taken;
        pthread_mutex_lock(&queue_mutex);
        taken = std::move(taskQueue.front());
        taskQueue.pop();
        pthread_mutex_unlock(&queue_mutex);
    }
}

/// That many requests are accepted before the first is taken.
void queue(benchmark::State& state) {
    const std::vector<oxa::Predicate> request = {{"COMMAND", OPER_EQ, "START"},
                                                 {"PRODUCT", OPER_EQ, "ux"},
                                                 {"TRANSID", OPER_EQ, "a-transaction-id"},
                                                 {"TARGETMSN", OPER_EQ, "host:UX"}};
    const auto depth = static_cast<std::size_t>(state.range(0));
    for (auto _ : state) {
        for (std::size_t i = 0; i < depth; ++i) {
            oxa::Rows answer;
            oxa::query("KAGREQT", request, answer);
        }
        if (taskQueue.size() != depth) state.SkipWithError("a request was not queued");
        takeAll();
    }
}
BENCHMARK(queue)->RangeMultiplier(10)->Range(1, 100000);

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    // The table's commands without the executor, which would take the tasks itself.
    commands.push_back("START");
    if (zav_kagreqt_init() != 0) return 1;
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}

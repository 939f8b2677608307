// The executor when memory runs out at any of its allocations: each task has one outcome all the
// same. Outcomes and sleeps are taken over here, without a need for memory.
#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <string>

#include "faults/scenario.h"
#include "platform/bss1.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"
#include "tasks/deploy_status.h"
#include "tasks/fake_handlers.h"
#include "tasks/zavtasks.h"
#include "util/zavutil.h"

using namespace faults;

namespace {

std::atomic<int> published{0};
std::atomic<int> lastCode{-1};
std::atomic<int> sleeps{0};
std::atomic<bool> nextIsDone{false};

}  // namespace

int publishDeployStatus(zav_kagdyst_data_t* rows, int count) {
    lastCode = rows->retval;
    if (std::strncmp(rows->transid, "next", 4) == 0) nextIsDone = true;
    published += count;
    return 0;
}

void BSS1_Sleep(unsigned) {
    ::usleep(1000);
    ++sleeps;
}

namespace {

class ExecutorFaults : public testing::Test {
protected:
    void SetUp() override {
        if (!kMemoryIsOurs) GTEST_SKIP() << "the sanitizer owns malloc";
        static ScratchDir& scratch = *new ScratchDir;  // the executor outlives the test
        ::setenv("QVSDEPLOY_AGENTDEPOT", scratch.makeDir("depot").c_str(), 1);
        fake_handlers::reset();
        zav_taskmgr_init();
        ASSERT_TRUE(initialized);
    }

    /// Queues a task whose execution meets a fault from its `nth` allocation on, one that works or
    /// several; gives its return code once its outcome is there.
    static int codeWithFault(int nth, bool& happened) {
        const int before = published;
        TaskQueueElem task("node", "T1", "START", "ux", "", "INSTANCE", "", "", "", "i");
        pthread_mutex_lock(&queue_mutex);
        taskQueue.push(std::move(task));
        const Fault fault(Call::kNew, nth, ENOMEM);
        pthread_cond_signal(&worktodo);
        pthread_mutex_unlock(&queue_mutex);
        EXPECT_TRUE(eventually([before] { return published != before; }));
        happened = fault.happened();
        EXPECT_EQ(published, before + 1) << nth;
        return lastCode;
    }

    /// The codes of tasks with a fault at each of their allocations.
    static std::set<int> codesWithEveryFault() {
        std::set<int> codes;
        bool happened = true;
        for (int nth = 1; happened && nth < 1000; ++nth)
            codes.insert(codeWithFault(nth, happened));
        EXPECT_FALSE(happened);
        return codes;
    }

    TraceCapture traces_{"ERROR"};
};

TEST_F(ExecutorFaults, ATaskHasOneOutcomeWhateverMemoryIsMissing) {
    // A handler that has no memory has not started its command.
    EXPECT_EQ(codesWithEveryFault(), (std::set<int>{0, 1025}));
}

TEST_F(ExecutorFaults, AHandlersExceptionIsItsOutcomeAlsoWithoutMemoryForTheMessage) {
    fake_handlers::behave([](const std::string&, TaskQueueElem&) -> TASK_RC { throw 42; });
    EXPECT_EQ(codesWithEveryFault(), (std::set<int>{1025}));
}

/// What becomes of the task depends on where the executor was: one that had yet to look at the
/// queue leaves it there until there is memory, one that waited for it gives it up.
TEST_F(ExecutorFaults, WithoutAnyMemoryTheExecutorPausesAndRunsTheNextTaskAfterwards) {
    constexpr int kPauses = 10;
    const int before = published;
    const int sleptBefore = sleeps;
    pthread_mutex_lock(&queue_mutex);
    taskQueue.push(TaskQueueElem("node", "T1", "START", "ux", "", "INSTANCE", "", "", "", "i"));
    {
        const Fault fault(Call::kNew, 1, ENOMEM, Fault::Lasts::kOnwards);
        pthread_cond_signal(&worktodo);
        pthread_mutex_unlock(&queue_mutex);
        EXPECT_TRUE(eventually([&] { return sleeps >= sleptBefore + kPauses; }));
        EXPECT_TRUE(fault.happened());
        EXPECT_EQ(published, before);
    }
    pthread_mutex_lock(&queue_mutex);
    taskQueue.push(TaskQueueElem("node", "next", "START", "ux", "", "INSTANCE", "", "", "", "i"));
    pthread_cond_signal(&worktodo);
    pthread_mutex_unlock(&queue_mutex);
    EXPECT_TRUE(eventually([] { return nextIsDone.load(); }));
    EXPECT_LE(published, before + 2);
    EXPECT_EQ(lastCode, 0);
    // Each attempt and each look at the queue says so, at the pace of the pauses.
    const int told = traces_.count('E', "Exception caught: %s");
    EXPECT_GE(told, kPauses);
    EXPECT_LE(told, sleeps - sleptBefore + 2);
}

}  // namespace

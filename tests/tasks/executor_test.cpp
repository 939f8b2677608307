// Start-up of the task manager, the queue, and the thread that runs the queued tasks.
// ctest-label: threaded
#include <gtest/gtest.h>
#include <pthread.h>

#include <atomic>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "support/fake_sleep.h"
#include "support/gate.h"
#include "support/host/outcomes.h"
#include "support/host/program.h"
#include "support/row_text.h"
#include "support/trace_capture.h"
#include "tasks/fake_handlers.h"
#include "tasks/zavtasks.h"
#include "util/zavutil.h"

using fake_handlers::narrow;
using ZAV::String;

namespace {

using Texts = std::vector<std::string>;

std::size_t threadCount() {
    const std::filesystem::directory_iterator threads("/proc/self/task");
    return static_cast<std::size_t>(std::distance(begin(threads), end(threads)));
}

std::string newScratchDepot() {
    static ScratchDir& scratch = *new ScratchDir;  // the executor may outlive main
    return scratch.makeDir("depot");
}

/// Runs start-up while several threads repeat `request` until it is accepted. Returns each thread's
/// first result other than TASK_NOT_SUPPORTED.
std::vector<TASK_RC> resultsDuringStartUp(const std::function<TASK_RC()>& request) {
    constexpr unsigned count = 3;
    std::atomic<unsigned> refused{0};
    std::vector<TASK_RC> results(count);
    std::vector<std::thread> requesters;
    for (TASK_RC& result : results) {
        requesters.emplace_back([&] {
            result = request();
            if (result == TASK_NOT_SUPPORTED) ++refused;
            while (result == TASK_NOT_SUPPORTED)
                result = request();
        });
    }
    while (refused < count)
        std::this_thread::yield();
    zav_taskmgr_init();
    for (std::thread& requester : requesters)
        requester.join();
    return results;
}

class Executor : public testing::Test {
protected:
    Executor() { fake_handlers::reset(); }
    ~Executor() override { fake_handlers::reset(); }

    static void offerDepot() { ::setenv("QVSDEPLOY_AGENTDEPOT", newScratchDepot().c_str(), 1); }

    static void start() {
        offerDepot();
        zav_taskmgr_init();
    }

    static TaskQueueElem request(const char* command, const std::string& transid) {
        return TaskQueueElem("node", transid.c_str(), command, "ux", "ctx", "INSTANCE", "", "",
                             "0620", "inst1");
    }

    static std::size_t queueLength() {
        pthread_mutex_lock(&queue_mutex);
        const std::size_t length = taskQueue.size();
        pthread_mutex_unlock(&queue_mutex);
        return length;
    }

    static Texts transids(const std::vector<zav_kagdyst_data_t>& rows) {
        Texts found;
        for (const zav_kagdyst_data_t& row : rows)
            found.push_back(trimmedField(row.transid));
        return found;
    }
};

// ---- Start-up -----------------------------------------------------------------------------------

TEST_F(Executor, IsNotStartedWithoutADepot) {
    if (initialized) GTEST_SKIP() << "started by an earlier case of this process";
    ::unsetenv("QVSDEPLOY_AGENTDEPOT");
    ::unsetenv("TOVRINHOME");
    const std::size_t threads = threadCount();
    TraceCapture trace;
    zav_taskmgr_init();
    EXPECT_EQ(trace.errors("zavtasks"), (Texts{"ZAV1010E No Agent Depot directory set"}));
    EXPECT_FALSE(initialized);
    EXPECT_TRUE(commands.empty());
    EXPECT_EQ(threadCount(), threads);

    TaskQueueElem task = request("START", "tx");
    EXPECT_EQ(runTask(task), TASK_NOT_SUPPORTED);
    EXPECT_TRUE(taskQueue.empty());
}

TEST_F(Executor, IsStartedOnce) {
    if (initialized) GTEST_SKIP() << "started by an earlier case of this process";
    std::thread([] {}).join();  // a sanitizer may start a thread of its own with the first one
    const std::size_t threads = threadCount();
    TraceCapture trace;
    start();
    EXPECT_EQ(trace.errors("zavtasks"), (Texts{"Command vector being initialized"}));
    EXPECT_TRUE(initialized);
    EXPECT_EQ(narrow(depotDir), newScratchDepot() + "/");
    Texts names;
    for (const String& command : commands)
        names.push_back(narrow(command));
    EXPECT_EQ(names, (Texts{"START", "STOP", "RESTART", "INSTALL", "UNINSTALL", "GETCONFIG",
                            "SETCONFIG", "COMPLETE_INSTALL", "REMOVEINSTANCE"}));
    EXPECT_EQ(threadCount(), threads + 1);

    zav_taskmgr_init();
    EXPECT_EQ(commands.size(), 9u);
    EXPECT_EQ(threadCount(), threads + 1);
    EXPECT_EQ(trace.errors("zavtasks").size(), 1u);
}

TEST_F(Executor, RequestsThatArriveDuringItsStartUpAreRefusedOrRun) {
    if (initialized) GTEST_SKIP() << "started by an earlier case of this process";
    offerDepot();
    const TraceCapture trace("ERROR");  // keeps the many refusals off standard error
    Outcomes outcomes;
    const auto results = resultsDuringStartUp([] {
        TaskQueueElem task = request("START", "tx");
        return runTask(task);
    });
    EXPECT_EQ(results, std::vector<TASK_RC>(3, TASK_OK));
    EXPECT_EQ(outcomes.waitFor(3).size(), 3u);
}

TEST_F(Executor, RequestsFindAllCommandsAsSoonAsTheyFindOne) {
    if (initialized) GTEST_SKIP() << "started by an earlier case of this process";
    offerDepot();
    const TraceCapture trace("ERROR");  // keeps the many refusals off standard error
    const auto results = resultsDuringStartUp([] {
        if (!isSupportedTask("START")) return TASK_NOT_SUPPORTED;
        return isSupportedTask("REMOVEINSTANCE") ? TASK_OK : TASK_INFORMATION;
    });
    EXPECT_EQ(results, std::vector<TASK_RC>(3, TASK_OK));
}

// ---- Running tasks ------------------------------------------------------------------------------

TEST_F(Executor, AnAcceptedInstallIsAnsweredAtOnceAndReportedLater) {
    start();
    Outcomes outcomes;
    Gate gate;
    fake_handlers::behave([&gate](const std::string&, TaskQueueElem&) {
        gate.pass();
        return TASK_OK;
    });
    TaskQueueElem task = request("INSTALL", "tx-1");
    EXPECT_EQ(runTask(task), 0);
    EXPECT_EQ(task.getReturnResults().retval, 0);
    EXPECT_EQ(fieldText(task.getReturnResults().retmsgid), padded("", 16));
    ASSERT_TRUE(gate.awaitArrival());
    EXPECT_TRUE(outcomes.rows().empty());
    gate.open();
    const auto rows = outcomes.waitFor(1);
    ASSERT_EQ(rows.size(), 1u);
    EXPECT_EQ(trimmedField(rows[0].command), "INSTALL");
    EXPECT_EQ(rows[0].retval, 0);
}

TEST_F(Executor, AFailureYieldsOneRowWithTheRequestsIdentity) {
    start();
    Outcomes outcomes;
    fake_handlers::behave([](const std::string&, TaskQueueElem& task) {
        task.setRetmsgid("ZAV1024E");
        task.setRetmsgparm("the command line");
        return TASK_START_STOP_FAILED;
    });
    queueTask(request("START", "tx-1"));
    ASSERT_EQ(outcomes.waitFor(1).size(), 1u);
    fake_handlers::reset();
    queueTask(request("START", "tx-2"));
    const auto rows = outcomes.waitFor(2);
    EXPECT_EQ(transids(rows), (Texts{"tx-1", "tx-2"}));
    EXPECT_EQ(trimmedField(rows[0].targetmsn), "inst1");
    EXPECT_EQ(trimmedField(rows[0].originnode), "node");
    EXPECT_EQ(rows[0].retval, 1024);
    EXPECT_EQ(trimmedField(rows[0].retmsgid), "ZAV1024E");
    EXPECT_EQ(trimmedField(rows[0].retmsgparm), "the command line");
    EXPECT_EQ(rows[1].retval, 0);
    EXPECT_EQ(trimmedField(rows[1].retmsgid), "");
}

TEST_F(Executor, RunsTasksOneAtATimeInTheirOrder) {
    start();
    Outcomes outcomes;
    std::atomic<int> running{0};
    std::atomic<int> most{0};
    fake_handlers::behave([&](const std::string&, TaskQueueElem&) {
        const int now = ++running;
        if (now > most) most = now;
        std::this_thread::yield();
        --running;
        return TASK_OK;
    });
    Texts expected;
    for (int i = 0; i < 50; ++i) {
        expected.push_back("tx-" + std::to_string(i));
        TaskQueueElem task = request(i % 2 == 0 ? "START" : "UNINSTALL", expected.back());
        ASSERT_EQ(runTask(task), 0);
    }
    EXPECT_EQ(transids(outcomes.waitFor(expected.size())), expected);
    EXPECT_EQ(most, 1);
}

TEST_F(Executor, TakesRequestsFromManyThreads) {
    start();
    Outcomes outcomes;
    std::vector<std::thread> requesters;
    for (int i = 0; i < 4; ++i) {
        requesters.emplace_back([i] {
            for (int n = 0; n < 25; ++n) {
                TaskQueueElem task = request("STOP", std::to_string(i));
                EXPECT_EQ(runTask(task), 0);
            }
        });
    }
    for (std::thread& requester : requesters)
        requester.join();
    EXPECT_EQ(outcomes.waitFor(100).size(), 100u);
}

TEST_F(Executor, SleepsASecondForEachOutcome) {
    start();
    Outcomes outcomes;
    fake_sleep::reset();
    for (const char* transid : {"1", "2", "3"})
        queueTask(request("START", transid));
    ASSERT_EQ(outcomes.waitFor(3).size(), 3u);
    EXPECT_EQ(fake_sleep::slept(), (std::vector<unsigned>{1, 1, 1}));
}

TEST_F(Executor, TracesHowMuchIsQueued) {
    start();
    Outcomes outcomes;
    Gate gate;
    fake_handlers::behave([&gate](const std::string&, TaskQueueElem&) {
        gate.pass();
        return TASK_OK;
    });
    queueTask(request("START", "0"));
    ASSERT_TRUE(gate.awaitArrival());
    for (const char* transid : {"1", "2", "3"})
        queueTask(request("START", transid));
    EXPECT_EQ(queueLength(), 3u);
    TraceCapture trace;
    gate.open();
    ASSERT_EQ(outcomes.waitFor(4).size(), 4u);
    Texts lines;
    for (const std::string& line : trace.details("zavtasks")) {
        if (line.compare(0, 8, "Executor") == 0) lines.push_back(line);
    }
    EXPECT_EQ(lines, (Texts{"Executor has 3 items on queue", "Executor has 2 items on queue",
                            "Executor has 1 items on queue"}));
}

TEST_F(Executor, SurvivesWakeUpsForNothing) {
    start();
    Outcomes outcomes;
    queueTask(request("START", "0"));
    ASSERT_EQ(outcomes.waitFor(1).size(), 1u);
    TraceCapture trace;
    EXPECT_TRUE(eventually([&trace] {
        pthread_cond_broadcast(&worktodo);
        return trace.count('D', "Executor awoken by signal") >= 3;
    }));
    queueTask(request("START", "1"));
    EXPECT_EQ(transids(outcomes.waitFor(2)), (Texts{"0", "1"}));
}

TEST_F(Executor, QuickCommandsDoNotWaitForIt) {
    start();
    Outcomes outcomes;
    Gate gate;
    fake_handlers::behave([&gate](const std::string& handler, TaskQueueElem&) {
        if (handler == "install") gate.pass();
        return TASK_OK;
    });
    queueTask(request("INSTALL", "slow"));
    ASSERT_TRUE(gate.awaitArrival());
    TaskQueueElem quick = request("GETCONFIG", "quick");
    EXPECT_EQ(runTask(quick), 0);
    EXPECT_TRUE(outcomes.rows().empty());
    gate.open();
    EXPECT_EQ(transids(outcomes.waitFor(1)), (Texts{"slow"}));
}

TEST_F(Executor, SurvivesHandlersThatThrow) {
    start();
    Outcomes outcomes;
    fake_handlers::behave([](const std::string& handler, TaskQueueElem&) -> TASK_RC {
        if (handler == "install") throw std::runtime_error("broken");
        if (handler == "uninstall") throw 42;
        return TASK_OK;
    });
    TraceCapture trace;
    queueTask(request("INSTALL", "1"));
    queueTask(request("UNINSTALL", "2"));
    queueTask(request("START", "3"));
    const auto rows = outcomes.waitFor(3);
    ASSERT_EQ(transids(rows), (Texts{"1", "2", "3"}));
    EXPECT_EQ(rows[0].retval, 1030);
    EXPECT_EQ(trimmedField(rows[0].retmsgid), "ZAV1030E");
    EXPECT_EQ(trimmedField(rows[0].retmsgparm), "INSTALL");
    EXPECT_EQ(rows[1].retval, 1033);
    EXPECT_EQ(trimmedField(rows[1].retmsgparm), "UNINSTALL");
    EXPECT_EQ(rows[2].retval, 0);
    EXPECT_EQ(trace.errors("zavtasks").size(), 2u);
}

TEST_F(Executor, SubscribersGetTheRowsOfTheirTransactionOnly) {
    start();
    Outcomes mine({{"TRANSID", OPER_EQ, "x"}});
    Outcomes all;
    for (const char* transid : {"a", "x", "b", "x", "xx"})
        queueTask(request("START", transid));
    ASSERT_EQ(all.waitFor(5).size(), 5u);
    EXPECT_EQ(transids(mine.waitFor(2)), (Texts{"x", "x"}));
}

TEST_F(Executor, AnOutcomeWithoutSubscribersIsLost) {
    start();
    Gate gate;
    fake_handlers::behave([&gate](const std::string&, TaskQueueElem& task) {
        if (narrow(task.getTransid()) == "second") gate.pass();
        return TASK_OK;
    });
    TraceCapture trace;
    queueTask(request("START", "first"));
    queueTask(request("START", "second"));
    ASSERT_TRUE(gate.awaitArrival());  // so the first outcome has been published
    Outcomes outcomes;
    gate.open();
    EXPECT_EQ(transids(outcomes.waitFor(1)), (Texts{"second"}));
    EXPECT_TRUE(trace.errors().empty());
}

// ---- Manners ------------------------------------------------------------------------------------

TEST_F(Executor, LeavesSignalsToTheHost) {
    sigset_t before;
    pthread_sigmask(SIG_SETMASK, nullptr, &before);
    start();
    sigset_t after;
    pthread_sigmask(SIG_SETMASK, nullptr, &after);
    sigset_t inside;
    sigemptyset(&inside);
    fake_handlers::behave([&inside](const std::string&, TaskQueueElem&) {
        pthread_sigmask(SIG_SETMASK, nullptr, &inside);
        return TASK_OK;
    });
    Outcomes outcomes;
    queueTask(request("START", "1"));
    ASSERT_EQ(outcomes.waitFor(1).size(), 1u);
    for (const int signal : {SIGTERM, SIGINT, SIGHUP, SIGCHLD, SIGPIPE, SIGALRM, SIGUSR1}) {
        EXPECT_EQ(sigismember(&inside, signal), 1) << signal;
        EXPECT_EQ(sigismember(&after, signal), sigismember(&before, signal)) << signal;
    }
    for (const int fault : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGABRT}) {
        EXPECT_EQ(sigismember(&inside, fault), 0) << fault;
    }
}

TEST_F(Executor, ManyTasksMayWait) {
    start();
    Outcomes outcomes;
    Gate gate;
    fake_handlers::behave([&gate](const std::string& handler, TaskQueueElem&) {
        if (handler == "install") gate.pass();
        return TASK_OK;
    });
    queueTask(request("INSTALL", "first"));
    ASSERT_TRUE(gate.awaitArrival());
    constexpr std::size_t count = 10000;
    for (std::size_t i = 0; i < count; ++i)
        queueTask(request("START", std::to_string(i)));
    EXPECT_EQ(queueLength(), count);
    gate.open();
    EXPECT_EQ(transids(outcomes.waitFor(count + 1)).back(), std::to_string(count - 1));
}

TEST_F(Executor, MayBeBusyWhileTheProcessEnds) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(
        {
            start();
            for (int i = 0; i < 500; ++i)
                queueTask(request("START", "tx"));
            std::exit(0);
        },
        testing::ExitedWithCode(0), "");
}

}  // namespace

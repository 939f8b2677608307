// Requests that pass through the executor, the real handlers and the programs of a scratch home.
// ctest-label: threaded
#include "tasks/zavtasks.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

#include "support/fake_sleep.h"
#include "support/host/outcomes.h"
#include "support/host/script_home.h"
#include "support/row_text.h"
#include "support/trace_capture.h"
#include "tasks/home.h"

namespace {

using Texts = std::vector<std::string>;

/// One home for all cases of the process, because start-up determines its directories only once.
struct ManagedHome : ScriptHome {
    ManagedHome() {
        static std::string& kept = *new std::string(path());
        ZAV_TOVRINHOME = kept.c_str();
        ::setenv("TOVRINHOME", kept.c_str(), 1);
        ::setenv("QVSDEPLOY_AGENTDEPOT", files().makeDir("depot").c_str(), 1);
        zav_taskmgr_init();
    }
};

class TaskManager : public testing::Test {
protected:
    TaskManager() : home_(managedHome()) {
        fake_sleep::reset();
        home_.agentScript("exit 0");
        std::filesystem::remove(home_.path() + "/bin/cinfo");
    }

    static ManagedHome& managedHome() {
        static ManagedHome& home = *new ManagedHome;
        return home;
    }

    static void TearDownTestSuite() { std::filesystem::remove_all(managedHome().files().path()); }

    static TaskQueueElem request(const std::string& transid, const char* command,
                                 const char* product, const char* context = "",
                                 const char* optional = "", const char* target = "") {
        return TaskQueueElem("node", transid.c_str(), command, product, context, optional, "", "",
                             "062000000", target);
    }

    /// Runs a request that is accepted. Returns its one outcome.
    zav_kagdyst_data_t outcomeOf(TaskQueueElem task) {
        Outcomes outcomes(
            {{"TRANSID", OPER_EQ, static_cast<const char*>(task.getTransid().c_str())}});
        EXPECT_EQ(runTask(task), 0);
        EXPECT_EQ(trimmedField(task.getReturnResults().retmsgid), "");
        const auto rows = outcomes.waitFor(1);
        if (rows.empty()) throw std::runtime_error("no outcome");
        return rows[0];
    }

    std::string scriptLine(const std::string& options) const {
        return home_.path() + "/bin/TovrinAgent  -h " + home_.path() + " " + options;
    }

    ManagedHome& home_;
};

TEST_F(TaskManager, StartsAnAgentThroughTheScript) {
    const std::size_t before = home_.agentCalls().size();
    const zav_kagdyst_data_t row = outcomeOf(request("t1", "START", "ux"));
    EXPECT_EQ(row.retval, 0);
    EXPECT_EQ(trimmedField(row.command), "START");
    EXPECT_EQ(trimmedField(row.originnode), "node");
    EXPECT_EQ(trimmedField(row.retmsgparm), "");
    const Texts calls = home_.agentCalls();
    ASSERT_EQ(calls.size(), before + 1);
    EXPECT_EQ(calls.back(), "-h " + home_.path() + " start ux");
}

TEST_F(TaskManager, TheTargetOfAStartMayBeTheInstance) {
    const zav_kagdyst_data_t row = outcomeOf(request("t2", "START", "ux", "", "INSTANCE", "inst1"));
    EXPECT_EQ(row.retval, 0);
    EXPECT_EQ(trimmedField(row.targetmsn), "inst1");
    EXPECT_EQ(home_.agentCalls().back(), "-h " + home_.path() + " -o inst1 start ux");
}

TEST_F(TaskManager, AFailedStartIsReportedWithItsCommandLine) {
    home_.agentScript("exit 7");
    const zav_kagdyst_data_t row = outcomeOf(request("t3", "START", "nope"));
    EXPECT_EQ(row.retval, 1024);
    EXPECT_EQ(trimmedField(row.retmsgid), "ZAV1024E");
    EXPECT_EQ(fieldText(row.retmsgparm), padded(scriptLine("start nope"), 256));
}

TEST_F(TaskManager, ARestartThatOnlyFailedToStopSucceedsWithTheStopsMessage) {
    home_.agentScript("[ $verb = start ]");
    const zav_kagdyst_data_t row = outcomeOf(request("t4", "RESTART", "ux"));
    EXPECT_EQ(row.retval, 0);
    EXPECT_EQ(trimmedField(row.retmsgid), "ZAV1024E");
    EXPECT_EQ(fieldText(row.retmsgparm), padded(scriptLine("-c stop ux"), 256));
}

TEST_F(TaskManager, AnInstallRunsItsCommand) {
    const std::string made = home_.files().path("made");
    const std::string command = "/bin/sh -c 'echo done >" + made + "'";
    const zav_kagdyst_data_t row = outcomeOf(request("t5", "INSTALL", "ux", command.c_str()));
    EXPECT_EQ(row.retval, 0) << trimmedField(row.retmsgparm);
    EXPECT_EQ(home_.files().read("made"), "done\n");
}

TEST_F(TaskManager, AnInstallThatRestartsTheAgentHasTwoOutcomes) {
    home_.products({"ux"}, "exit 0");
    const std::string command = home_.files().script("restarting", "exit 9");
    Outcomes outcomes({{"TRANSID", OPER_EQ, "t7"}});
    TaskQueueElem task =
        request("t7", "INSTALL", "ux", command.c_str(), "REQUIRES_RESTART", "host:UX");
    ASSERT_EQ(runTask(task), 0);
    const auto rows = outcomes.waitFor(2);
    ASSERT_EQ(rows.size(), 2u);
    EXPECT_EQ(rows[0].retval, 0);
    EXPECT_EQ(trimmedField(rows[0].retmsgid), "");
    EXPECT_EQ(trimmedField(rows[0].targetmsn), "host:UX");
    EXPECT_EQ(rows[1].retval, 1031);
    EXPECT_EQ(trimmedField(rows[1].retmsgid), "ZAV1031E");
    const std::string run = "/bin/sh " + home_.depot() + "runcmd.sh " + command + ",9";
    EXPECT_EQ(fieldText(rows[1].retmsgparm), padded(run, 256));
    EXPECT_EQ(trimmedField(rows[1].targetmsn), "host:UX");
}

TEST_F(TaskManager, ChildrenOfTheExecutorHaveNoSignalsBlocked) {
    home_.agentScript("grep SigBlk /proc/self/status >'" + home_.files().path("mask") + "'");
    EXPECT_EQ(outcomeOf(request("t6", "START", "ux")).retval, 0);
    EXPECT_EQ(home_.files().read("mask"), "SigBlk:\t0000000000000000\n");
}

TEST_F(TaskManager, AQueryWhileATaskRunsIsAnsweredAtOnce) {
    const std::string release = home_.files().path("release");
    home_.agentScript("while [ ! -e '" + release + "' ]; do sleep 0.02; done");
    Outcomes outcomes;
    TaskQueueElem slow = request("slow", "START", "ux");
    ASSERT_EQ(runTask(slow), 0);
    TaskQueueElem quick = request("quick", "GETCONFIG", "ux");
    EXPECT_EQ(runTask(quick), TASK_NO_TRANSLATOR);
    EXPECT_EQ(quick.getReturnResults().retval, 1007);
    TaskQueueElem refused = request("refused", "start", "ux");
    EXPECT_EQ(runTask(refused), TASK_NOT_SUPPORTED);
    EXPECT_TRUE(outcomes.rows().empty());
    home_.files().write("release", "");
    const auto rows = outcomes.waitFor(1);
    ASSERT_EQ(rows.size(), 1u);
    EXPECT_EQ(trimmedField(rows[0].transid), "slow");
}

}  // namespace

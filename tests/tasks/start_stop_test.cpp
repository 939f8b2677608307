#include "tasks/start_stop.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <string>
#include <vector>

#include "support/host/script_home.h"
#include "support/row_text.h"
#include "support/scoped_env.h"
#include "support/trace_capture.h"
#include "tasks/home.h"
#include "tasks/zavtqelm.h"
#include "util/zavutil.h"

using ZAV::String;

namespace {

using Texts = std::vector<std::string>;

class StartStop : public testing::Test {
protected:
    StartStop() : path_(home_.path()) { ZAV_TOVRINHOME = path_.c_str(); }
    ~StartStop() override { ZAV_TOVRINHOME = nullptr; }

    /// Writes the run-as database; `agents` are its agent elements.
    void runAs(const std::string& agents) {
        const std::string host = static_cast<const char*>(ZAV::Util::getHostName().c_str());
        home_.files().write("home/config/" + host + "_zavrunas.cfg",
                            "<runas>\n" + agents + "</runas>\n");
    }

    static std::string agentEntry(const std::string& product, const std::string& instance,
                                  const std::string& user) {
        return "\t<agent>\n\t\t<productCode>" + product +
               "</productCode>\n\t\t<instance>\n\t\t\t<name>" + instance + "</name>\n\t\t\t<user>" +
               user + "</user>\n\t\t</instance>\n\t</agent>\n";
    }

    /// The plain command line, with `options` between the home and the verb.
    std::string scriptLine(const std::string& options) const {
        return path_ + "/bin/TovrinAgent  -h " + path_ + " " + options;
    }

    /// The command lines that were run.
    static Texts commandLines(const TraceCapture& trace) {
        const std::string head = "Command to run is \"";
        Texts found;
        for (const std::string& line : trace.details()) {
            if (line.compare(0, head.size(), head) != 0) continue;
            found.push_back(line.substr(head.size(), line.size() - head.size() - 1));
        }
        return found;
    }

    static void expectMessage(TaskQueueElem& task, const std::string& id,
                              const std::string& parameter) {
        task.ReturnStatus(0);
        EXPECT_EQ(trimmedField(task.getReturnResults().retmsgid), id);
        EXPECT_EQ(fieldText(task.getReturnResults().retmsgparm),
                  padded(parameter, 256).substr(0, 256));
    }

    ScriptHome home_;
    const std::string path_;
    TaskQueueElem task_;
};

TEST_F(StartStop, StartsAnAgentWithoutInstance) {
    TraceCapture trace;
    EXPECT_EQ(startAgent("ux", "", &task_), TASK_OK);
    EXPECT_EQ(commandLines(trace), Texts{scriptLine("start ux")});
    EXPECT_EQ(home_.agentCalls(), Texts{"-h " + path_ + " start ux"});
    EXPECT_EQ(trace.details("zavtasks"),
              (Texts{"Attempting to [START] product code [ux] instance []",
                     "Exit with return code [0]"}));
    expectMessage(task_, "", "");
}

TEST_F(StartStop, StartsAnInstance) {
    TraceCapture trace;
    EXPECT_EQ(startAgent("ux", "inst1", &task_), TASK_OK);
    EXPECT_EQ(commandLines(trace), Texts{scriptLine("-o inst1 start ux")});
    EXPECT_EQ(trace.count('D', "Attempting to [START] product code [ux] instance [inst1]"), 1);
}

TEST_F(StartStop, StopsAnAgentWithoutInstance) {
    TraceCapture trace;
    EXPECT_EQ(stopAgent("ux", "", &task_), TASK_OK);
    EXPECT_EQ(commandLines(trace), Texts{scriptLine("-c stop ux")});
    EXPECT_EQ(
        trace.details("zavtasks"),
        (Texts{"Attempting to [STOP] product code [ux] instance []", "Exit with return code [0]"}));
}

TEST_F(StartStop, StopsAnInstance) {
    TraceCapture trace;
    EXPECT_EQ(stopAgent("ux", "inst1", &task_), TASK_OK);
    EXPECT_EQ(commandLines(trace), Texts{scriptLine("-c -o inst1 stop ux")});
    EXPECT_EQ(home_.agentCalls(), Texts{"-h " + path_ + " -c -o inst1 stop ux"});
}

TEST_F(StartStop, AnyOtherActionGetsTheFallbackVerb) {
    TraceCapture trace;
    EXPECT_EQ(startstopAgent("start", "ux", "i", &task_), TASK_OK);
    EXPECT_EQ(commandLines(trace), Texts{scriptLine("-o i oh-oh-not-supported ux")});
}

TEST_F(StartStop, OnlyAStartSilencesTheAgentsTraceLog) {
    const std::string found = home_.files().path("found");
    home_.agentScript("printf '%s\\n' \"${KBB_RAS1_LOG-unset}\" >>'" + found + "'");
    ::setenv("KBB_RAS1_LOG", "/dev/null", 1);
    EXPECT_EQ(startAgent("ux", "", nullptr), TASK_OK);
    EXPECT_EQ(stopAgent("ux", "", nullptr), TASK_OK);
    EXPECT_STREQ(::getenv("KBB_RAS1_LOG"), "/dev/null");
    ::unsetenv("KBB_RAS1_LOG");
    EXPECT_EQ(home_.files().read("found"), "\n/dev/null\n");
}

TEST_F(StartStop, TheScriptHasNothingToRead) {
    home_.agentScript("cat >'" + home_.files().path("input") + "'");
    EXPECT_EQ(startAgent("ux", "", nullptr), TASK_OK);
    EXPECT_EQ(stopAgent("ux", "", nullptr), TASK_OK);
    EXPECT_EQ(home_.files().read("input"), "");
}

TEST_F(StartStop, AnAgentThatKeepsTheScriptsOutputIsWaitedForToTheTimeout) {
    home_.agentScript("(n=0; until [ -e '" + home_.files().path("release") +
                      "' ] || [ $n -gt 600 ]; do n=$((n + 1)); sleep 0.05; done) &");
    const ScopedEnv timeout("TIMEOUT", "1");
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(startAgent("ux", "", &task_), TASK_OK);
    EXPECT_GE(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(900));
    expectMessage(task_, "", "");
    home_.files().write("release", "");
}

TEST_F(StartStop, AScriptThatFailsIs1024WithTheCommandLine) {
    home_.agentScript("exit 3");
    TraceCapture trace;
    EXPECT_EQ(startAgent("ux", "inst1", &task_), TASK_START_STOP_FAILED);
    const std::string line = scriptLine("-o inst1 start ux");
    EXPECT_EQ(trace.errors("zavtasks"),
              Texts{"ZAV1024E Bad return code from start/stop command [" + line + "]"});
    EXPECT_EQ(trace.count('D', "Exit with return code [1024]"), 1);
    expectMessage(task_, "ZAV1024E", line);
}

TEST_F(StartStop, AScriptThatCannotRunIs1025WithTheCommandLine) {
    ::unlink((path_ + "/bin/TovrinAgent").c_str());
    TraceCapture trace;
    EXPECT_EQ(stopAgent("ux", "", &task_), TASK_START_STOP_NOT_STARTED);
    const std::string line = scriptLine("-c stop ux");
    EXPECT_EQ(trace.errors("zavtasks"), Texts{"ZAV1025E Failed to start command [" + line + "]"});
    EXPECT_EQ(trace.count('D', "Exit with return code [1025]"), 1);
    expectMessage(task_, "ZAV1025E", line);
}

TEST_F(StartStop, WithoutATaskFailuresAreOnlyTraced) {
    home_.agentScript("exit 3");
    TraceCapture trace;
    EXPECT_EQ(startAgent("ux", "", nullptr), TASK_START_STOP_FAILED);
    EXPECT_EQ(trace.errors("zavtasks"), Texts{"ZAV1024E Bad return code from start/stop command [" +
                                              scriptLine("start ux") + "]"});
}

// ---- Restart ------------------------------------------------------------------------------------

TEST_F(StartStop, ARestartStopsAndStarts) {
    TraceCapture trace;
    EXPECT_EQ(restartAgent("ux", "inst1", &task_), TASK_OK);
    EXPECT_EQ(commandLines(trace),
              (Texts{scriptLine("-c -o inst1 stop ux"), scriptLine("-o inst1 start ux")}));
    expectMessage(task_, "", "");
}

TEST_F(StartStop, ARestartStartsEvenWhenTheStopFails) {
    home_.agentScript("[ $verb = start ]");
    EXPECT_EQ(restartAgent("ux", "", &task_), TASK_OK);
    EXPECT_EQ(home_.agentCalls().size(), 2u);
    expectMessage(task_, "ZAV1024E", scriptLine("-c stop ux"));
}

TEST_F(StartStop, ARestartHasTheOutcomeOfItsStart) {
    home_.agentScript("[ $verb = stop ]");
    EXPECT_EQ(restartAgent("ux", "", &task_), TASK_START_STOP_FAILED);
    expectMessage(task_, "ZAV1024E", scriptLine("start ux"));
}

TEST_F(StartStop, ARestartMayFailTwice) {
    home_.agentScript("exit 1");
    TraceCapture trace;
    EXPECT_EQ(restartAgent("ux", "", &task_), TASK_START_STOP_FAILED);
    EXPECT_EQ(trace.errors("zavtasks").size(), 2u);
    expectMessage(task_, "ZAV1024E", scriptLine("start ux"));
}

// ---- Other users --------------------------------------------------------------------------------

TEST_F(StartStop, ARecordedUserRunsTheCommand) {
    runAs(agentEntry("ux", "inst1", "no-such-user"));
    TraceCapture trace;
    const std::string line =
        "/bin/su - no-such-user -c \"" + scriptLine("-o inst1 start ux") + "\"";
    EXPECT_EQ(startAgent("ux", "inst1", &task_), TASK_START_STOP_FAILED);
    EXPECT_EQ(commandLines(trace), Texts{line});
    EXPECT_EQ(home_.agentCalls(), Texts{});
    expectMessage(task_, "ZAV1024E", line);
}

TEST_F(StartStop, AUserMayBeRecordedForNoInstance) {
    runAs(agentEntry("ux", "", "no-such-user"));
    TraceCapture trace;
    stopAgent("ux", "", nullptr);
    EXPECT_EQ(commandLines(trace),
              Texts{"/bin/su - no-such-user -c \"" + scriptLine("-c stop ux") + "\""});
}

TEST_F(StartStop, TheUsersLoginShellGetsTheWholeCommand) {
    if (::geteuid() != 0) GTEST_SKIP() << "only root may become root without a password";
    runAs(agentEntry("ux", "inst1", "root"));
    EXPECT_EQ(startAgent("ux", "inst1", &task_), TASK_OK);
    EXPECT_EQ(home_.agentCalls(), Texts{"-h " + path_ + " -o inst1 start ux"});
}

TEST_F(StartStop, AnEmptyUserLeavesTheCommandAsItIs) {
    runAs(agentEntry("ux", "inst1", ""));
    TraceCapture trace;
    EXPECT_EQ(startAgent("ux", "inst1", &task_), TASK_OK);
    EXPECT_EQ(commandLines(trace), Texts{scriptLine("-o inst1 start ux")});
}

TEST_F(StartStop, OtherProductsAndInstancesDoNotCount) {
    runAs(agentEntry("oq", "inst1", "no-such-user") + agentEntry("ux", "inst2", "no-such-user"));
    TraceCapture trace;
    EXPECT_EQ(startAgent("ux", "inst1", &task_), TASK_OK);
    EXPECT_EQ(commandLines(trace), Texts{scriptLine("-o inst1 start ux")});
}

TEST_F(StartStop, ABrokenDatabaseIsAnEmptyOne) {
    runAs("<agent><productCode>ux");
    TraceCapture trace;
    EXPECT_EQ(startAgent("ux", "inst1", &task_), TASK_OK);
    EXPECT_EQ(commandLines(trace), Texts{scriptLine("-o inst1 start ux")});
}

TEST_F(StartStop, TheDatabaseIsReadAnewEachTime) {
    EXPECT_EQ(startAgent("ux", "", nullptr), TASK_OK);
    runAs(agentEntry("ux", "", "no-such-user"));
    EXPECT_EQ(startAgent("ux", "", nullptr), TASK_START_STOP_FAILED);
    const std::string host = static_cast<const char*>(ZAV::Util::getHostName().c_str());
    TraceCapture trace;
    startAgent("ux", "", nullptr);
    EXPECT_EQ(trace.count('D', "Parsing file: " + path_ + "/config/" + host + "_zavrunas.cfg"), 1);
}

}  // namespace

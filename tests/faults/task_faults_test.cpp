// What requests end in when the system refuses what their commands take: return code, message id,
// parameter and trace.
#include <gmock/gmock.h>

#include <cerrno>
#include <new>
#include <stdexcept>

#include "faults/scenario.h"
#include "support/fake_sleep.h"
#include "support/host/script_home.h"
#include "support/row_text.h"
#include "support/scoped_env.h"
#include "tables/table_request.h"
#include "tasks/agent_config.h"
#include "tasks/home.h"
#include "tasks/install.h"
#include "tasks/zavtasks.h"
#include "util/zavutil.h"

using namespace faults;
using ZAV::String;
using ZAV::Util;

namespace {

/// Where a command that is run can be refused its start, and how that is traced.
struct Refusal {
    Call call;
    int error;
    const char* text;
};
constexpr Refusal kRefusals[] = {
    {Call::kPipe2, EMFILE, "failed to create stdout pipe"},
    {Call::kVfork, EAGAIN, "failed to fork child process"},
};

class TaskFaults : public testing::Test {
protected:
    TaskFaults() {
        ZAV_TOVRINHOME = home_.c_str();
        Util::_homeDir.clear();
        Util::_configDir.clear();
        files_.files().makeDir("depot");
        depotDir = files_.depot().c_str();
    }
    ~TaskFaults() override { ZAV_TOVRINHOME = nullptr; }

    static TaskQueueElem task(const char* command, const std::string& context = "",
                              const char* optional = "") {
        TaskQueueElem made;
        made.setTransid("T1");
        made.setCommand(command);
        made.setProduct("ux");
        made.setVersion("7");
        made.setContext(context.c_str());
        made.setOptional(optional);
        return made;
    }
    static std::string endOf(TaskQueueElem& task, TASK_RC rc) {
        task.ReturnStatus(rc);
        const zav_kagreqt_data_t row = task.getReturnResults();
        return std::to_string(rc) + " " + trimmedField(row.retmsgid) + " " +
               trimmedField(row.retmsgparm);
    }
    static Scenario queued(const TaskQueueElem& request) {
        const auto run = [=] {
            TaskQueueElem task = request;
            return endOf(task, processAsyncTask(task));
        };
        return Scenario([] {}, run, {"0  ", {}});
    }
    /// The lines that say that a command line did not start.
    static std::vector<std::string> notStarted(const Refusal& refusal, const std::string& command,
                                               const std::string& outcome) {
        return {refusal.text, "Failed to start process for cmd " + command, outcome};
    }

    ScriptHome files_;
    const std::string home_ = files_.path();
    ScopedEnv homeVariable_{"TOVRINHOME", home_};
};

TEST_F(TaskFaults, AnInstallThatCannotStartIs1030) {
    Scenario scenario = queued(task("INSTALL", "/bin/echo x"));
    for (const Refusal& refusal : kRefusals) {
        EXPECT_EQ(scenario.endWith(refusal.call, 1, refusal.error),
                  (End{"1030 ZAV1030E /bin/echo x",
                       notStarted(refusal, "/bin/echo x",
                                  "ZAV1030E Failed to start install command [/bin/echo x]")}))
            << refusal.text;
    }
}

TEST_F(TaskFaults, AnInstallWhoseChildHasNoStreamsIs1031) {
    const End end = queued(task("INSTALL", "/bin/echo x")).endWith(Call::kDup2, 1, EBUSY);
    EXPECT_EQ(end.result, "1031 ZAV1031E /bin/echo x,1");
    EXPECT_EQ(end.errors.front(), "error on dup2 for stdout");
    EXPECT_EQ(end.errors.back(), "ZAV1031E Bad return code [1] from install command [/bin/echo x]");
}

TEST_F(TaskFaults, ACommandThatCannotBeExecutedEndsLikeOneThatSucceeds) {
    EXPECT_EQ(queued(task("INSTALL", "/bin/echo x")).endWith(Call::kExecve, 1, ENOMEM),
              (End{"0  ", {"Unable to launch the executable, rc=-1"}}));
}

TEST_F(TaskFaults, AWrapperScriptThatCannotBeWrittenFailsInTheShell) {
    files_.products({"ux"}, "exit 0");
    const TaskQueueElem request = task("INSTALL", "/bin/echo x", "REQUIRES_RESTART");
    const std::string script = files_.depot() + "runcmd.sh";
    Scenario scenario([=] { ::unlink(script.c_str()); },
                      [=] {
                          TaskQueueElem copy = request;
                          return endOf(copy, processAsyncTask(copy));
                      },
                      {"0  ", {}});
    const End end = scenario.endWith(Call::kFdopen, 1, ENOMEM);
    EXPECT_TRUE(scenario.happened());
    EXPECT_EQ(end.errors.front(),
              "Failed to open file " + script + " using mode \"rb\", check permissions");
}

TEST_F(TaskFaults, AStartThatCannotStartIs1025) {
    Scenario scenario = queued(task("START"));
    const std::string command = home_ + "/bin/TovrinAgent  -h " + home_ + " start ux";
    for (const Refusal& refusal : kRefusals) {
        const End end = scenario.endWith(refusal.call, 1, refusal.error);
        EXPECT_EQ(end.result, "1025 ZAV1025E " + command);
        ASSERT_GE(end.errors.size(), 2u);
        EXPECT_THAT(end.errors, testing::Contains(refusal.text));
        EXPECT_THAT(end.errors, testing::Contains("Failed to start process for cmd " + command));
    }
}

TEST_F(TaskFaults, AConfigurationThatCannotBeReadIs1009) {
    const std::string translator = files_.products({"ux"}, "echo A=1");
    const auto run = [] {
        TaskQueueElem request = task("GETCONFIG");
        return endOf(request, getConfig(request));
    };
    Scenario scenario([] {}, run, {"0  ", {}});
    // The first run only tells which of several places is preferred.
    EXPECT_EQ(scenario.endWith(Call::kVfork, 1, EAGAIN).result, "0  ");
    const End homeless = scenario.endWith(Call::kVfork, 2, EAGAIN);
    EXPECT_EQ(homeless.result, "1007 ZAV1007E GETCONFIG,ux");
    EXPECT_EQ(homeless.errors.front(), "failed to fork child process");
    const End end = scenario.endWith(Call::kVfork, 3, EAGAIN);
    EXPECT_EQ(end.result, "1009 ZAV1009E GETCONFIG,ux," + translator + " -g  -pc ux");
    ASSERT_EQ(end.errors.size(), 3u);
    EXPECT_EQ(end.errors[0], "failed to fork child process");
    EXPECT_THAT(end.errors[2], testing::StartsWith("ZAV1009E "));
    EXPECT_EQ(scenario.endWith(Call::kVfork, 4, EAGAIN), scenario.unharmed());
}

TEST_F(TaskFaults, ACompletedInstallWhoseResultCannotBeReadIs1031) {
    files_.files().write("depot/rc.txt", "0\n");
    const auto run = [] {
        TaskQueueElem request = task("COMPLETE_INSTALL");
        return endOf(request, completeInstallAfterRestart(request));
    };
    Scenario scenario([] {}, run, {"0  ", {}});
    const End failed{"1031 ZAV1031E " + files_.depot() + "rc.txt,NOTFOUND",
                     {"Unable to read rc.txt for install's return code"}};
    scenario.expectEach(Call::kOpen, EMFILE, {failed});
    scenario.expectEach(Call::kFstat, EIO, {failed, failed});
    scenario.expectEach(Call::kLseek, EIO, {failed, failed});
    scenario.expectEach(Call::kRead, EIO, {failed});
    EXPECT_FALSE(fake_sleep::slept().empty());
}

TEST_F(TaskFaults, NoExceptionReachesTheFrameworksThreads) {
    RAS1_UNIT unit{"zav01agt"};
    const ZAV::Trace trace(unit);
    TraceCapture traces("ERROR");
    EXPECT_EQ(guarded(trace, []() -> int { throw std::bad_alloc(); }), OXA_NO_MEMORY);
    EXPECT_EQ(guarded(trace, []() -> int { throw std::runtime_error("broken"); }), OXA_FAILED);
    EXPECT_EQ(guarded(trace, []() -> int { throw 42; }), OXA_FAILED);
    EXPECT_EQ(guarded(trace, [] { return OXA_OK; }), OXA_OK);
    EXPECT_THAT(traces.errors(),
                testing::ElementsAre("Exception caught: std::bad_alloc", "Exception caught: broken",
                                     "Exception caught: an exception without a text"));
}

}  // namespace

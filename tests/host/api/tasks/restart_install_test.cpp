#include "host/api/tasks/restart_install.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <optional>

#include "host/made_up_table.h"
#include "support/scratch_dir.h"

namespace {

using host::Task;
using host::TaskState;

/// An install that had begun when the last run of the host ended, and its depot.
class RestartInstall : public testing::Test {
protected:
    RestartInstall() {
        services.emplace(std::vector<oxa::Table>{}, host::CodePage("UTF-8"), scratch.path("home"),
                         host::RowQueue::Limits{}, true, host::Places{scratch.path(), ""});
        begun.begun = true;
        begun.state = TaskState::Running;
    }

    const ScratchDir scratch;
    std::optional<host::Services> services;
    Task begun;
};

TEST_F(RestartInstall, WithoutAResultWasInterrupted) {
    const Task task = host::endOfRestartInstall(*services, begun);
    EXPECT_EQ(task.state, TaskState::Interrupted);
    EXPECT_NE(task.reason, "");
    EXPECT_TRUE(task.ended.has_value());
}

TEST_F(RestartInstall, IsInterruptedByANewStartOfTheMachineToo) {
    host::Journal::Settings kept;
    kept.directory = scratch.path("state");
    kept.boot = "one";
    {
        host::Journal before(kept);
        before.enter(begun);
        begun.run = before.run();
        before.save(begun);
    }
    kept.boot = "two";
    host::Services later(std::vector<oxa::Table>{}, host::CodePage("UTF-8"), scratch.path("home"),
                         host::RowQueue::Limits{}, true, host::Places{scratch.path(), ""}, kept);
    EXPECT_EQ(later.journal.recovered().begun, begun.id);
    const Task task = host::endOfRestartInstall(later, begun);
    EXPECT_EQ(task.state, TaskState::Interrupted);
    EXPECT_NE(task.reason.find("the machine was started anew"), std::string::npos) << task.reason;
}

TEST_F(RestartInstall, WithAResultThatIsNoNumberHasFailed) {
    for (const char* text : {"", "killed\n"}) {
        scratch.write("rc.txt", text);
        const Task task = host::endOfRestartInstall(*services, begun);
        EXPECT_EQ(task.state, TaskState::Failed) << text;
        EXPECT_NE(task.reason.find("rc.txt"), std::string::npos) << task.reason;
    }
}

TEST_F(RestartInstall, ThatWasToBeCancelledIs) {
    begun.cancel = true;
    EXPECT_EQ(host::endOfRestartInstall(*services, begun).state, TaskState::Cancelled);
}

TEST_F(RestartInstall, DoesNotBeginBesideTheResultOfAnEarlierOne) {
    scratch.write("rc.txt", "0\n");
    EXPECT_EQ(host::forgetOlderResult(*services), "");
    EXPECT_FALSE(scratch.exists("rc.txt"));
    ASSERT_EQ(::mkdir(scratch.path("rc.txt").c_str(), 0700), 0);
    EXPECT_NE(host::forgetOlderResult(*services).find("rc.txt"), std::string::npos);
}

}  // namespace

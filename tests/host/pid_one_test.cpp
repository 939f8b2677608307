// ctest-label: threaded
// The host as the first process of a container: it reaps what nobody else does, and signals reach
// it.
#include <gtest/gtest.h>
#include <signal.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "support/host/program.h"
#include "support/host/starter_home.h"

namespace {

using std::chrono::seconds;

std::vector<pid_t> childrenOf(pid_t process) {
    std::vector<pid_t> children;
    std::error_code gone;
    const std::string tasks = "/proc/" + std::to_string(process) + "/task";
    for (const auto& thread : std::filesystem::directory_iterator(tasks, gone)) {
        std::ifstream list(thread.path() / "children");
        for (pid_t child = 0; list >> child;)
            children.push_back(child);
    }
    return children;
}

class PidOne : public testing::Test {
protected:
    void SetUp() override {
        const std::vector<std::string> alone = {"/usr/bin/unshare", "--pid", "--fork",
                                                "--mount-proc"};
        std::vector<std::string> probe = alone;
        probe.emplace_back("/bin/true");
        if (runProgram(probe).status != 0) GTEST_SKIP() << "no process numbers of its own here";
        std::vector<std::string> command = alone;
        command.insert(command.end(), {"--kill-child", ZAV_BUILD_DIR "/bin/zavhost", "--home",
                                       home.path(), "--socket", scratch.path("s")});
        container = std::make_unique<Program>(command, "", home.environment());
        ASSERT_TRUE(container->awaitOutput("ready: ", seconds(30))) << container->err();
    }
    ProgramResult zavctl(std::vector<std::string> words) const {
        words.insert(words.begin(), {ZAV_BUILD_DIR "/bin/zavctl", "--socket", scratch.path("s")});
        return runProgram(words);
    }
    /// The host's number outside.
    pid_t host() const {
        const std::vector<pid_t> children = childrenOf(container->pid());
        return children.size() == 1 ? children.front() : 0;
    }

    StarterHome home{"ux"};
    ScratchDir scratch;
    std::unique_ptr<Program> container;
};

TEST_F(PidOne, ReapsWhatLosesItsParent) {
    const std::string installer =
        scratch.script("installer", "for i in 1 2 3 4 5; do (setsid sleep 0.$i &) ; done; exit 0");
    const ProgramResult installed =
        zavctl({"install", "ux", "060100000", "--no-verify", "--", installer});
    EXPECT_EQ(installed.status, 0) << installed.out << installed.err;
    EXPECT_TRUE(eventually([this] { return childrenOf(host()).empty(); }))
        << "processes that have ended are still there";
    EXPECT_TRUE(container->running());
}

TEST_F(PidOne, LosesNoExitCodeOfACommand) {
    const std::string installer = scratch.script("installer", "(exit 1) & (exit 2) & exit 7");
    const ProgramResult installed =
        zavctl({"install", "ux", "060100000", "--no-verify", "--", installer});
    EXPECT_EQ(installed.status, 1);
    EXPECT_NE(installed.out.find("exit code 7"), std::string::npos) << installed.out;
}

TEST_F(PidOne, LetsItsAgentsEndInGoodOrderAndNotesThatTheyShouldRun) {
    const std::string said = scratch.path("said");
    const std::string agent = home.path("agtqvs6/" + home.platform() + "/ux/bin/agent");
    std::ofstream(agent, std::ios::trunc)
        << "#!/bin/sh\ntrap 'echo ended >" << said << "; exit 0' TERM\n: >" << said
        << "\nwhile :; do sleep 0.1; done\n";
    ASSERT_EQ(zavctl({"start", "ux"}).status, 0);
    ASSERT_TRUE(eventually([&] { return scratch.exists("said"); }));
    ASSERT_EQ(::kill(host(), SIGTERM), 0);
    EXPECT_EQ(container->wait(seconds(60)).status, 0);
    EXPECT_EQ(scratch.read("said"), "ended\n");
    EXPECT_TRUE(home.runs("ux")) << "its pid file is there";
}

TEST_F(PidOne, WaitsSomeSecondsOnlyForWhatDoesNotEnd) {
    const std::string installer = scratch.script(
        "installer", "setsid sh -c 'trap \"\" TERM; : >" + scratch.path("stays") +
                         "; while :; do sleep 1; done' </dev/null >/dev/null 2>&1 &");
    EXPECT_EQ(zavctl({"install", "ux", "060100000", "--no-verify", "--", installer}).status, 0);
    ASSERT_TRUE(eventually([&] { return scratch.exists("stays"); }));
    ASSERT_EQ(::kill(host(), SIGTERM), 0);
    const ProgramResult ended = container->wait(seconds(60));
    EXPECT_EQ(ended.status, 0);
    EXPECT_NE(ended.err.find(" processes have not ended within 10 s and are killed"),
              std::string::npos)
        << ended.err;
}

TEST_F(PidOne, EndsInGoodOrderWhenToldTo) {
    ASSERT_GT(host(), 1);
    ASSERT_EQ(::kill(host(), SIGTERM), 0);
    EXPECT_EQ(container->wait(seconds(60)).status, 0);
    EXPECT_FALSE(std::filesystem::exists(scratch.path("s")));
}

}  // namespace

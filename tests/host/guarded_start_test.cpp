// ctest-label: threaded
// What a guarded host looks at before it starts, on a home of the starter home's and with the real
// plug-in; and that an unguarded one does not.
#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <vector>

#include "host/raw_client.h"
#include "support/host/program.h"
#include "support/host/starter_home.h"

namespace {

using std::chrono::seconds;

class GuardedStart : public testing::Test {
protected:
    std::vector<std::string> command(const std::string& socket,
                                     const std::vector<std::string>& more = {}) const {
        std::vector<std::string> argv = {ZAV_BUILD_DIR "/bin/zavhost", "--home", home.path(),
                                         "--socket", scratch.path(socket)};
        argv.insert(argv.end(), more.begin(), more.end());
        return argv;
    }
    std::unique_ptr<Program> start(const std::string& socket,
                                   const std::vector<std::string>& more = {},
                                   const Environment& environment = {}) const {
        return std::make_unique<Program>(command(socket, more), "", environment);
    }
    bool isReady(Program& program, const std::string& socket) const {
        return program.awaitOutput("ready: " + scratch.path(socket), seconds(30));
    }
    ProgramResult refused(const std::vector<std::string>& more = {},
                          const Environment& environment = {}) const {
        return runProgram(command("refused", more), "", environment);
    }

    StarterHome home{"ux"};
    ScratchDir scratch;
};

TEST_F(GuardedStart, ASecondHostOnTheHomeIsRefusedWithTheFirstOnesProcess) {
    const auto first = start("first");
    ASSERT_TRUE(isReady(*first, "first")) << first->err();
    const ProgramResult second = refused();
    EXPECT_EQ(second.status, 1);
    EXPECT_EQ(second.err, "zavhost: home " + home.path() +
                              " is in use by the host with process id " +
                              std::to_string(first->pid()) + "\n");
    first->signal(SIGKILL);
    first->wait();
    const auto third = start("first");
    EXPECT_TRUE(isReady(*third, "first")) << third->err();
}

TEST_F(GuardedStart, UnguardedHostsMayShareAHome) {
    const auto first = start("first");
    ASSERT_TRUE(isReady(*first, "first")) << first->err();
    const auto second = start("second", {"--unguarded"});
    EXPECT_TRUE(isReady(*second, "second")) << second->err();
    const auto third = start("third", {"--unguarded"});
    EXPECT_TRUE(isReady(*third, "third")) << third->err();
}

TEST_F(GuardedStart, OfManyAtOnceExactlyOneServesTheHome) {
    std::vector<std::unique_ptr<Program>> programs;
    for (int i = 0; i < 6; ++i)
        programs.push_back(start("s" + std::to_string(i)));
    const auto running = [&] {
        return std::count_if(programs.begin(), programs.end(),
                             [](const auto& program) { return program->running(); });
    };
    EXPECT_TRUE(eventually([&] { return running() == 1; }));
    const auto owner = std::find_if(programs.begin(), programs.end(),
                                    [](const auto& program) { return program->running(); });
    ASSERT_NE(owner, programs.end());
    EXPECT_TRUE((*owner)->awaitOutput("ready: ", seconds(30))) << (*owner)->err();
    for (const auto& program : programs) {
        if (program == *owner) continue;
        EXPECT_EQ(program->wait().status, 1);
        EXPECT_NE(program->err().find("is in use by the host with process id " +
                                      std::to_string((*owner)->pid())),
                  std::string::npos)
            << program->err();
    }
}

TEST_F(GuardedStart, ATimeOutThatIsNoNumberIsRefused) {
    const ProgramResult result = refused({}, {{"TIMEOUT", "five"}});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err,
              "zavhost: TIMEOUT takes a number of seconds from 1 to 2147483646, not \"five\"\n");
    const auto corrected = start("s", {"--task-timeout", "20"}, {{"TIMEOUT", "five"}});
    EXPECT_TRUE(isReady(*corrected, "s")) << corrected->err();
}

TEST_F(GuardedStart, AnUnguardedHostStartsWithSuchATimeOut) {
    const auto program = start("s", {"--unguarded"}, {{"TIMEOUT", "five"}});
    EXPECT_TRUE(isReady(*program, "s")) << program->err();
}

}  // namespace

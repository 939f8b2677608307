// A command whose calls of the system fail one after the other.
#include <gmock/gmock.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>

#include "faults/scenario.h"
#include "support/process/left_running.h"
#include "support/scoped_env.h"
#include "util/zavutil.h"

using namespace faults;
using ZAV::String;
using ZAV::Util;

namespace {

using Texts = std::vector<std::string>;

class CommandFaults : public testing::Test {
protected:
    Scenario scenario(const std::string& command, const std::string& input,
                      const std::string& output) {
        return Scenario([] {}, [=] { return run(command, input, false); },
                        {"true 0 [" + output + "] []", {}});
    }
    static std::string run(const std::string& command, const std::string& input, bool nonBlocking) {
        int rc = -99;
        String out = "untouched";
        String err = "untouched";
        const bool ran =
            Util::runCommand(command.c_str(), rc, out, err, input.c_str(), nonBlocking);
        return std::string(ran ? "true " : "false ") + std::to_string(rc) + " [" + narrow(out) +
               "] [" + narrow(err) + "]";
    }
    static End notStarted(const std::string& reason) {
        return {"false -99 [untouched] [untouched]",
                {reason, "Failed to start process for cmd /bin/echo x"}};
    }
    static End endedWith(int code, Texts errors) {
        errors.push_back("Bad return code (" + std::to_string(code) +
                         ") from command \"/bin/echo x\"");
        errors.push_back("STDOUT [0 characters] is: ");
        errors.push_back("STDERR [0 characters] is: ");
        return {"true " + std::to_string(code) + " [] []", errors};
    }

    Scenario echo_ = scenario("/bin/echo x", "", "x\n");
};

TEST_F(CommandFaults, Pipes) {
    const std::vector<End> ends = {notStarted("failed to create stdout pipe"),
                                   notStarted("failed to create stderr pipe"),
                                   notStarted("failed to create stdin pipe")};
    for (const int error : {EMFILE, ENFILE})
        echo_.expectEach(Call::kPipe2, error, ends);
}

TEST_F(CommandFaults, Fork) {
    for (const int error : {EAGAIN, ENOMEM})
        echo_.expectEach(Call::kVfork, error, {notStarted("failed to fork child process")});
}

TEST_F(CommandFaults, ExecutableTest) {
    echo_.expectEach(Call::kAccess, EACCES, {notStarted("Unable to execute command: /bin/echo")});
}

TEST_F(CommandFaults, StreamsOfTheChild) {
    echo_.expectEach(
        Call::kDup2, EBUSY,
        {endedWith(1, {"error on dup2 for stdout"}), endedWith(1, {"error on dup2 for stderr"}),
         endedWith(1, {"error on dup2 for stdin"})});
}

TEST_F(CommandFaults, Exec) {
    for (const int error : {ENOENT, EACCES, ENOMEM, E2BIG, ETXTBSY}) {
        echo_.expectEach(Call::kExecve, error,
                         {{"true 0 [] []", {"Unable to launch the executable, rc=-1"}}});
    }
}

TEST_F(CommandFaults, ReadingOutputEndsLikeTheEndOfTheFile) {
    echo_.expectAll(Call::kRead, EIO, {echo_.unharmed(), {"true 0 [] []", {}}});
}

TEST_F(CommandFaults, WritingInputLeavesTheChildWithLess) {
    scenario("/bin/cat", "text", "text").expectEach(Call::kWrite, EIO, {{"true 0 [] []", {}}});
}

TEST_F(CommandFaults, ClosesAndHandlesDoNotMatter) {
    echo_.expectAll(Call::kClose, EIO, {echo_.unharmed()});
    // Its outputs end before it does, so that it is waited for.
    scenario("/bin/sh -c \"exec >&- 2>&-; sleep 1\"", "", "")
        .expectEach(Call::kPidfdOpen, EMFILE, {{"true 0 [] []", {}}});
}

TEST_F(CommandFaults, PollThatFailsIsRepeated) {
    for (const int error : {ENOMEM, EINVAL})
        echo_.expectAll(Call::kPoll, error, {echo_.unharmed()});
}

TEST_F(CommandFaults, PollThatKeepsFailingEndsAtTheTimeout) {
    const ScopedEnv timeout("TIMEOUT", "1");
    const End end = echo_.endWith(Call::kPoll, 1, ENOMEM, Fault::Lasts::kOnwards);
    EXPECT_TRUE(echo_.happened());
    EXPECT_EQ(end.result, "false 0 [] []");
    ASSERT_FALSE(end.errors.empty());
    EXPECT_EQ(end.errors.back(), "Failed to wait on process");
}

TEST_F(CommandFaults, OutputThatCannotBeSwitchedStillEndsAtTheTimeout) {
    const ScopedEnv timeout("TIMEOUT", "3");
    LeftRunning grandchild;  // keeps the output open
    const std::string command = "/bin/sh -c \"" + grandchild.command() + " # TovrinAgent\"";
    {
        const Fault fault(Call::kFcntl, 1, EBADF, Fault::Lasts::kOnwards);
        run(command.c_str(), "", true);
        EXPECT_TRUE(fault.happened());
    }
    EXPECT_TRUE(grandchild.isRunning());
}

TEST_F(CommandFaults, AChildThatSomebodyElseReaped) {
    TraceCapture traces("ERROR");
    std::string result;
    {
        const Fault fault(Call::kWaitpid, 1, ECHILD);
        result = run("/bin/echo x", "", false);
        EXPECT_TRUE(fault.happened());
    }
    EXPECT_EQ(result, "true 0 [x\n] []");
    EXPECT_THAT(traces.errors(),
                testing::ElementsAre("Error occurred. ERRNO:10 No child processes"));
    EXPECT_GT(::waitpid(-1, nullptr, 0), 0);  // there was nobody else
}

TEST_F(CommandFaults, WithoutASearchPathTheCommandRunsAllTheSame) {
    const ScopedEnv path("PATH", nullptr);
    EXPECT_EQ(echo_.runOnce(), echo_.unharmed());
}

TEST_F(CommandFaults, TheServersNameCannotBeFoundWithoutACommand) {
    const auto run = [] {
        String dir = "/nowhere/";
        return std::to_string(Util::getDepotHome(dir, false, false));
    };
    Scenario scenario([] {}, run, {"2", {}});
    for (const Call call : {Call::kPipe2, Call::kVfork}) {
        const End end = scenario.endWith(call, 1, EAGAIN);
        EXPECT_EQ(end.result, "2");
        EXPECT_EQ(end.errors.back(), "Unable to determine CMS name, process failed to start");
    }
}

TEST_F(CommandFaults, Memory) {
    if (!kMemoryIsOurs) GTEST_SKIP() << "the sanitizer owns malloc";
    echo_.expectEach(Call::kCalloc, ENOMEM, {notStarted("creating argument array")});
    // The first is for the user's token, which nothing needs.
    echo_.expectEach(Call::kMalloc, ENOMEM,
                     {echo_.unharmed(), notStarted("creating argument array"),
                      notStarted("creating argument array")});
}

}  // namespace

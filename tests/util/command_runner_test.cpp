#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <set>

#include "support/clock.h"
#include "support/host/program.h"
#include "support/process/child_role.h"
#include "support/process/left_running.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

using namespace ZAV;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

namespace {

struct Outcome {
    bool ran = false;
    int rc = -99;
    String out = "untouched";
    String err = "untouched";

    std::string text() const { return static_cast<const char*>(out.c_str()); }
    std::string errText() const { return static_cast<const char*>(err.c_str()); }
};

Outcome run(const std::string& command, const String& input = String(), bool nonBlocking = false) {
    Outcome outcome;
    outcome.ran = Util::runCommand(String(command.c_str()), outcome.rc, outcome.out, outcome.err,
                                   input, nonBlocking);
    return outcome;
}

class CommandRunner : public testing::Test {
protected:
    void TearDown() override {
        ::unsetenv("TIMEOUT");
        EXPECT_EQ(child_role::openDescriptors(), descriptors_);
        EXPECT_TRUE(::waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD);
    }
    void limit(const char* seconds) { ::setenv("TIMEOUT", seconds, 1); }

private:
    std::set<int> descriptors_ = child_role::openDescriptors();
};

/// The error lines of a run that was killed, without process ids.
std::vector<std::string> withoutNumbers(std::vector<std::string> texts) {
    for (std::string& text : texts)
        text.erase(text.find_last_not_of("0123456789-") + 1);
    return texts;
}

const auto kKilled =
    ElementsAre("Terminating process group ", "Terminating process ", "Failed to wait on process");

}  // namespace

TEST_F(CommandRunner, HandsBackOutputAndExitCode) {
    TraceCapture traces;
    const Outcome outcome = run("/bin/sh -c 'echo out; echo err >&2'");
    EXPECT_TRUE(outcome.ran);
    EXPECT_EQ(outcome.rc, 0);
    EXPECT_EQ(outcome.text(), "out\n");
    EXPECT_EQ(outcome.errText(), "err\n");
    EXPECT_THAT(traces.details("zavutil"),
                ElementsAre("Command to run is \"/bin/sh -c 'echo out; echo err >&2'\"",
                            "outbuf: out", "errbuf: err",
                            "Return code (0) from command \"/bin/sh -c 'echo out; echo err >&2'\"",
                            "STDOUT [4 characters] is: out", "STDERR [4 characters] is: err"));
    EXPECT_THAT(traces.errors(), IsEmpty());
}

TEST_F(CommandRunner, ABadExitCodeIsNoFailureOfTheRun) {
    TraceCapture traces;
    const Outcome outcome = run("/bin/sh -c 'exit 3'");
    EXPECT_TRUE(outcome.ran);
    EXPECT_EQ(outcome.rc, 3);
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Bad return code (3) from command \"/bin/sh -c 'exit 3'\"",
                            "STDOUT [0 characters] is: ", "STDERR [0 characters] is: "));
    EXPECT_THAT(traces.details("zavutil"),
                ElementsAre("Command to run is \"/bin/sh -c 'exit 3'\""));
}

TEST_F(CommandRunner, ACommandThatCannotBeStartedChangesNothing) {
    TraceCapture traces;
    const Outcome outcome = run("/no/such/program x");
    EXPECT_FALSE(outcome.ran);
    EXPECT_EQ(outcome.rc, -99);
    EXPECT_EQ(outcome.text(), "untouched");
    EXPECT_EQ(outcome.errText(), "untouched");
    EXPECT_THAT(traces.errors(), ElementsAre("Unable to execute command: /no/such/program",
                                             "Failed to start process for cmd /no/such/program x"));
}

TEST_F(CommandRunner, ACommandThatCannotBeExecutedEndsWithZero) {
    TraceCapture traces;
    const ScratchDir scratch;
    const Outcome outcome = run(scratch.path());
    EXPECT_TRUE(outcome.ran);
    EXPECT_EQ(outcome.rc, 0);
    EXPECT_EQ(outcome.text(), "");
    EXPECT_EQ(traces.count('E', "Unable to launch the executable, rc=-1"), 1);
}

TEST_F(CommandRunner, EnvironmentEntriesReachTheChild) {
    char first[] = "ZAV_TEST_FIRST=1 and more";
    char second[] = "ZAV_TEST_SECOND=2";
    char* env[] = {first, second, nullptr};
    Outcome outcome;
    EXPECT_TRUE(Util::runCommandEnv("/bin/sh -c 'echo $ZAV_TEST_FIRST $ZAV_TEST_SECOND'", env,
                                    outcome.rc, outcome.out, outcome.err, String(), false));
    EXPECT_EQ(outcome.text(), "1 and more 2\n");
    char* none[] = {nullptr};
    EXPECT_TRUE(Util::runCommandEnv("/bin/echo x", none, outcome.rc, outcome.out, outcome.err,
                                    String(), false));
    EXPECT_EQ(outcome.text(), "x\n");
}

TEST_F(CommandRunner, AChildWithoutInputSeesTheEndAtOnce) {
    const Outcome outcome = run("/bin/cat");
    EXPECT_TRUE(outcome.ran);
    EXPECT_EQ(outcome.text(), "");
}

TEST_F(CommandRunner, InputReachesTheChild) {
    EXPECT_EQ(run("/bin/cat", "a line\nand another").text(), "a line\nand another");
}

TEST_F(CommandRunner, InputLargerThanThePipesPassesThroughAChildThatWritesAsItReads) {
    limit("20");
    std::string input;
    while (input.size() < 1000 * 1000)
        input += std::to_string(input.size()) + "\n";
    const Outcome outcome = run("/bin/cat", String(input.c_str()));
    EXPECT_TRUE(outcome.ran);
    EXPECT_TRUE(outcome.text() == input);
}

TEST_F(CommandRunner, AChildThatDoesNotReadItsInputIsNoFailure) {
    limit("20");
    const String input(std::string(300 * 1000, 'x').c_str());
    for (int i = 0; i < 5; ++i) {
        const Outcome outcome = run("/bin/sh -c 'exec <&-; echo done; exit 2'", input);
        EXPECT_TRUE(outcome.ran);
        EXPECT_EQ(outcome.rc, 2);
        EXPECT_EQ(outcome.text(), "done\n");
    }
}

TEST_F(CommandRunner, AChildThatNeverTakesItsInputIsKilledAtTheTimeout) {
    limit("10");
    TraceCapture traces;
    const Outcome outcome =
        run("/bin/sh -c 'echo early; exec sleep 60'", String(std::string(300 * 1000, 'x').c_str()));
    EXPECT_FALSE(outcome.ran);
    EXPECT_EQ(outcome.text(), "early\n");
    EXPECT_THAT(withoutNumbers(traces.errors()), kKilled);
}

TEST_F(CommandRunner, LargeOutputIsCollectedWhole) {
    const Outcome outcome = run("/bin/sh -c 'seq 1 100000; seq 1 3000 >&2'");
    std::string expected;
    for (int i = 1; i <= 100000; ++i)
        expected += std::to_string(i) + "\n";
    EXPECT_TRUE(outcome.text() == expected);
    EXPECT_EQ(outcome.err.length(), 13893u);
}

TEST_F(CommandRunner, OutputIsTracedAndCollectedInChunks) {
    TraceCapture traces("ERROR (UNIT:zavutil DETAIL)");
    const ScratchDir scratch;
    const Outcome outcome = run(scratch.script("write", "head -c 40000 /dev/zero | tr '\\0' x\n"));
    EXPECT_EQ(outcome.out.length(), 40000u);
    std::size_t traced = 0;
    for (const std::string& line : traces.details("zavutil")) {
        if (line.rfind("outbuf: ", 0) != 0) continue;
        EXPECT_LE(line.size(), 8u + 16384u);
        traced += line.size() - 8;
    }
    EXPECT_EQ(traced, 40000u);
}

TEST_F(CommandRunner, AChunkIsATextUpToItsFirstZero) {
    const ScratchDir scratch;
    EXPECT_EQ(run(scratch.script("write", "printf 'a\\000b'\n")).text(), "a");
}

TEST_F(CommandRunner, EachChunkIsConvertedOnItsOwn) {
    const ScopedEnv locale("LC_ALL", "C.UTF-8");
    ASSERT_TRUE(String::initialize());
    const ScratchDir scratch;
    // A chunk ends between the two bytes of a character; neither byte is a character by itself.
    const std::string before(16383, 'x');
    const Outcome outcome = run("/bin/cat " + scratch.write("f", before + "\xC3\xA9z"));
    ASSERT_EQ(outcome.out.length(), 16383u + 3u);
    EXPECT_EQ(outcome.out[16383], 0xFFFD);
    EXPECT_EQ(outcome.out[16384], 0xFFFD);
    EXPECT_EQ(outcome.out[16385], 'z');
}

TEST_F(CommandRunner, OneTextForBothGetsTheOutputThenTheErrors) {
    int rc = -1;
    String both("before");
    EXPECT_TRUE(
        Util::runCommand("/bin/sh -c 'echo err >&2; echo out'", rc, both, both, String(), false));
    EXPECT_EQ(both, String("out\nerr\n"));
}

TEST_F(CommandRunner, RunsPastTheTimeoutAreKilled) {
    limit("10");
    TraceCapture traces;
    const Stopwatch watch;
    const Outcome outcome = run("/bin/sh -c 'echo begun; echo bad >&2; exec sleep 60'");
    EXPECT_FALSE(outcome.ran);
    EXPECT_GT(watch.seconds(), 9.9);
    EXPECT_EQ(outcome.rc, 0);
    EXPECT_EQ(outcome.text(), "begun\n");
    EXPECT_EQ(outcome.errText(), "");
    EXPECT_THAT(withoutNumbers(traces.errors()), kKilled);
    // Also when the time-out passed while output was read, before waiting had begun.
    EXPECT_THAT(withoutNumbers(traces.details("zavprnix")),
                testing::Contains("Waiting for process id: "));
}

TEST_F(CommandRunner, AChildThatClosedItsOutputIsKilledAtTheTimeout) {
    limit("1");
    TraceCapture traces;
    EXPECT_FALSE(run("/bin/sh -c 'exec >&- 2>&-; exec sleep 60'").ran);
    EXPECT_THAT(withoutNumbers(traces.errors()), kKilled);
}

TEST_F(CommandRunner, AnUnusableTimeoutLeavesNoTime) {
    limit("abc");
    EXPECT_FALSE(run("/bin/sleep 60").ran);
}

TEST_F(CommandRunner, OutputThatOthersKeepOpenEndsTheRunAtTheTimeout) {
    limit("10");
    TraceCapture traces;
    LeftRunning other;
    const Outcome outcome = run("/bin/sh -c '" + other.command() + " echo started'");
    EXPECT_FALSE(outcome.ran);
    EXPECT_TRUE(other.isRunning());
    EXPECT_EQ(outcome.text(), "started\n");
    EXPECT_THAT(withoutNumbers(traces.errors()), kKilled);
}

TEST_F(CommandRunner, AChildThatNeverStopsWritingIsKilled) {
    limit("1");
    EXPECT_FALSE(run("/bin/sh -c 'while :; do echo x; done'").ran);
}

TEST_F(CommandRunner, AChildBlockedOnAFullErrorPipeIsKilled) {
    limit("10");
    const Outcome outcome = run("/bin/sh -c 'echo out; head -c 200000 /dev/zero >&2'");
    EXPECT_FALSE(outcome.ran);
    EXPECT_EQ(outcome.text(), "out\n");
}

TEST_F(CommandRunner, ADateThatIsFarAwayIsFineAsATimeout) {
    limit("2000000000");
    EXPECT_EQ(run("/bin/echo x").text(), "x\n");
}

TEST_F(CommandRunner, AnAgentCommandIsReadOnceAfterItsEnd) {
    const ScratchDir scratch;
    const std::string script = scratch.script("TovrinAgent",
                                              "head -c 30000 /dev/zero | tr '\\0' x\n"
                                              "head -c 20000 /dev/zero | tr '\\0' y >&2\nexit 5\n");
    for (const bool nonBlocking : {false, true}) {
        const Outcome outcome = run(script, String(), nonBlocking);
        EXPECT_TRUE(outcome.ran);
        EXPECT_EQ(outcome.rc, 5);
        EXPECT_EQ(outcome.out.length(), 16384u);
        EXPECT_EQ(outcome.err.length(), 16384u);
    }
}

TEST_F(CommandRunner, AnAgentThatKeepsThePipesOpenHoldsNothingUpWhenReadWithoutBlocking) {
    const ScratchDir scratch;
    LeftRunning agent;
    const std::string script =
        scratch.script("TovrinAgent", "echo up\n" + agent.command() + "\nexit 0\n");
    const Outcome outcome = run(script, String(), true);
    EXPECT_TRUE(outcome.ran);
    EXPECT_TRUE(agent.isRunning());
    EXPECT_EQ(outcome.text(), "up\n");
    EXPECT_EQ(outcome.errText(), "");
}

TEST_F(CommandRunner, AnAgentThatKeepsThePipesOpenHoldsABlockingReadUpToTheTimeoutAtMost) {
    limit("10");
    TraceCapture traces;
    const ScratchDir scratch;
    LeftRunning agent;
    const std::string script =
        scratch.script("TovrinAgent", "echo up\n" + agent.command() + "\nexit 6\n");
    const Stopwatch watch;
    const Outcome outcome = run(script);
    EXPECT_TRUE(outcome.ran);
    EXPECT_TRUE(agent.isRunning());
    EXPECT_EQ(outcome.rc, 6);
    EXPECT_GT(watch.seconds(), 9.9);
    EXPECT_EQ(outcome.text(), "up\n");
    EXPECT_EQ(outcome.errText(), "");
    EXPECT_THAT(traces.errors(), Contains(StartsWith("Bad return code (6)")));
}

TEST_F(CommandRunner, AnAgentCommandThatHangsIsKilled) {
    limit("1");
    TraceCapture traces;
    const ScratchDir scratch;
    const Outcome outcome = run(scratch.script("TovrinAgent", "echo lost\nexec sleep 60\n"));
    EXPECT_FALSE(outcome.ran);
    EXPECT_EQ(outcome.text(), "");
    EXPECT_THAT(withoutNumbers(traces.errors()), kKilled);
}

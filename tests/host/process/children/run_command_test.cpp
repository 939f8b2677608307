#include "host/process/children/run_command.h"

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cerrno>
#include <csignal>

#include "support/host/program.h"
#include "support/process/child_role.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"

namespace {

using host::CommandLimits;
using host::CommandResult;
using host::runCommand;
using End = CommandResult::End;

CommandResult sh(const std::string& script, const CommandLimits& limits = {}) {
    return runCommand({"/bin/sh", "-c", script}, limits);
}

void expectNoChild() {
    errno = 0;
    EXPECT_EQ(::waitpid(-1, nullptr, WNOHANG), -1);
    EXPECT_EQ(errno, ECHILD);
}

TEST(RunCommand, CollectsBothOutputsAndTheExitCode) {
    const CommandResult result = sh("echo out; echo err >&2; exit 3");
    EXPECT_EQ(result.end, End::Exited);
    EXPECT_EQ(result.number, 3);
    EXPECT_EQ(result.out, "out\n");
    EXPECT_EQ(result.err, "err\n");
    EXPECT_FALSE(result.succeeded());
    EXPECT_EQ(endInWords(result), "ended with exit code 3");
    EXPECT_TRUE(sh("exit 0").succeeded());
    expectNoChild();
}

TEST(RunCommand, PassesArgumentsAsTheyAre) {
    EXPECT_EQ(runCommand({"/bin/sh", "-c", "printf '[%s]' \"$@\"", "sh", "a b", "", "'\"$x"}).out,
              "[a b][][\'\"$x]");
}

TEST(RunCommand, TellsASignalFromAnExitCode) {
    const CommandResult result = sh("kill -9 $$");
    EXPECT_EQ(result.end, End::Signalled);
    EXPECT_EQ(result.number, SIGKILL);
    EXPECT_EQ(endInWords(result), "was killed by signal 9");
}

TEST(RunCommand, SaysWhyAProgramCouldNotBeStarted) {
    const CommandResult absent = runCommand({"/nonexistent/program"});
    EXPECT_EQ(absent.end, End::NotStarted);
    EXPECT_EQ(absent.number, ENOENT);
    EXPECT_EQ(endInWords(absent), "could not be started: No such file or directory");
    const ScratchDir scratch;
    EXPECT_EQ(runCommand({scratch.write("plain", "text")}).number, EACCES);
    expectNoChild();
}

TEST(RunCommand, TheInputIsEmpty) {
    EXPECT_EQ(sh("cat; echo end").out, "end\n");
}

TEST(RunCommand, LargeOutputsOnBothSidesDoNotBlock) {
    const CommandResult result = sh("head -c 300000 /dev/zero >&2; head -c 300000 /dev/zero");
    EXPECT_TRUE(result.succeeded());
    EXPECT_EQ(result.out.size(), 300'000U);
    EXPECT_EQ(result.err.size(), 300'000U);
}

TEST(RunCommand, EndsWhatWritesTooMuch) {
    CommandLimits limits;
    limits.output = 10'000;
    const CommandResult result = sh("exec yes", limits);
    EXPECT_EQ(result.end, End::TooLong);
    EXPECT_EQ(result.out.size(), 10'000U);
    EXPECT_EQ(endInWords(result), "wrote too much");
    expectNoChild();
}

TEST(RunCommand, EndsWhatTakesTooLongWithItsChildren) {
    const ScratchDir scratch;
    CommandLimits limits;
    limits.time = std::chrono::seconds(10);  // enough for the shell to start its child
    const CommandResult result =
        sh("sleep 1000 & echo $! >'" + scratch.path("pid") + "'; wait", limits);
    EXPECT_EQ(result.end, End::TimedOut);
    EXPECT_EQ(endInWords(result), "did not end in time");
    const pid_t child = std::stoi(scratch.read("pid"));
    EXPECT_TRUE(eventually([&] {
        // An orphan that init has not reaped yet does no harm.
        return ::kill(child, 0) != 0 ||
               runProgram({"/bin/sh", "-c",
                           "grep -q '^State:.Z' /proc/" + std::to_string(child) + "/status"})
                       .status == 0;
    }));
    expectNoChild();
}

TEST(RunCommand, DoesNotWaitForThoseWhoKeepTheOutputsOpen) {
    const CommandResult result = sh("setsid sleep 1000 & echo $!");
    EXPECT_TRUE(result.succeeded());
    const pid_t left = std::stoi(result.out);
    EXPECT_EQ(::kill(left, SIGKILL), 0);
}

TEST(RunCommand, TheChildGetsNoneOfTheRunsOwnDescriptors) {
    const std::string role = child_role::environmentEntry("descriptors");
    const std::size_t equals = role.find('=');
    const ScopedEnv variable(role.substr(0, equals).c_str(), role.substr(equals + 1));
    std::string inherited;
    for (const int descriptor : child_role::openDescriptors(true))
        inherited += std::to_string(descriptor) + "\n";
    EXPECT_EQ(runCommand({child_role::program()}).out, inherited);
}

TEST(RunCommand, TheChildBlocksNoSignal) {
    sigset_t blocked;
    sigset_t before;
    sigfillset(&blocked);
    ::pthread_sigmask(SIG_BLOCK, &blocked, &before);
    const CommandResult result = sh("kill -TERM $$; echo survived");
    ::pthread_sigmask(SIG_SETMASK, &before, nullptr);
    EXPECT_EQ(result.end, End::Signalled);
    EXPECT_EQ(result.number, SIGTERM);
}

}  // namespace

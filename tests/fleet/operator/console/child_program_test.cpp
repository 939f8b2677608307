// ctest-label: threaded
#include "fleet/operator/console/runs/child_program.h"

#include <gtest/gtest.h>

#include <csignal>
#include <fstream>
#include <sstream>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

using fleet::ChildEnd;
using fleet::ChildProgram;

constexpr std::chrono::seconds kLong{60};
constexpr std::size_t kMuch = std::size_t{1} << 20;

fleet::ChildCommand shell(const std::string& script, const std::string& input = "") {
    return {"/bin/sh", {"sh", "-c", script}, input};
}

ChildEnd endOf(const fleet::ChildCommand& command) {
    ChildProgram child(command);
    return child.wait(kLong, kMuch);
}

bool isAlive(pid_t process) {
    return ::kill(process, 0) == 0;
}

TEST(AChildProgram, TellsItsOutputsAndItsStatus) {
    const ChildEnd end = endOf(shell("echo out; echo err >&2; exit 7"));
    EXPECT_EQ(end.kind, ChildEnd::Kind::Ended);
    EXPECT_EQ(end.status, 7);
    EXPECT_EQ(end.out, "out\n");
    EXPECT_EQ(end.err, "err\n");
    EXPECT_EQ(endOf(shell("kill -TERM $$")).status, 128 + SIGTERM);
}

TEST(AChildProgram, ReadsItsInputAndItsList) {
    fleet::ChildCommand command =
        shell("cat; cat " + std::string(fleet::kGivenPath), "the input\n");
    command.list = "the list\n";
    EXPECT_EQ(endOf(command).out, "the input\nthe list\n");
    const std::string large(3 * kMuch / 4, 'x');
    EXPECT_EQ(endOf(shell("cat", large)).out, large);
    EXPECT_EQ(endOf(shell("cat")).out, "");
}

TEST(AChildProgram, GetsItsWordsAsTheyAre) {
    const fleet::ChildCommand command{
        "/bin/sh", {"sh", "-c", "printf '%s|' \"$@\"", "sh", "a b", "$HOME", "", "*", "'"}, ""};
    EXPECT_EQ(endOf(command).out, "a b|$HOME||*|'|");
}

TEST(AChildProgram, HasNothingElseOpenAndTheUsualSignals) {
    sigset_t blocked;
    sigemptyset(&blocked);
    sigaddset(&blocked, SIGTERM);
    ::pthread_sigmask(SIG_BLOCK, &blocked, nullptr);
    std::signal(SIGPIPE, SIG_IGN);
    const ScratchDir scratch;
    std::ofstream open(scratch.path("open"));
    EXPECT_EQ(endOf(shell("ls /proc/self/fd | sort -n | head -n -1 | tr '\\n' ' '")).out, "0 1 2 ");
    EXPECT_EQ(endOf(shell("kill -TERM $$")).status, 128 + SIGTERM);
    EXPECT_EQ(endOf(shell("kill -PIPE $$")).status, 128 + SIGPIPE);
    ::pthread_sigmask(SIG_UNBLOCK, &blocked, nullptr);
}

TEST(AChildProgram, IsKilledAtTheEndOfItsTime) {
    ChildProgram child(shell("echo begun; exec sleep 600"));
    const pid_t process = child.pid();
    const ChildEnd end = child.wait(std::chrono::milliseconds(300), kMuch);
    EXPECT_EQ(end.kind, ChildEnd::Kind::TooLate);
    EXPECT_FALSE(isAlive(process));
}

TEST(AChildProgram, IsKilledWhenItWritesTooMuch) {
    ChildProgram child(shell("exec cat /dev/zero"));
    const ChildEnd end = child.wait(kLong, kMuch);
    EXPECT_EQ(end.kind, ChildEnd::Kind::TooMuch);
    EXPECT_LT(end.out.size(), 2 * kMuch);
}

TEST(AChildProgram, IsKilledWithAllThatItHasStarted) {
    const ScratchDir scratch;
    ChildProgram child(shell("sleep 600 & echo $! >" + scratch.path("helper") + "; wait"));
    ASSERT_TRUE(eventually([&] { return scratch.read("helper").find('\n') != std::string::npos; }));
    const pid_t helper = std::stoi(scratch.read("helper"));
    std::thread stopper([&] { child.stop(); });
    EXPECT_EQ(child.wait(kLong, kMuch).kind, ChildEnd::Kind::Stopped);
    stopper.join();
    EXPECT_TRUE(eventually([&] { return !isAlive(helper); }));
}

TEST(AChildProgram, IsNotWaitedForByWhatItLeavesBehind) {
    const ChildEnd end = endOf(shell("sleep 600 & echo done"));
    EXPECT_EQ(end.kind, ChildEnd::Kind::Ended);
    EXPECT_EQ(end.out, "done\n");
}

TEST(AChildProgram, LeavesNothingWhenNobodyWaits) {
    pid_t process = -1;
    {
        const ChildProgram child(shell("exec sleep 600"));
        process = child.pid();
        EXPECT_TRUE(isAlive(process));
    }
    EXPECT_FALSE(isAlive(process));
}

TEST(AChildProgram, ThatIsNotThereIsAnError) {
    EXPECT_THROW(ChildProgram({"/nowhere/program", {"program"}, ""}), std::system_error);
}

}  // namespace

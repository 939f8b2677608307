// Starting and stopping agents with TovrinAgent.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <spawn.h>
#include <sys/wait.h>

#include <memory>
#include <stdexcept>

#include "home/home_fixture.h"

using ::testing::HasSubstr;
using ::testing::StartsWith;

namespace {

const char* const kPatient = "exec sleep 600\n";
const char* const kStubborn =
    "trap '' TERM\n: >\"$TOVRINHOME/tmp/deaf\"\nwhile :; do sleep 1; done\n";

class AgentControl : public PreparedHomeTest {};

TEST_F(AgentControl, StartsAnAgentThatOutlivesTheCallAndStopsIt) {
    addAgent("tt", kPatient);
    const Outcome started = agent({"start", "tt"});
    EXPECT_EQ(started.status, 0) << started.err;
    const pid_t pid = pidOf("tt");
    ASSERT_TRUE(lives(pid));
    EXPECT_EQ(::getsid(pid), pid);

    EXPECT_EQ(agent({"-c", "stop", "tt"}).status, 0);
    EXPECT_FALSE(lives(pid));
    EXPECT_FALSE(exists("run/tt.pid"));
}

TEST_F(AgentControl, EmptyArgumentsOfADoubledBlankAreSkipped) {
    addAgent("tt", kPatient);
    EXPECT_EQ(run({inHome("bin/TovrinAgent"), "", "-h", home(), "start", "tt", ""}).status, 0);
    EXPECT_EQ(agent({"", "-c", "stop", "tt"}).status, 0);
}

TEST_F(AgentControl, AnAgentHoldsNoneOfTheCallersLowDescriptors) {
    addAgent("tt", kPatient);
    // A caller's descriptor that it forgot to close on exec.
    const int leak = ::fcntl(STDERR_FILENO, F_DUPFD, 3);
    ASSERT_LT(leak, 10);
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ::close(leak);
    const std::string fds = "/proc/" + std::to_string(pidOf("tt")) + "/fd";
    for (const auto& fd : std::filesystem::directory_iterator(fds)) {
        if (fd.path().filename().string().size() > 1) continue;
        std::error_code gone;
        const std::string target = std::filesystem::read_symlink(fd.path(), gone);
        if (gone) continue;
        EXPECT_TRUE(target == "/dev/null" || target.find("pipe:") == 0 ||
                    target.find(inHome("run/.tt.pipe")) == 0)
            << fd.path() << " is " << target;
    }
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
}

TEST_F(AgentControl, CallerThatReadsTheOutputToItsEndIsNotHeldUp) {
    addAgent("tt", kPatient);
    const std::string command = inHome("bin/TovrinAgent") + " -h " + home() + " start tt";
    const Outcome read = run({"/bin/sh", "-c", "{ " + command + " 2>&1 3>&1 8>&1; } | cat"});
    EXPECT_EQ(read.status, 0);
    EXPECT_THAT(read.out, HasSubstr("tt started"));
    EXPECT_TRUE(lives(pidOf("tt")));
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
}

TEST_F(AgentControl, TellsTheAgentWhoItIs) {
    addAgent("tt",
             "echo \"$TOVRINHOME|$AGENT_PRODUCT|$AGENT_INSTANCE|$AGENT_ARCH|$AGENT_CONFIG|"
             "$AGENT_DATA|$PWD\"\n" +
                 std::string(kPatient));
    ASSERT_EQ(agent({"start", "-o", "inst1", "tt"}).status, 0);
    const std::string expected = home() + "|tt|inst1|lx8266|" + inHome("config/tt_inst1.cfg") +
                                 "|" + inHome("data/tt_inst1") + "|" + home() + "\n";
    EXPECT_TRUE(eventually([&] { return read("logs/tt_inst1.log") == expected; }))
        << read("logs/tt_inst1.log");
    EXPECT_EQ(agent({"-c", "-o", "inst1", "stop", "tt"}).status, 0);
}

TEST_F(AgentControl, SecondStartIsRefused) {
    addAgent("tt", kPatient);
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    const pid_t pid = pidOf("tt");
    const Outcome second = agent({"start", "tt"});
    EXPECT_EQ(second.status, 4);
    EXPECT_THAT(second.err, HasSubstr("runs already"));
    EXPECT_EQ(pidOf("tt"), pid);
    EXPECT_TRUE(lives(pid));
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
}

TEST_F(AgentControl, OfManyStartsAtOnceExactlyOneSucceeds) {
    addAgent("tt", kPatient);
    std::vector<std::unique_ptr<Program>> starts;
    for (int i = 0; i < 6; ++i) {
        starts.push_back(std::make_unique<Program>(
            std::vector<std::string>{inHome("bin/TovrinAgent"), "-h", home(), "start", "tt"}));
    }
    int started = 0, refused = 0;
    for (auto& start : starts) {
        const int status = start->wait().status;
        started += status == 0;
        refused += status == 4;
    }
    EXPECT_EQ(started, 1);
    EXPECT_EQ(refused, 5);
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
}

TEST_F(AgentControl, InstancesAreIndependent) {
    addAgent("tt", kPatient);
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ASSERT_EQ(agent({"start", "-o", "b", "tt"}).status, 0);
    const pid_t other = pidOf("tt_b");
    EXPECT_NE(pidOf("tt"), other);
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
    EXPECT_TRUE(lives(other));
    EXPECT_EQ(agent({"stop", "tt"}).status, 5);
    EXPECT_EQ(agent({"-c", "-o", "b", "stop", "tt"}).status, 0);
    EXPECT_FALSE(lives(other));
}

TEST_F(AgentControl, StopOfWhatDoesNotRunHasItsOwnStatus) {
    const Outcome stopped = agent({"-c", "stop", "ux"});
    EXPECT_EQ(stopped.status, 5);
    EXPECT_THAT(stopped.err, HasSubstr("does not run"));
}

TEST_F(AgentControl, ProductThatIsNotInstalledIsRefused) {
    EXPECT_EQ(agent({"start", "zz"}).status, 3);
    write("agtqvs6/lx8266/yy/bin/agent", "#!/bin/sh\n", 0644);
    EXPECT_EQ(agent({"start", "yy"}).status, 3);
    EXPECT_FALSE(exists("run/.zz.lock"));
}

TEST_F(AgentControl, AgentThatEndsAtOnceFailsTheStart) {
    addAgent("tt", "echo cannot go on\nexit 3\n", "START_SECONDS=1\n");
    const Outcome started = agent({"start", "tt"});
    EXPECT_EQ(started.status, 6);
    EXPECT_THAT(started.err, HasSubstr("with status 3"));
    EXPECT_THAT(started.err, HasSubstr("cannot go on"));
    EXPECT_FALSE(exists("run/tt.pid"));
    EXPECT_EQ(agent({"stop", "tt"}).status, 5);
}

TEST_F(AgentControl, AgentThatCannotBeExecutedFailsTheStart) {
    addAgent("tt", "", "START_SECONDS=1\n");
    write("agtqvs6/lx8266/tt/bin/agent", "#!/no/such/interpreter\n", 0755);
    EXPECT_EQ(agent({"start", "tt"}).status, 6);
}

TEST_F(AgentControl, ChildrenOfAnAgentThatEndedAtOnceAreEnded) {
    addAgent("tt", "sleep 600 &\necho $! >\"$TOVRINHOME/tmp/child\"\nexit 1\n",
             "START_SECONDS=1\n");
    ASSERT_EQ(agent({"start", "tt"}).status, 6);
    const pid_t child = pidIn(inHome("tmp/child"));
    EXPECT_TRUE(eventually([&] { return !lives(child); }));
}

TEST_F(AgentControl, AgentThatIgnoresTheRequestIsKilledWithItsChildren) {
    addAgent("tt", "sleep 600 &\necho $! >\"$TOVRINHOME/tmp/child\"\n" + std::string(kStubborn));
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ASSERT_TRUE(eventually([&] { return exists("tmp/deaf"); }));
    const pid_t pid = pidOf("tt");
    const Outcome stopped = agent({"-c", "stop", "tt"});
    EXPECT_EQ(stopped.status, 0);
    EXPECT_THAT(stopped.err, HasSubstr("killed after 1 s"));
    EXPECT_FALSE(lives(pid));
    EXPECT_TRUE(eventually([&] { return !lives(pidIn(inHome("tmp/child"))); }));
}

TEST_F(AgentControl, StopWaitsForAnAgentThatTidiesUp) {
    addAgent("tt",
             "trap 'sleep 0.5; echo tidy; exit 0' TERM\necho ready\n"
             "while :; do sleep 0.1; done\n",
             "START_SECONDS=0\nSTOP_SECONDS=10\n");
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ASSERT_TRUE(eventually([&] { return read("logs/tt.log") == "ready\n"; }));
    const Outcome stopped = agent({"stop", "tt"});
    EXPECT_EQ(stopped.status, 0);
    EXPECT_THAT(stopped.err, HasSubstr("tt stopped"));
    EXPECT_THAT(read("logs/tt.log"), HasSubstr("tidy"));
}

TEST_F(AgentControl, PidFileOfAnAgentThatEndedIsStale) {
    addAgent("tt", kPatient);
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    const pid_t pid = pidOf("tt");
    ::kill(pid, SIGKILL);
    ASSERT_TRUE(eventually([&] { return !lives(pid); }));
    EXPECT_EQ(agent({"start", "tt"}).status, 0);
    EXPECT_NE(pidOf("tt"), pid);
    ::kill(pidOf("tt"), SIGKILL);
    ASSERT_TRUE(eventually([&] { return !lives(pidOf("tt")); }));
    EXPECT_EQ(agent({"stop", "tt"}).status, 5);
    EXPECT_FALSE(exists("run/tt.pid"));
}

/// A process that has nothing to do with any agent.
class Stranger {
public:
    Stranger() {
        std::string program = "/bin/sleep", seconds = "600";
        char* arguments[] = {program.data(), seconds.data(), nullptr};
        if (::posix_spawn(&pid_, program.c_str(), nullptr, nullptr, arguments, environ) != 0) {
            throw std::runtime_error("no stranger");
        }
    }
    ~Stranger() {
        ::kill(pid_, SIGKILL);
        ::waitpid(pid_, nullptr, 0);
    }
    Stranger(const Stranger&) = delete;
    Stranger& operator=(const Stranger&) = delete;
    pid_t pid() const { return pid_; }
    /// Its pid file's line, or that of an agent with its process id that started before it.
    std::string line(long long later = 0) const {
        std::ifstream stat("/proc/" + std::to_string(pid_) + "/stat");
        std::string word, boot;
        for (int field = 1; field <= 22; ++field)
            stat >> word;
        std::ifstream("/proc/sys/kernel/random/boot_id") >> boot;
        return std::to_string(pid_) + " " + std::to_string(std::stoll(word) - later) + " " + boot +
               " lx8266\n";
    }

private:
    pid_t pid_ = 0;
};

TEST_F(AgentControl, StrangerWithARecycledProcessIdIsLeftAlone) {
    addAgent("tt", kPatient);
    Stranger stranger;
    write("run/tt.pid", stranger.line(100));
    EXPECT_EQ(agent({"stop", "tt"}).status, 5);
    EXPECT_TRUE(lives(stranger.pid()));

    write("run/tt.pid", stranger.line(100));
    EXPECT_EQ(agent({"start", "tt"}).status, 0);
    EXPECT_NE(pidOf("tt"), stranger.pid());
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
    EXPECT_TRUE(lives(stranger.pid()));
}

TEST_F(AgentControl, PidFileOfAnEarlierBootIsStale) {
    addAgent("tt", kPatient);
    Stranger stranger;
    std::string line = stranger.line();
    line.replace(line.find('-'), 1, "x");
    write("run/tt.pid", line);
    EXPECT_EQ(agent({"stop", "tt"}).status, 5);
    EXPECT_TRUE(lives(stranger.pid()));
}

TEST_F(AgentControl, ProcessThatIsNotTheAgentIsLeftAloneWhateverThePidFileSays) {
    Stranger stranger;
    write("run/ux.pid", stranger.line());
    EXPECT_EQ(agent({"stop", "ux"}).status, 5);
    EXPECT_TRUE(lives(stranger.pid()));
}

TEST_F(AgentControl, AgentThatIsBeingReplacedByItsOwnNextProgramRuns) {
    // Until the next program has its environment, there is none to see.
    const auto until = [&](const std::string& file) {
        return "until [ -e " + inHome(file) + " ]; do sleep 0.02; done; ";
    };
    addAgent("tt", until("tmp/started") + "exec env -i /bin/sh -c 'echo >" + inHome("tmp/bare") +
                       "; " + until("tmp/go") +
                       "sleep 0.2; exec env AGENT_PRODUCT=tt AGENT_INSTANCE= sleep 600'\n");
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    write("tmp/started", "");
    ASSERT_TRUE(eventually([&] { return exists("tmp/bare"); }));
    write("tmp/go", "");
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
}

TEST_F(AgentControl, PidFileOfAnotherInstanceDoesNotLeadToItsAgent) {
    addAgent("tt", kPatient);
    ASSERT_EQ(agent({"start", "-o", "a", "tt"}).status, 0);
    std::filesystem::copy_file(inHome("run/tt_a.pid"), inHome("run/tt_b.pid"));
    EXPECT_EQ(agent({"stop", "-o", "b", "tt"}).status, 5);
    EXPECT_TRUE(lives(pidOf("tt_a")));
    EXPECT_EQ(agent({"stop", "-o", "a", "tt"}).status, 0);
}

TEST_F(AgentControl, BrokenPidFilesAreStale) {
    addAgent("tt", kPatient);
    for (const char* text :
         {"", "\n", "garbage", "1", "-1 0 x y\n", "1 2 3", "99999999999 1 a b\n"}) {
        write("run/tt.pid", text);
        EXPECT_EQ(agent({"stop", "tt"}).status, 5) << text;
    }
}

TEST_F(AgentControl, FolderThatOthersMayWriteIsRefused) {
    addAgent("tt", kPatient);
    for (const char* folder : {"", "run", "logs", "data", "config", "lib", "agtqvs6"}) {
        ASSERT_EQ(::chmod(inHome(folder).c_str(), 0775), 0);
        const Outcome refused = agent({"start", "tt"});
        EXPECT_EQ(refused.status, 2) << folder;
        EXPECT_THAT(refused.err, HasSubstr("other users may write to " + inHome(folder)));
        ASSERT_EQ(::chmod(inHome(folder).c_str(), 0755), 0);
    }
    EXPECT_FALSE(exists("run/tt.pid"));
}

TEST_F(AgentControl, LockThatIsALinkIsRefusedAndNothingIsMade) {
    addAgent("tt", kPatient);
    std::filesystem::create_symlink(scratch.path("elsewhere"), inHome("run/.tt.lock"));
    EXPECT_EQ(agent({"start", "tt"}).status, 8);
    EXPECT_FALSE(scratch.exists("elsewhere"));
}

TEST_F(AgentControl, LockThatIsNeverTheFileThatWasOpenedEndsInAnError) {
    addAgent("tt", kPatient);
    // A filesystem that numbers its files differently each time.
    scratch.script("tools/stat",
                   "case \"$*\" in *%d:%i*) exec date +%N;; *) exec /usr/bin/stat \"$@\";; esac\n");
    const std::string counted = scratch.path("sleeps");
    scratch.script("tools/sleep", "echo x >>" + counted + "\nexec /usr/bin/sleep \"$@\"\n");
    const Outcome refused = run({inHome("bin/TovrinAgent"), "-h", home(), "start", "tt"}, "",
                                {"PATH=" + scratch.path("tools") + ":/usr/bin:/bin"});
    EXPECT_EQ(refused.status, 8);
    EXPECT_THAT(refused.err, HasSubstr("another file each time"));
    const std::string sleeps = scratch.read("sleeps");
    EXPECT_EQ(std::count(sleeps.begin(), sleeps.end(), 'x'), 19) << "it pauses between its tries";
}

TEST_F(AgentControl, WrongUsage) {
    for (const std::vector<std::string>& words :
         std::vector<std::vector<std::string>>{{},
                                               {"start"},
                                               {"start", "ux", "um"},
                                               {"oh-oh-not-supported", "ux"},
                                               {"start", "../x"},
                                               {"start", "bin"},
                                               {"-x", "start", "ux"},
                                               {"start", "ux", "-o"},
                                               {"start", "-o", "../x", "ux"},
                                               {"start", "-o", ".x", "ux"}}) {
        const Outcome outcome = agent(words);
        EXPECT_EQ(outcome.status, 1) << ::testing::PrintToString(words);
        EXPECT_NE(outcome.err, "");
    }
}

TEST_F(AgentControl, DirectoryThatIsNoHomeIsRefused) {
    EXPECT_EQ(run({inHome("bin/TovrinAgent"), "-h", "/nonexistent", "start", "ux"}).status, 2);
    EXPECT_EQ(run({inHome("bin/TovrinAgent"), "-h", scratch.path(), "start", "ux"}).status, 2);
}

TEST_F(AgentControl, ValuesOutOfRangeFallBackToTheDefaults) {
    addAgent("tt", kStubborn, "START_SECONDS=0\nSTOP_SECONDS=01\n");
    write("config/tt.cfg", "INSTANCE=\nSTART_SECONDS=soon\n");
    const Outcome started = agent({"start", "tt"});
    EXPECT_EQ(started.status, 0);
    EXPECT_THAT(started.err, HasSubstr("START_SECONDS is not a number from 0 to 300"));
    ASSERT_TRUE(eventually([&] { return exists("tmp/deaf"); }));
    EXPECT_THAT(agent({"stop", "tt"}).err, HasSubstr("killed after 1 s"));
}

TEST_F(AgentControl, FiguresOfThisMachineAreCollected) {
    write("config/ux.cfg", "INSTANCE=\nSTART_SECONDS=0\nINTERVAL=1\n");
    ASSERT_EQ(agent({"start", "ux"}).status, 0);
    const auto lines = [&] {
        std::vector<std::string> all;
        std::istringstream text(read("data/ux/figures.csv"));
        for (std::string line; std::getline(text, line);)
            all.push_back(line);
        return all;
    };
    EXPECT_TRUE(eventually([&] { return lines().size() >= 3; }));
    EXPECT_EQ(agent({"stop", "ux"}).status, 0);
    const auto written = lines();
    ASSERT_GE(written.size(), 3U);
    EXPECT_THAT(written[0], StartsWith("time,load1,"));
    EXPECT_THAT(written[1], ::testing::MatchesRegex(
                                "[-0-9T:]+Z,[0-9.]+,[0-9.]+,[0-9.]+,[0-9]+,[0-9]+,[0-9]+,[0-9]+"));
}

TEST_F(AgentControl, FiguresBeyondTheLimitArePutAside) {
    write("config/ux.cfg", "INSTANCE=\nSTART_SECONDS=0\nMAX_KB=1\n");
    write("data/ux/figures.csv", std::string(1025, 'x'));
    ASSERT_EQ(agent({"start", "ux"}).status, 0);
    EXPECT_TRUE(
        eventually([&] { return read("data/ux/figures.csv").find("\n2") != std::string::npos; }));
    EXPECT_EQ(read("data/ux/figures.csv.1"), std::string(1025, 'x'));
    EXPECT_EQ(agent({"stop", "ux"}).status, 0);
}

}  // namespace

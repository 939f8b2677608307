// ctest-label: threaded
#include "host/process/children/descendants.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "host/process/children/orphans.h"
#include "host/process/children/shell_child.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

class KilledDescendants : public testing::Test {
protected:
    KilledDescendants() { host::adoptOrphans(); }
    ~KilledDescendants() override {
        for (const char* const name : {"child", "grandchild", "orphan", "agent", "before"}) {
            if (scratch.exists(name)) ::kill(pidIn(name), SIGKILL);
        }
    }
    pid_t pidIn(const std::string& name) const { return std::stoi(scratch.read(name)); }
    /// A shell text that starts a process, which writes its id into a file first.
    std::string process(const std::string& name, const std::string& prefix = "",
                        const std::string& more = "") const {
        return prefix + " sh -c 'echo $$ >" + scratch.path(name) + ".new; mv " +
               scratch.path(name) + ".new " + scratch.path(name) + "; " + more +
               " exec sleep 1000' & ";
    }
    /// How many children of this process live.
    static int livingChildren() {
        int living = 0;
        for (const host::ProcessEntry& process : host::readProcesses()) {
            if (process.isAlive && process.parent == ::getpid()) ++living;
        }
        return living;
    }
    bool isThere(const std::string& name) const {
        return eventually([&] { return scratch.exists(name); });
    }

    ScratchDir scratch;
};

TEST_F(KilledDescendants, AreAllButThoseWithASessionOfTheirOwn) {
    onAnotherThread([this] { ASSERT_GT(startShell("(" + process("before") + ")"), 0); });
    ASSERT_TRUE(isThere("before"));
    ASSERT_TRUE(eventually([&] {
        host::reapOrphans();
        return host::orphans() == std::vector<pid_t>{pidIn("before")};
    }));
    const std::vector<pid_t> before = host::orphans();

    pid_t command = -1;
    std::thread owner([&] {
        command = startShell(process("child", "", "sleep 1000 &") + "(" + process("orphan") +
                             ") ; " + process("agent", "setsid") + "wait");
        for (const char* const name : {"child", "orphan", "agent"})
            EXPECT_TRUE(isThere(name)) << name;
        host::killDescendants(command, before);
        EXPECT_TRUE(eventually([&] { return !lives(pidIn("child")) && !lives(pidIn("orphan")); }));
        EXPECT_TRUE(lives(pidIn("agent")));
        EXPECT_TRUE(lives(pidIn("before")));
        EXPECT_TRUE(lives(command)) << "it is left to whoever started it";
        ::kill(command, SIGKILL);
        ::waitpid(command, nullptr, 0);
    });
    owner.join();
}

TEST_F(KilledDescendants, OfACommandThatHasEndedItselfAreFoundToo) {
    std::thread owner([this] {
        const pid_t command = startShell(process("child") + "exit 3");
        ASSERT_TRUE(isThere("child"));
        siginfo_t ended{};
        ::waitid(P_PID, static_cast<id_t>(command), &ended, WEXITED | WNOWAIT);
        host::killDescendants(command, {});
        EXPECT_TRUE(eventually([&] { return !lives(pidIn("child")); }));
        int status = 0;
        EXPECT_EQ(::waitpid(command, &status, 0), command);
        EXPECT_EQ(WEXITSTATUS(status), 3);
    });
    owner.join();
}

TEST_F(KilledDescendants, DoNotEscapeByStartingOthers) {
    // A line of processes, each of which starts the next one and ends.
    constexpr int kLinks = 20000;
    const std::string chain = scratch.path("chain.sh");
    scratch.write("chain.sh", "echo $1 >>" + scratch.path("chain") + "\n[ $1 -lt " +
                                  std::to_string(kLinks) + " ] || exit\nsh " + chain +
                                  " $(($1 + 1)) &\n");
    std::atomic<bool> over{false};
    std::thread owner([&] {
        const pid_t command = startShell("sh " + chain + " 1; sleep 1000");
        EXPECT_TRUE(eventually([&] { return scratch.read("chain").size() > 200; }));
        host::killDescendants(command, {});
        const std::string links = scratch.read("chain");
        ::kill(command, SIGKILL);
        ::waitpid(command, nullptr, 0);
        EXPECT_EQ(links.find(std::to_string(kLinks) + '\n'), std::string::npos);
        EXPECT_EQ(livingChildren(), 0) << "all of them are dead when the call returns";
        over = true;
    });
    // As the host's main thread does.
    while (!over) {
        host::reapOrphans();
        std::this_thread::yield();
    }
    owner.join();
}

TEST_F(KilledDescendants, GetEachSignalButTheLastOnlyOnce) {
    onAnotherThread([this] {
        // What a child ignores from its birth it ignores for good.
        const pid_t command = startShell("trap '' TERM; " + process("child") + "trap - TERM; >" +
                                         scratch.path("ready") + "; wait");
        ASSERT_TRUE(isThere("child"));
        ASSERT_TRUE(isThere("ready"));
        host::Descendants descendants({});
        // What the child has run to say that it is there may still be at its end.
        EXPECT_TRUE(eventually([&] {
            descendants.look(command, true);
            return descendants.living() == 2;
        }));
        EXPECT_EQ(descendants.send(SIGTERM), 2U);
        EXPECT_EQ(descendants.send(SIGTERM), 0U) << "they have got it";
        EXPECT_EQ(::waitpid(command, nullptr, 0), command);
        descendants.look(0, true);
        EXPECT_EQ(descendants.living(), 1U) << "it is known although its parent is gone";
        EXPECT_EQ(descendants.send(SIGKILL), 1U);
        EXPECT_TRUE(eventually([&] { return !lives(pidIn("child")); }));
    });
}

}  // namespace

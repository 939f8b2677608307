// ctest-label: threaded
#include "host/process/children/orphans.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "host/process/children/descendants.h"
#include "host/process/children/process_table.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

/// The child of a shell command, started on the calling thread.
pid_t startShell(const std::string& body) {
    std::string shell = "/bin/sh";
    std::string option = "-c";
    std::string text = body;
    char* const argv[] = {shell.data(), option.data(), text.data(), nullptr};
    pid_t pid = -1;
    EXPECT_EQ(::posix_spawn(&pid, argv[0], nullptr, nullptr, argv, environ), 0);
    return pid;
}

bool lives(pid_t pid) {
    for (const host::ProcessEntry& process : host::readProcesses()) {
        if (process.pid == pid) return process.isAlive;
    }
    return false;
}

/// Runs on a thread of its own, because commands are never children of the main thread.
template <typename Body>
void onAnotherThread(Body body) {
    std::thread(body).join();
}

TEST(Orphans, AreReapedWithoutTakingAnyonesExitCode) {
    host::adoptOrphans();
    constexpr int kThreads = 4;
    constexpr int kCommands = 50;
    std::atomic<int> running{kThreads};
    std::atomic<int> lost{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&running, &lost] {
            for (int i = 0; i < kCommands; ++i) {
                const int code = 1 + i % 250;
                // Each leaves two orphans, one of which ends at once.
                const pid_t pid =
                    startShell("(exit 9 & sleep 0.01 & ) ; exit " + std::to_string(code));
                // It has ended long before it is asked for, as a command may have.
                siginfo_t ended{};
                ::waitid(P_PID, static_cast<id_t>(pid), &ended, WEXITED | WNOWAIT);
                std::this_thread::yield();
                int status = 0;
                const bool found = ::waitpid(pid, &status, 0) == pid;
                if (!found || WEXITSTATUS(status) != code) ++lost;
            }
            --running;
        });
    }
    std::size_t seen = 0;
    while (running > 0) {
        seen = std::max(seen, host::orphans().size());
        host::reapOrphans();
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(lost.load(), 0);
    EXPECT_GT(seen, 0U) << "there were orphans to reap";
    EXPECT_TRUE(eventually([] {
        host::reapOrphans();
        return host::orphans().empty();
    }));
}

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
    std::thread owner([this] {
        // A line of processes, each of which starts the next one and ends.
        const std::string file = scratch.path("chain");
        scratch.write("chain.sh",
                      "echo $$ >>" + file + "\nsh " + scratch.path("chain.sh") + " &\nexit 0\n");
        const pid_t command = startShell("sh " + scratch.path("chain.sh") + "; sleep 1000");
        ASSERT_TRUE(eventually([&] { return scratch.read("chain").size() > 200; }));
        host::killDescendants(command, {});
        ::kill(command, SIGKILL);
        ::waitpid(command, nullptr, 0);
        // Nobody writes any more.
        const auto isQuiet = [&] {
            const std::string before = scratch.read("chain");
            for (const host::ProcessEntry& process : host::readProcesses()) {
                if (process.isAlive && process.session == ::getsid(0) &&
                    before.find("\n" + std::to_string(process.pid) + "\n") != std::string::npos) {
                    return false;
                }
            }
            return scratch.read("chain") == before;
        };
        EXPECT_TRUE(eventually(isQuiet));
    });
    owner.join();
}

}  // namespace

// ctest-label: threaded
#include "host/process/children/orphans.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "host/process/children/shell_child.h"
#include "support/host/program.h"

namespace {

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

}  // namespace

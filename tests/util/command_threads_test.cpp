// Commands on several threads at once.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <pthread.h>
#include <sys/wait.h>

#include <atomic>
#include <cerrno>
#include <thread>

#include "support/process/child_role.h"
#include "support/process/left_running.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

using namespace ZAV;

TEST(CommandThreads, RunsDoNotMeet) {
    const auto before = child_role::openDescriptors();
    std::atomic<int> wrong{0};
    const auto work = [&wrong](int thread) {
        for (int i = 0; i < 15; ++i) {
            const std::string word = std::to_string(thread) + "x" + std::to_string(i);
            const std::string command =
                "/bin/sh -c 'cat; echo " + word + "; exit " + std::to_string(thread) + "'";
            int rc = -1;
            String out;
            String err;
            const bool ran = Util::runCommand(String(command.c_str()), rc, out, err,
                                              String((word + "\n").c_str()), false);
            const std::string expected = word + "\n" + word + "\n";
            if (!ran || rc != thread || !(out == expected.c_str())) ++wrong;
        }
    };
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i)
        threads.emplace_back(work, i);
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(child_role::openDescriptors(), before);
    EXPECT_TRUE(::waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD);
}

TEST(CommandThreads, ALongCommandHoldsNobodyUp) {
    const ScratchDir scratch;
    const std::string command = scratch.script("slow", untilReleased(scratch.path("release")));
    std::atomic<bool> slowEnded{false};
    std::thread slow([&] {
        int rc = -1;
        String out, err;
        EXPECT_TRUE(Util::runCommand(command.c_str(), rc, out, err, String(), false));
        slowEnded = true;
    });
    for (int i = 0; i < 5; ++i) {
        int rc = -1;
        String out, err;
        EXPECT_TRUE(Util::runCommand("/bin/echo x", rc, out, err, String(), false));
    }
    // These commands do not inherit the slow command's pipes, nor does it inherit theirs.
    EXPECT_FALSE(slowEnded);
    scratch.write("release", "");
    slow.join();
}

TEST(CommandThreads, TracesOfAllChildrenArrive) {
    TraceCapture traces("ERROR (UNIT:zavprnix DETAIL)");
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([] {
            int rc = -1;
            String out, err;
            for (int run = 0; run < 5; ++run) {
                Util::runCommand("/bin/true", rc, out, err, String(), false);
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(traces.count('D', "Calling execvp"), 20);
}

#include "host/commands/child_end.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

using std::chrono::seconds;
using std::chrono::steady_clock;

template <typename Body>
pid_t startChild(Body body) {
    const pid_t child = ::fork();
    if (child == 0) {
        body();
        ::_exit(0);
    }
    return child;
}

steady_clock::time_point soon() {
    return steady_clock::now() + seconds(60);
}

TEST(ChildEnd, IsLearntAndLeftToWhoeverReaps) {
    const pid_t child = startChild([] { ::_exit(23); });
    const auto end = host::awaitChildEnd(child, soon());
    ASSERT_TRUE(end.has_value());
    EXPECT_FALSE(end->bySignal);
    EXPECT_EQ(end->number, 23);
    int status = 0;
    EXPECT_EQ(::waitpid(child, &status, WNOHANG), child);
    EXPECT_EQ(WEXITSTATUS(status), 23);
}

TEST(ChildEnd, TellsTheSignalThatEndedIt) {
    const pid_t child = startChild([] { ::raise(SIGKILL); });
    const auto end = host::awaitChildEnd(child, soon());
    ASSERT_TRUE(end.has_value());
    EXPECT_TRUE(end->bySignal);
    EXPECT_EQ(end->number, SIGKILL);
    EXPECT_EQ(::waitpid(child, nullptr, 0), child);
}

TEST(ChildEnd, IsNotKnownWhileItRuns) {
    const pid_t child = startChild([] { ::pause(); });
    EXPECT_FALSE(host::awaitChildEnd(child, steady_clock::now()).has_value());
    EXPECT_FALSE(host::awaitChildEnd(child, steady_clock::now() + std::chrono::milliseconds(20))
                     .has_value());
    ::kill(child, SIGKILL);
    EXPECT_TRUE(host::awaitChildEnd(child, soon()).has_value());
    EXPECT_EQ(::waitpid(child, nullptr, 0), child);
}

TEST(ChildEnd, OfAChildThatThereIsNotIsNotWaitedFor) {
    const pid_t child = startChild([] {});
    ASSERT_EQ(::waitpid(child, nullptr, 0), child);
    const auto until = soon();
    EXPECT_FALSE(host::awaitChildEnd(child, until).has_value());
    EXPECT_LT(steady_clock::now(), until);
}

}  // namespace

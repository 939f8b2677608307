#include "ctl/client/interruption.h"

#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>

namespace {

using ctl::InterruptNote;

TEST(InterruptNoteDeathTest, SaysAllAndEndsInterrupted) {
    EXPECT_EXIT(
        {
            std::signal(SIGINT, SIG_DFL);  // also where the tests run with it ignored
            const InterruptNote first("first\n");
            const InterruptNote second("second\n");
            std::raise(SIGINT);
        },
        testing::ExitedWithCode(130), "^first\nsecond\n$");
}

TEST(InterruptNoteDeathTest, IsNotSaidAnyMoreWhenItIsGone) {
    EXPECT_EXIT(
        {
            std::signal(SIGINT, SIG_DFL);  // also where the tests run with it ignored
            const InterruptNote first("first\n");
            { const InterruptNote second("second\n"); }
            std::raise(SIGINT);
        },
        testing::ExitedWithCode(130), "^first\n$");
    EXPECT_EXIT(
        {
            std::signal(SIGINT, SIG_DFL);
            { const InterruptNote note("gone\n"); }
            std::raise(SIGINT);
        },
        testing::KilledBySignal(SIGINT), "^$");
}

TEST(InterruptNoteDeathTest, SaysWhatIsTrueByThen) {
    EXPECT_EXIT(
        {
            std::signal(SIGINT, SIG_DFL);
            InterruptNote first("first\n");
            const InterruptNote second("second\n");
            first.change("changed\n", "");
            std::raise(SIGINT);
        },
        testing::ExitedWithCode(130), "^changed\nsecond\n$");
}

TEST(InterruptNoteDeathTest, LeavesAnIgnoredSignalIgnored) {
    EXPECT_EXIT(
        {
            std::signal(SIGINT, SIG_IGN);
            const InterruptNote note("note\n");
            std::raise(SIGINT);
            std::_Exit(7);
        },
        testing::ExitedWithCode(7), "^$");
}

}  // namespace

#include "host/process/children/leftovers.h"

#include <gtest/gtest.h>

#include "support/host/program.h"

namespace {

using host::Leftovers;

/// A process that waits, as a command of this run of a host with the journal "j1" would.
Program command(const std::string& mark, const std::string& line) {
    return Program({"/bin/sh", "-c", line}, "", {{"ZAVHOST_RUN", mark}});
}

std::string markOf(int run) {
    return "j1-" + std::to_string(run) + "-" + std::to_string(::getsid(0));
}

TEST(Leftovers, AreWaitedForUntilTheyHaveEnded) {
    Program left = command(markOf(1), "echo begun; exec sleep 60");
    ASSERT_TRUE(left.awaitOutput("begun", std::chrono::seconds(20)));
    const Leftovers leftovers("j1", 2);
    EXPECT_FALSE(leftovers.gone());
    left.signal(SIGKILL);
    left.wait();
    EXPECT_TRUE(leftovers.gone());
}

TEST(Leftovers, AreNotThoseOfThisRunOrOfAnotherJournal) {
    Program own = command(markOf(2), "echo begun; exec sleep 60");
    Program other = command("j2-1-" + std::to_string(::getsid(0)), "echo begun; exec sleep 60");
    ASSERT_TRUE(own.awaitOutput("begun", std::chrono::seconds(20)));
    ASSERT_TRUE(other.awaitOutput("begun", std::chrono::seconds(20)));
    EXPECT_TRUE(Leftovers("j1", 2).gone());
}

TEST(Leftovers, AreThoseOfTheJournalThatWasSetAsideToo) {
    Program left = command(markOf(2), "echo begun; exec sleep 60");
    ASSERT_TRUE(left.awaitOutput("begun", std::chrono::seconds(20)));
    const Leftovers leftovers("j2", 2, "j1");
    EXPECT_FALSE(leftovers.gone());
    leftovers.end();
    EXPECT_EQ(left.wait().status, 128 + SIGKILL);
    EXPECT_TRUE(leftovers.gone());
}

TEST(Leftovers, InASessionOfTheirOwnAreLeftAlone) {
    Program agent = command(markOf(1), "exec setsid sh -c 'echo begun; exec sleep 60'");
    ASSERT_TRUE(agent.awaitOutput("begun", std::chrono::seconds(20)));
    EXPECT_TRUE(Leftovers("j1", 2).gone());
    Leftovers("j1", 2).end();
    EXPECT_TRUE(agent.running());
}

TEST(Leftovers, AreTheirDescendantsToo) {
    Program left = command(markOf(1), "env -i sh -c 'echo begun; exec sleep 60'; :");
    ASSERT_TRUE(left.awaitOutput("begun", std::chrono::seconds(20)));
    const Leftovers leftovers("j1", 2);
    leftovers.end();
    EXPECT_EQ(left.wait().status, 128 + SIGKILL);
    EXPECT_TRUE(eventually([&] { return Leftovers("j1", 2).gone(); }));
}

TEST(Leftovers, OfTheNextRunWillCarryThisRunsMark) {
    const Leftovers leftovers("j1", 7);
    EXPECT_EQ(std::string(::getenv("ZAVHOST_RUN")), markOf(7));
}

}  // namespace

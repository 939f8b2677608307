#include "host/process/children/leftovers.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include "support/host/program.h"

namespace {

using host::Leftovers;

/// Journals of this process: other tests, which run at the same time, have their own leftovers.
std::string journal() {
    return "j1of" + std::to_string(::getpid());
}
std::string otherJournal() {
    return "j2of" + std::to_string(::getpid());
}

/// A process that waits, as a command of a host would.
Program command(const std::string& mark, const std::string& line) {
    return Program({"/bin/sh", "-c", line}, "", {{"ZAVHOST_RUN", mark}});
}

std::string markOf(int run) {
    return journal() + "-" + std::to_string(run) + "-" + std::to_string(::getsid(0));
}

TEST(Leftovers, AreWaitedForUntilTheyHaveEnded) {
    Program left = command(markOf(1), "echo begun; exec sleep 60");
    ASSERT_TRUE(left.awaitOutput("begun", std::chrono::seconds(20)));
    const Leftovers leftovers(journal(), 2);
    EXPECT_FALSE(leftovers.gone());
    left.signal(SIGKILL);
    left.wait();
    EXPECT_TRUE(leftovers.gone());
}

TEST(Leftovers, AreNotThoseOfThisRunOrOfAnotherJournal) {
    Program own = command(markOf(2), "echo begun; exec sleep 60");
    Program other =
        command(otherJournal() + "-1-" + std::to_string(::getsid(0)), "echo begun; exec sleep 60");
    ASSERT_TRUE(own.awaitOutput("begun", std::chrono::seconds(20)));
    ASSERT_TRUE(other.awaitOutput("begun", std::chrono::seconds(20)));
    EXPECT_TRUE(Leftovers(journal(), 2).gone());
}

TEST(Leftovers, AreThoseOfTheJournalThatWasSetAsideToo) {
    Program left = command(markOf(2), "echo begun; exec sleep 60");
    ASSERT_TRUE(left.awaitOutput("begun", std::chrono::seconds(20)));
    const Leftovers leftovers(otherJournal(), 2, journal());
    EXPECT_FALSE(leftovers.gone());
    leftovers.end();
    EXPECT_EQ(left.wait().status, 128 + SIGKILL);
    EXPECT_TRUE(leftovers.gone());
}

TEST(Leftovers, InASessionOfTheirOwnAreLeftAlone) {
    Program agent = command(markOf(1), "exec setsid sh -c 'echo begun; exec sleep 60'");
    ASSERT_TRUE(agent.awaitOutput("begun", std::chrono::seconds(20)));
    EXPECT_TRUE(Leftovers(journal(), 2).gone());
    Leftovers(journal(), 2).end();
    EXPECT_TRUE(agent.running());
}

TEST(Leftovers, AreTheirDescendantsToo) {
    Program left = command(markOf(1), "env -i sh -c 'echo begun; exec sleep 60'; :");
    ASSERT_TRUE(left.awaitOutput("begun", std::chrono::seconds(20)));
    const Leftovers leftovers(journal(), 2);
    leftovers.end();
    EXPECT_EQ(left.wait().status, 128 + SIGKILL);
    EXPECT_TRUE(eventually([&] { return Leftovers(journal(), 2).gone(); }));
}

TEST(Leftovers, OfTheNextRunWillCarryThisRunsMark) {
    const Leftovers leftovers(journal(), 7);
    EXPECT_EQ(std::string(::getenv("ZAVHOST_RUN")), markOf(7));
}

}  // namespace

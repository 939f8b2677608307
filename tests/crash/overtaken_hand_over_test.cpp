// Kills the host when a query has come between a task's turn, which the outcome before has
// recorded, and its hand-over: while the guards look at it.
//
// ctest-label: threaded

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <unistd.h>

#include <chrono>
#include <thread>

#include "crash/killed_host.h"
#include "support/process/left_running.h"

namespace {

class OvertakenHandOver : public KilledHost {
protected:
    OvertakenHandOver() {
        // What the guards ask takes as long as a query needs to get in between, and one task lasts
        // until the host is dead.
        const std::string slow = home.files().path("slow");
        const std::string list = home.files().read("home/bin/cinfo");
        home.files().script("home/bin/cinfo", "[ ! -e '" + slow + "' ] || sleep 0.5\n" + list);
        const std::string notes = home.files().path("notes");
        home.agentScript("echo begin $product >>'" + notes + "'\n" +
                         "if [ $product = b1 ]; then\n" +
                         untilReleased(home.files().path("killed")) + "fi\n" +
                         "echo end $product >>'" + notes + "'");
    }
    int begun(const std::string& name) const {
        int times = 0;
        for (const auto& [what, task] : notes())
            times += what == "begin" && task == name ? 1 : 0;
        return times;
    }
    std::string stateOf(const std::string& name) const {
        return get("/v1/tasks/" + name).value("state", "");
    }
};

TEST_F(OvertakenHandOver, RunsOnceAfterAKillAndNothingRunsTwice) {
    home.files().write("slow", "");
    RawClient events(host->socket());
    events.send("GET /v1/events?table=KAGDYST HTTP/1.1\r\n\r\n");
    events.readUntil("\r\n\r\n");
    EXPECT_EQ(askInTurn("j1"), true);
    EXPECT_EQ(askInTurn("j3"), true);
    // The outcome of the first one is known: the second one's turn is recorded.
    EXPECT_THAT(events.readUntil("j1"), testing::HasSubstr("j1"));
    EXPECT_EQ(askOnTheTable("b1"), true);
    ASSERT_TRUE(eventually([this] { return begun("b1") == 1; }));
    host->program().signal(SIGKILL);
    EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    home.files().write("killed", "");
    ASSERT_EQ(::unlink(home.files().path("slow").c_str()), 0);
    host->start();
    ASSERT_TRUE(eventually([this] { return isIdle(); }));
    EXPECT_EQ(stateOf("b1"), "interrupted");
    EXPECT_EQ(begun("b1"), 1);
    EXPECT_EQ(stateOf("j3"), "done");
    EXPECT_EQ(begun("j3"), 1);
}

}  // namespace

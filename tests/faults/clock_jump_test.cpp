// A date that jumps to and fro while commands run: only the names of log files follow it.
#include <gtest/gtest.h>

#include "faults/scenario.h"
#include "support/clock.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "util/zavprocs.h"
#include "util/zavutil.h"

using namespace faults;
using ZAV::String;
using ZAV::Util;

namespace {

constexpr long kDay = 24 * 60 * 60;

class ClockJump : public testing::Test {
protected:
    TraceCapture traces_{"ERROR"};  // keeps them off the terminal

    static std::string run(const char* command) {
        int rc = -99;
        String out;
        String err;
        const bool ran = Util::runCommand(command, rc, out, err, "", false);
        return std::string(ran ? "true " : "false ") + std::to_string(rc) + " " + narrow(out);
    }
    /// A look of our own, so that the date has jumped before anything else looks.
    static long dateMovedBy(long step) {
        const std::time_t before = std::time(nullptr);
        const JumpingDate jumping(step);
        return static_cast<long>(std::time(nullptr) - before);
    }
};

TEST_F(ClockJump, TheDateDoesJump) {
    EXPECT_LT(dateMovedBy(kDay), -kDay / 2);
    EXPECT_GT(dateMovedBy(-kDay), kDay / 2);
}

TEST_F(ClockJump, ACommandInTimeStaysInTime) {
    for (const long step : {kDay, -kDay}) {
        const NothingLeft nothing;
        const JumpingDate jumping(step);
        EXPECT_EQ(run("/bin/sh -c \"sleep 0.1; echo x\""), "true 0 x\n");
    }
}

TEST_F(ClockJump, ATimeoutComesWhenItIsDue) {
    const ScopedEnv timeout("TIMEOUT", "1");
    const NothingLeft nothing;
    const JumpingDate jumping(kDay);
    const Stopwatch watch;
    EXPECT_EQ(run("/bin/sleep 60"), "false 0 ");
    EXPECT_GE(watch.seconds(), 0.99);
}

TEST_F(ClockJump, AWaitOfItsOwnEndsWhenItIsDue) {
    const ScopedEnv timeout("TIMEOUT", "1");
    const NothingLeft nothing;
    const JumpingDate jumping(-kDay);
    ZAV::Process process(String("/bin/sleep 60"));
    ASSERT_TRUE(process.start());
    const Stopwatch watch;
    EXPECT_FALSE(process.wait(nullptr));
    EXPECT_GE(watch.seconds(), 0.99);
}

TEST_F(ClockJump, LogsAreNamedAfterTheDateAndPrunedAllTheSame) {
    const ScratchDir scratch;
    scratch.makeDir("home/logs");
    const ScopedEnv home("TOVRINHOME", scratch.path("home"));
    const ScopedEnv tracing("KBB_RAS1", "ERROR");
    Util::_homeDir.clear();
    {
        const JumpingDate jumping(kDay);
        EXPECT_EQ(run("/bin/echo x"), "true 0 x\n");
        EXPECT_GT(jumping.looks(), 0);
    }
    Util::_homeDir.clear();
}

}  // namespace

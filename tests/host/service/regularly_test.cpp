// ctest-label: threaded
#include "host/service/regularly.h"

#include <gtest/gtest.h>

#include <atomic>

#include "support/gate.h"
#include "support/host/program.h"

namespace {

using host::Regularly;
using std::chrono::milliseconds;

TEST(RegularAct, IsDoneAtOnceAndAgainAndAgain) {
    std::atomic<int> times{0};
    const Regularly regularly(milliseconds(1), [&times] { ++times; });
    EXPECT_TRUE(eventually([&times] { return times >= 3; }));
}

TEST(RegularAct, IsNotDoneOnceItHasBeenStopped) {
    Gate gate;
    std::atomic<int> times{0};
    Regularly regularly(std::chrono::hours(1), [&] {
        ++times;
        gate.pass();
    });
    ASSERT_TRUE(gate.awaitArrival());
    gate.open();
    regularly.stop();
    EXPECT_EQ(times, 1) << "the wait for the next time is cut short";
    regularly.stop();
}

}  // namespace

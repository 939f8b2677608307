/// A thousand hosts at once. Their links are real ones, the hosts themselves are simulated.
#include <gtest/gtest.h>
#include <signal.h>

#include <map>
#include <string>

#include "tests/fleet/scale/simulated_fleet.h"

namespace {

using fleet_programs::kPatience;
using fleet_programs::wallTime;
using fleet_scale::SimulatedFleet;

constexpr std::size_t kHosts = 1000;

class AThousandHosts : public testing::Test {
protected:
    AThousandHosts() : fleet_(kHosts, std::chrono::seconds(1)) {}

    void SetUp() override {
        ASSERT_TRUE(fleet_.awaitHeard(kHosts, fleet_.began(), kPatience)) << saidByAll();
    }
    /// Whether each order of `rollouts` roll-outs to all hosts has its outcome.
    bool areAllOver(std::size_t rollouts) {
        return fleet_.awaitOver(static_cast<std::int64_t>(rollouts * kHosts), kPatience);
    }
    /// What came to each order, by the roll-outs and by the orders themselves; how often. Waits
    /// until that many roll-outs have learned it.
    std::map<std::string, std::size_t> ends(std::int64_t rollouts) {
        eventually([&] { return fleet_.records().finishedRollouts() == rollouts; }, kPatience);
        std::map<std::string, std::size_t> counts;
        for (const fleet_programs::RolledOut& one : fleet_.records().rolledOut())
            ++counts[one.partState + '/' + one.orderState];
        return counts;
    }
    std::string saidByAll() { return fleet_.programs().centre().err() + fleet_.simulator().err(); }

    SimulatedFleet fleet_;
};

TEST_F(AThousandHosts, CarryOutEachOrderOnceAndInTurn) {
    fleet_.startAll("ux");
    fleet_.startAll("lz");
    ASSERT_TRUE(areAllOver(2)) << saidByAll();
    EXPECT_EQ(ends(2), (std::map<std::string, std::size_t>{{"done/done", 2 * kHosts}}));
    EXPECT_EQ(fleet_.endSimulator().substr(std::string("enrolled\nrunning\n").size()),
              "2000 tasks, 0 out of turn\n");
}

TEST_F(AThousandHosts, ComeBackTogetherAfterTheBusWasKilled) {
    fleet_.startAll("ux");
    fleet_.programs().endBus(SIGKILL);
    const fleet::Moment killed = wallTime();
    fleet_.programs().startBus();
    ASSERT_TRUE(areAllOver(1)) << saidByAll();
    EXPECT_TRUE(fleet_.awaitHeard(kHosts, killed, kPatience)) << saidByAll();
    EXPECT_EQ(ends(1), (std::map<std::string, std::size_t>{{"done/done", kHosts}}));
    EXPECT_EQ(fleet_.endSimulator().substr(std::string("enrolled\nrunning\n").size()),
              "1000 tasks, 0 out of turn\n");
}

}  // namespace

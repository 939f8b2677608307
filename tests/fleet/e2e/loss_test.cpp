/// What is away, killed or copied, and comes back.
#include <gtest/gtest.h>

#include <string>

#include "fleet/bus/nats/store.h"
#include "support/process/left_running.h"
#include "tests/fleet/e2e/fleet_scene.h"

namespace {

using fleet_e2e::FleetHost;
using fleet_e2e::FleetScene;
using fleet_e2e::kPatience;

class FleetLosses : public testing::Test {
protected:
    FleetScene scene;
    std::unique_ptr<FleetHost> host = scene.enrol("web-1");
};

TEST_F(FleetLosses, AHostThatWasAwayGetsItsOrdersInTheirOrder) {
    const std::string first = scene.submit(*host, "START");
    const std::string second = scene.submit(*host, "STOP");
    host->startLink();
    EXPECT_EQ(scene.awaitEnd(*host, first), "done");
    EXPECT_EQ(scene.awaitEnd(*host, second), "done");
    const std::vector<std::string> calls = host->home().agentCalls();
    ASSERT_EQ(calls.size(), 2U);
    EXPECT_NE(calls[0].find("start"), std::string::npos);
}

TEST_F(FleetLosses, ALinkThatIsKilledWhileATaskRunsTellsItsOutcomeLater) {
    host->startLink();
    host->home().agentScript("touch '" + host->home().files().path("begun") + "'\n" +
                             untilReleased(host->home().files().path("released")));
    const std::string order = scene.submit(*host, "START");
    ASSERT_TRUE(eventually([&] { return host->home().files().exists("begun"); }, kPatience));
    host->killLink();
    host->home().files().write("released", "");
    host->startLink();
    EXPECT_EQ(scene.awaitEnd(*host, order), "done");
    EXPECT_EQ(host->callsOf("start"), 1U);
}

TEST_F(FleetLosses, AHostThatIsKilledWhileATaskRunsTellsThatItWasInterrupted) {
    host->startLink();
    host->home().agentScript("touch '" + host->home().files().path("begun") + "'\n" +
                             untilReleased(host->home().files().path("released")));
    const std::string order = scene.submit(*host, "START");
    ASSERT_TRUE(eventually([&] { return host->home().files().exists("begun"); }, kPatience));
    host->killHost();
    host->home().files().write("released", "");
    host->startHost();
    EXPECT_EQ(scene.awaitEnd(*host, order), "interrupted");
    EXPECT_EQ(host->callsOf("start"), 1U);
}

TEST_F(FleetLosses, OrdersWaitWhileNoHostAnswers) {
    host->startLink();
    host->killHost();
    const std::string order = scene.submit(*host, "START");
    ASSERT_TRUE(eventually(
        [&] {
            const auto news = scene.centre().news().get();
            const auto found = news.find(host->key());
            return found != news.end() && found->second.blocked == "no host answers";
        },
        kPatience));
    host->startHost();
    EXPECT_EQ(scene.awaitEnd(*host, order), "done");
}

TEST_F(FleetLosses, ABusThatIsKilledLosesNothing) {
    host->startLink();
    EXPECT_EQ(scene.awaitEnd(*host, scene.submit(*host, "START")), "done");
    scene.bus().server().kill();
    const std::string order = scene.submit(*host, "STOP");
    scene.bus().server().start();
    EXPECT_EQ(scene.awaitEnd(*host, order), "done");
    EXPECT_EQ(host->callsOf("stop"), 1U);
}

TEST_F(FleetLosses, ACentreThatComesBackGoesOn) {
    const std::string order = scene.submit(*host, "START");
    EXPECT_EQ(scene.stopCentre(), fleet::CentreProgram::End::Asked);
    host->startLink();
    scene.startCentre();
    EXPECT_EQ(scene.awaitEnd(*host, order), "done");
    EXPECT_EQ(host->callsOf("start"), 1U);
}

TEST_F(FleetLosses, OrdersThatAreOverLeaveTheBus) {
    host->startLink();
    const std::string order = scene.submit(*host, "START");
    EXPECT_EQ(scene.awaitEnd(*host, order), "done");
    const auto connection = scene.bus().centre();
    EXPECT_TRUE(eventually(
        [&] {
            const auto there = lastOn(*connection, fleet::kTasksStream,
                                      fleet::taskSubject(host->key(), 1), kPatience);
            return there.kind == fleet::LastResult::Kind::Missing;
        },
        kPatience));
}

TEST_F(FleetLosses, TwoMachinesThatClaimToBeOneHostAreStopped) {
    host->startLink();
    const auto clone = host->startClone();
    ASSERT_TRUE(eventually([&] { return !scene.alarms().empty(); }, kPatience));
    EXPECT_EQ(scene.alarms().front(), "two machines claim to be this host");
    constexpr int kMustNotRun = 78;
    EXPECT_EQ(clone->wait(kPatience).status, kMustNotRun);
    EXPECT_EQ(host->link().wait(kPatience).status, kMustNotRun);
}

TEST_F(FleetLosses, ASecondCentreWaitsForTheFirst) {
    const auto user = fleet::KeyPair::make(fleet::KeyKind::User);
    fleet::CentreProgram second(
        {scene.files().path("second"),
         scene.bus().optionsOf(
             user, fleet::fullUserToken(scene.bus().keys().control,
                                        {user.publicKey(), "second", scene.bus().madeAt(), {}})),
         fleet::KeyPair::make(fleet::KeyKind::User),
         {1 << 20, 1},
         "the second centre",
         std::chrono::seconds(30),
         std::chrono::hours(1),
         {},
         [](const fleet::Alarm&) {}});
    ASSERT_TRUE(eventually([&] { return scene.centre().isWorking(); }, kPatience));
    auto running = std::async(std::launch::async, [&second] { return second.run(); });
    EXPECT_EQ(running.wait_for(std::chrono::seconds(2)), std::future_status::timeout);
    EXPECT_FALSE(second.isWorking());
    scene.stopCentre();
    EXPECT_TRUE(eventually([&] { return second.isWorking(); }, kPatience));
    second.end();
    EXPECT_EQ(running.get(), fleet::CentreProgram::End::Asked);
}

}  // namespace

/// The configuration as it was made, with a real server of the bus.
#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>

#include "fleet/server/keys/setup/rotate_keys.h"
#include "tests/fleet/server/keys/running_fleet.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using made_fleet::kPatience;
using made_fleet::MadeFleet;
using made_fleet::RunningFleet;
using made_fleet::today;
using Failure = fleet::Connection::Result::Failure;

class RunningBus : public testing::Test {
protected:
    const std::unique_ptr<RunningFleet> fleet_ = RunningFleet::start();
    const KeyPair host_ = KeyPair::make(KeyKind::User);
};

TEST_F(RunningBus, TakesTheCentreAndHostsOverTlsAndNobodyElse) {
    const auto centre = fleet_->connect(fleet_->made().directory().bus().centre);
    ASSERT_TRUE(centre.connection) << centre.text;
    EXPECT_TRUE(centre.connection->flush(kPatience).done());
    const auto host = fleet_->connect(host_, fleet_->hostToken(host_));
    ASSERT_TRUE(host.connection) << host.text;
    EXPECT_TRUE(host.connection->flush(kPatience).done());
    const MadeFleet stranger;
    EXPECT_EQ(fleet_->connect(stranger.directory().bus().centre).failure, Failure::Refused);
}

TEST_F(RunningBus, CutsAHostOffByTheKeyThatSignsAccounts) {
    std::atomic<bool> isCut{false};
    fleet::ConnectionEvents events;
    events.closed = [&](const std::string&) { isCut = true; };
    const std::string token = fleet_->hostToken(host_);
    const auto host = fleet_->connect(host_, token, events);
    ASSERT_TRUE(host.connection) << host.text;
    const KeyPair other = KeyPair::make(KeyKind::User);
    ASSERT_NO_FATAL_FAILURE(fleet_->tellAccounts({{host_.publicKey(), fleet::kForEver}}));
    EXPECT_TRUE(eventually([&] { return isCut.load(); }));
    EXPECT_EQ(fleet_->connect(host_, token).failure, Failure::Refused);
    EXPECT_EQ(fleet_->connect(host_, fleet_->hostToken(host_)).failure, Failure::Refused);
    EXPECT_TRUE(fleet_->connect(other, fleet_->hostToken(other)).connection);
}

TEST_F(RunningBus, RefusesTheEarlierUsersOnceTheNextCentreHasStarted) {
    const fleet::FleetDirectory& directory = fleet_->made().directory();
    const fleet::BusUser earlier = directory.bus().centre;
    rotateKeys(directory, fleet_->made().root(), today(), today() + made_fleet::kDay);
    const auto running = fleet_->connect(earlier);
    EXPECT_TRUE(running.connection) << running.text;  // nobody has told the server yet
    ASSERT_NO_FATAL_FAILURE(fleet_->tellAccounts({}));
    EXPECT_EQ(fleet_->connect(earlier).failure, Failure::Refused);
    const auto next = fleet_->connect(directory.bus().centre);
    EXPECT_TRUE(next.connection) << next.text;
}

}  // namespace

/// What hosts tell about themselves, from the host to the centre's database.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <optional>
#include <string>

#include "fleet/bus/nats/store.h"
#include "fleet/bus/nats/streams.h"
#include "fleet/server/store/host_facts.h"
#include "tests/fleet/e2e/fleet_scene.h"

namespace {

using fleet_e2e::FleetHost;
using fleet_e2e::FleetScene;
using fleet_e2e::kPatience;
using nlohmann::json;

class FleetFacts : public testing::Test {
protected:
    std::optional<fleet::KeptFacts> facts() {
        return scene.centre()
            .ask([key = host->key()](fleet::CentreProgram::Parts& parts) {
                return fleet::HostFacts(parts.database).of(key);
            })
            .get();
    }
    bool hasInventory() {
        const auto known = facts();
        return known && known->facts.inventory;
    }

    /// Whether the bus keeps what the host has told.
    bool isOnTheBus() {
        return fleet::lastOn(*reader_.connection, fleet::kHostsStream,
                             fleet::kFactsSubject + host->key(), std::chrono::seconds(10))
                   .kind == fleet::LastResult::Kind::Found;
    }

    FleetScene scene;
    const fleet::KeyPair user_ = fleet::KeyPair::make(fleet::KeyKind::User);
    const fleet::Connection::Result reader_ = fleet::Connection::connect(scene.bus().optionsOf(
        user_, fleet::fullUserToken(scene.bus().keys().control,
                                    {user_.publicKey(), "a reader", scene.bus().madeAt(), {}})));
    std::unique_ptr<FleetHost> host = scene.enrol("web-1");
};

TEST_F(FleetFacts, ComeToTheCentreWithLabelsAndInventory) {
    host->startLink();
    ASSERT_TRUE(eventually([this] { return hasInventory(); }, kPatience));
    const fleet::Facts told = facts()->facts;
    EXPECT_EQ(told.name, "web-1");
    EXPECT_EQ(told.labels, (fleet::Labels{{"env", "test"}}));
    EXPECT_NE(told.link, "");
    EXPECT_NE(told.version, "");
    EXPECT_NE(told.journal, "");
    EXPECT_TRUE(json::parse(told.inventory->document).at("products").is_array());
    ASSERT_TRUE(
        eventually([this] { return scene.centre().toldLabels().version() > 1; }, kPatience));
    EXPECT_EQ(scene.centre().toldLabels().all().at(host->key()), told.labels);
}

TEST_F(FleetFacts, ThatWereToldWhileTheCentreWasAwayComeLater) {
    scene.stopCentre();
    host->startLink();
    ASSERT_TRUE(eventually([this] { return isOnTheBus(); }, kPatience));
    scene.startCentre();
    EXPECT_TRUE(eventually([this] { return hasInventory(); }, kPatience));
}

}  // namespace

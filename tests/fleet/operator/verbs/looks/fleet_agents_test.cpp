#include "fleet/operator/verbs/looks/fleet_agents.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

namespace {

using ctl::Format;
using nlohmann::json;

json hostWith(const std::string& name, const json& inventory) {
    return {{"name", name}, {"facts", {{"inventory", inventory}}}};
}

json webAgents() {
    return hostWith(
        "web-1", {{"age", 300},
                  {"products",
                   {{{"PRODUCT", "ux"}, {"VERSION", "07.10"}, {"HOSTPC", "lx8266"}},
                    {{"PRODUCT", "ne"}, {"VERSION", "1.5"}}}},
                  {"instances",
                   {{{"product", "ux"}, {"target", "a:UX"}, {"state", "running"}, {"user", "root"}},
                    {{"product", "ne"}, {"target", "b:NE"}, {"state", "missing"}},
                    {{"product", "ne"}, {"target", "c:NE"}, {"state", "stopped"}}}}});
}

TEST(FleetAgentsPage, HasWhatIsInstalledAndWhatRunsWithItsAge) {
    const ctl::Page page = fleet::showFleetAgents(json::array({webAgents()}), "", Format::Text);
    EXPECT_EQ(page.out,
              "HOST   PRODUCT  VERSION  RELEASE  ARCHITECTURE  AGE\n"
              "web-1  ux       07.10             lx8266        5 min\n"
              "web-1  ne       1.5                             5 min\n"
              "\n"
              "HOST   INSTANCE  STATE                 USER\n"
              "web-1  a:UX      running               root\n"
              "web-1  b:NE      should run, does not\n");
    EXPECT_EQ(page.err, "");
    EXPECT_EQ(page.status, ctl::kSuccess);
}

TEST(FleetAgentsPage, NamesHostsThatNeverToldAnything) {
    const json hosts = {webAgents(), {{"name", "db-1"}}, {{"name", "db-2"}, {"facts", 7}}};
    const ctl::Page page = fleet::showFleetAgents(hosts, "", Format::Text);
    EXPECT_EQ(page.err, "zavctl: no inventory was ever told by: db-1, db-2\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    const json document = json::parse(fleet::showFleetAgents(hosts, "", Format::Json).out);
    EXPECT_EQ(document.at("unknown"), (json{"db-1", "db-2"}));
    EXPECT_EQ(document.at("hosts").size(), 3U);
    EXPECT_EQ(document.at("hosts").at(0).at("facts").at("inventory").at("age"), 300);
}

TEST(FleetAgentsPage, SaysThatNothingIsInstalled) {
    const json hosts = json::array({hostWith("web-1", {{"age", 59}, {"products", json::array()}})});
    EXPECT_EQ(fleet::showFleetAgents(hosts, "", Format::Text).out,
              "HOST   PRODUCT  VERSION  RELEASE  ARCHITECTURE  AGE\n"
              "web-1  -                                        59 s\n");
}

TEST(FleetAgentsPage, ShowsOneProduct) {
    const json document =
        json::parse(fleet::showFleetAgents(json::array({webAgents()}), "ne", Format::Json).out);
    const json& inventory = document.at("hosts").at(0).at("facts").at("inventory");
    ASSERT_EQ(inventory.at("products").size(), 1U);
    EXPECT_EQ(inventory.at("products").at(0).at("PRODUCT"), "ne");
    EXPECT_EQ(inventory.at("instances").size(), 2U);
}

TEST(FleetAgentsPage, SaysWhatAnInventoryLacks) {
    const json hosts = json::array({hostWith(
        "web-1", {{"products", json::array()}, {"warnings", {"no program", 7}}, {"leftOut", 12}})});
    const ctl::Page page = fleet::showFleetAgents(hosts, "", Format::Text);
    EXPECT_EQ(page.err,
              "zavctl: web-1: no program\n"
              "zavctl: web-1: the inventory is too long to be told; 12 entries are left out\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

TEST(FleetAgentsPage, SurvivesWhateverAHostTells) {
    const json hosts = {hostWith("web-1", {{"products", {1, "x", json::array()}},
                                           {"instances", {1, {{"state", 7}}}},
                                           {"warnings", 5},
                                           {"leftOut", "x"},
                                           {"age", 18446744073709551615U}}),
                        json(7)};
    EXPECT_NE(fleet::showFleetAgents(hosts, "ux", Format::Text).err, "");
    EXPECT_NE(fleet::showFleetAgents(hosts, "", Format::Text).out, "");
}

}  // namespace

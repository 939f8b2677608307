#include "fleet/operator/verbs/hosts.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

namespace {

using ctl::Format;
using nlohmann::json;

ctl::WallTime later() {
    return *ctl::parseTime("2026-03-01T15:00:00.000Z");
}

json webHost() {
    return {{"host", "UWEB1"},
            {"name", "web-1"},
            {"signing", "USIGN1"},
            {"labels", {{"env", "test"}, {"site", "a"}}},
            {"state", "away"},
            {"heard", "2026-03-01T12:00:00.000Z"},
            {"last", 7},
            {"taken", 5},
            {"blocked", "no host answers"},
            {"stopped", ""},
            {"unpublished", ""},
            {"journal", "j1"},
            {"skew", -7200.5}};
}

TEST(HostsPage, HasALineForEachHost) {
    EXPECT_EQ(fleet::showHosts(json::array({webHost()}), later(), Format::Text).out,
              "HOST   STATE  HEARD    ORDERS  LABELS           TROUBLE\n"
              "web-1  away   3 h ago  2       env=test,site=a  blocked: no host answers; its\n"
              "                                                clock is 2 h behind\n");
    EXPECT_EQ(fleet::showHosts(json::array(), later(), Format::Text).out,
              "There are no such hosts.\n");
    EXPECT_EQ(json::parse(fleet::showHosts(json::array({webHost()}), later(), Format::Json).out),
              (json{{"hosts", {webHost()}}}));
}

TEST(HostsPage, SaysWhatIsOddAboutAHost) {
    EXPECT_EQ(fleet::troubleOf({{"stopped", "two machines claim to be it"}}),
              "stopped: two machines claim to be it");
    EXPECT_EQ(fleet::troubleOf({{"unpublished", "password=geheim"}}), "unpublished: password=***");
    EXPECT_EQ(fleet::troubleOf({{"skew", 86400}}), "its clock is 1 day ahead");
    EXPECT_EQ(fleet::troubleOf({{"skew", 59.9}}), "");
    EXPECT_EQ(fleet::troubleOf({{"skew", "x"}, {"blocked", 1}}), "");
    EXPECT_EQ(fleet::troubleOf(json(1)), "");
    EXPECT_NE(fleet::troubleOf({{"skew", 1e300}}), "");
}

TEST(HostsPage, ShowsAllAboutOneAndItsLatestOrders) {
    const json orders = {{"orders", json::array({{{"order", "1"},
                                                  {"number", 7},
                                                  {"kind", "START"},
                                                  {"product", "ux"},
                                                  {"operator", "mary"},
                                                  {"issued", "x"},
                                                  {"state", "failed"},
                                                  {"reason", "no disk"}}})}};
    EXPECT_EQ(fleet::showHost(webHost(), orders, later(), Format::Text).out,
              "host         web-1\n"
              "key          UWEB1\n"
              "signing key  USIGN1\n"
              "state        away\n"
              "heard        3 h ago\n"
              "labels       env=test,site=a\n"
              "orders       5 of 7 taken\n"
              "journal      j1\n"
              "trouble      blocked: no host answers; its clock is 2 h behind\n"
              "\n"
              "NUMBER  ORDER     STATE   BY    ISSUED  REASON\n"
              "7       START ux  failed  mary  x       no disk\n");
    EXPECT_EQ(json::parse(fleet::showHost(webHost(), orders, later(), Format::Json).out),
              (json{{"host", webHost()}, {"orders", orders["orders"]}}));
    EXPECT_THROW(fleet::showHost(webHost(), json::object(), later(), Format::Text), ctl::Failure);
}

}  // namespace

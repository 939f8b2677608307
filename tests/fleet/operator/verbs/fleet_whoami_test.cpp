#include "fleet/operator/verbs/fleet_whoami.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using fleet::showOperator;
using nlohmann::json;

json mary() {
    return {{"operator", "mary"}, {"key", "UMARY"},
            {"role", "operator"}, {"commands", {"START", "STOP"}},
            {"products", {"ux"}}, {"selector", "env=test"},
            {"fleet", "demo"}};
}

TEST(OperatorPage, SaysWhatOneMayDo) {
    EXPECT_EQ(showOperator(mary(), Format::Text).out,
              "You are mary, operator in the fleet demo.\n"
              "You may START, STOP for ux on the hosts env=test.\n");
    json viewer = mary();
    viewer["role"] = "viewer";
    viewer["commands"] = json::array();
    EXPECT_EQ(showOperator(viewer, Format::Text).out,
              "You are mary, viewer in the fleet demo.\n"
              "You may look at the hosts env=test.\n");
    EXPECT_EQ(json::parse(showOperator(mary(), Format::Json).out), mary());
}

TEST(OperatorPage, DoesNotBelieveWhatIsNoSuchAnswer) {
    for (const json& odd : {json::object(), json::array(), json{{"operator", 1}},
                            json{{"operator", "mary"}, {"commands", 1}, {"products", {}}}}) {
        EXPECT_THROW(showOperator(odd, Format::Text), ctl::Failure) << odd.dump();
    }
}

}  // namespace

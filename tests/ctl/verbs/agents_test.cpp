#include "ctl/verbs/agents.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

TEST(Agents, AreShownAsATable) {
    const json rows = {{{"PRODUCT", "ux"},
                        {"VERSION", "06230100"},
                        {"RELEASE", "0"},
                        {"PLATFORM", "lx8266"},
                        {"HOSTTYPE", "LZ"},
                        {"HOSTPC", "lx8266"},
                        {"PRODDESC", "An agent"}}};
    const ctl::Page page = ctl::showAgents(rows, Format::Text);
    EXPECT_EQ(page.out,
              "PRODUCT  VERSION   RELEASE  PLATFORM  SYSTEM  ARCHITECTURE  DESCRIPTION\n"
              "ux       06230100  0        lx8266    LZ      lx8266        An agent\n");
    EXPECT_EQ(page.status, ctl::kSuccess);
}

TEST(Agents, ThatAreNoneAreSaid) {
    EXPECT_EQ(ctl::showAgents(json::array(), Format::Text).out, "No products are listed.\n");
}

TEST(Agents, AreRowsAsJson) {
    EXPECT_EQ(json::parse(ctl::showAgents({{{"PRODUCT", "ux"}}}, Format::Json).out),
              (json{{"rows", {{{"PRODUCT", "ux"}}}}}));
    EXPECT_EQ(json::parse(ctl::showAgents(json::array(), Format::Json).out),
              (json{{"rows", json::array()}}));
}

}  // namespace

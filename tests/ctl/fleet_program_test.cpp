#include "ctl/fleet_program.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using ctl::isForFleet;
using Words = std::vector<std::string>;

TEST(FleetProgram, IsAskedForByItsOptions) {
    EXPECT_TRUE(isForFleet({"--fleet", "https://a", "--on", "env=test", "start", "ux"}));
    EXPECT_TRUE(isForFleet({"start", "ux", "--on=env=test"}));
    EXPECT_TRUE(isForFleet({"whoami", "--fleet=https://a"}));
}

TEST(FleetProgram, IsAskedForByItsVerbs) {
    for (const Words& words :
         {Words{"login", "abc"}, Words{"--json", "hosts"}, Words{"--timeout", "5", "rollout", "ls"},
          Words{"help", "rollout"}}) {
        EXPECT_TRUE(isForFleet(words)) << words.front();
    }
}

TEST(FleetProgram, LeavesEverythingElseToOneHost) {
    for (const Words& words :
         {Words{}, Words{"start", "hosts"}, Words{"--socket", "hosts", "status"}, Words{"help"},
          Words{"help", "start"}, Words{"whoami"}, Words{"status", "--onward"},
          Words{"install", "ux", "7", "--", "./x", "--on", "--fleet"}, Words{"--", "hosts"}}) {
        EXPECT_FALSE(isForFleet(words)) << (words.empty() ? "" : words.front());
    }
}

}  // namespace

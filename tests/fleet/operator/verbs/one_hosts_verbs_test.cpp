#include "fleet/operator/verbs/one_hosts_verbs.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "ctl/verbs/verb_table.h"
#include "fleet/operator/verbs/fleet_verbs.h"

namespace {

using fleet::refusalOfOneHostsVerb;

std::vector<std::string> lineFor(const std::string& verb) {
    std::vector<std::string> words = {"--fleet", "https://a", "--on=*"};
    const std::size_t blank = verb.find(' ');
    words.push_back(verb.substr(0, blank));
    if (blank != std::string::npos) words.push_back(verb.substr(blank + 1));
    return words;
}

TEST(VerbsOfOneHost, AreRefusedForAFleetWithTheWayInstead) {
    std::size_t refused = 0;
    for (const ctl::Verb* const verb : ctl::hostVocabulary().verbs) {
        const auto refusal = refusalOfOneHostsVerb(lineFor(verb->name));
        const bool isForFleets = fleet::fleetVocabulary().findVerb(verb->name) != nullptr;
        EXPECT_EQ(refusal.has_value(), !isForFleets) << verb->name;
        if (!refusal) continue;
        ++refused;
        EXPECT_EQ(refusal->status(), ctl::kWrongUsage);
        EXPECT_EQ(refusal->what(), std::string(verb->name) + " is for one host at a time");
        EXPECT_NE(refusal->hint(), "") << verb->name;
    }
    EXPECT_GT(refused, 5U);
}

TEST(VerbsOfOneHost, AreNotWhatNobodyKnows) {
    EXPECT_FALSE(refusalOfOneHostsVerb({"--fleet", "https://a", "frobnicate"}).has_value());
    EXPECT_FALSE(refusalOfOneHostsVerb({"--fleet", "https://a"}).has_value());
    EXPECT_FALSE(refusalOfOneHostsVerb({"rollout", "ls"}).has_value());
    EXPECT_FALSE(refusalOfOneHostsVerb({"help", "query"}).has_value());
}

}  // namespace

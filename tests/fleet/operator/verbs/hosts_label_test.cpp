#include "fleet/operator/verbs/hosts_label.h"

#include <gtest/gtest.h>

#include <map>
#include <string>

#include "tests/fleet/operator/certified.h"

namespace {

using fleet::changedLabels;
using Labels = std::map<std::string, std::string>;

TEST(HostsLabel, GivesLabelsValuesAndTakesOthersAway) {
    const Labels before = {{"env", "test"}, {"old", "yes"}};
    EXPECT_EQ(changedLabels(before, {"env=live", "site=a=b", "old-"}),
              (Labels{{"env", "live"}, {"site", "a=b"}}));
    EXPECT_EQ(changedLabels(before, {"a-=b"}),
              (Labels{{"a-", "b"}, {"env", "test"}, {"old", "yes"}}));
}

TEST(HostsLabel, RefusesWhatChangesNoLabel) {
    for (const char* const change : {"", "-", "=", "=a", "env", "other-"}) {
        EXPECT_EQ(operator_test::failureOf([&] {
                      changedLabels({{"env", "a"}}, {change});
                  }).status(),
                  ctl::kWrongUsage)
            << change;
    }
}

}  // namespace

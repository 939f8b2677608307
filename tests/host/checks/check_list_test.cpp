#include "host/checks/check_list.h"

#include <gtest/gtest.h>

#include <set>

namespace {

using host::CheckResult;
using host::Verdict;

TEST(CheckList, EveryCheckHasANameOfItsOwn) {
    std::set<std::string> names;
    for (const host::Check& check : host::checks())
        EXPECT_TRUE(names.insert(check.name).second) << check.name;
}

TEST(CheckList, AResultIsALineWithItsRemedy) {
    EXPECT_EQ(host::lineOf({"home", {Verdict::Ok, "/opt/home", ""}}),
              "ok       home          /opt/home\n");
    EXPECT_EQ(host::lineOf({"descriptors", {Verdict::Warning, "few", "raise the limit"}}),
              "warning  descriptors   few; raise the limit\n");
    EXPECT_EQ(host::lineOf({"a-name-that-is-long", {Verdict::Error, "text", ""}}),
              "error    a-name-that-is-long text\n");
}

TEST(CheckList, OnlyAnErrorCountsAsOne) {
    const CheckResult warning{"a", {Verdict::Warning, "", ""}};
    const CheckResult error{"b", {Verdict::Error, "", ""}};
    EXPECT_FALSE(host::hasError({}));
    EXPECT_FALSE(host::hasError({warning}));
    EXPECT_TRUE(host::hasError({warning, error}));
}

}  // namespace

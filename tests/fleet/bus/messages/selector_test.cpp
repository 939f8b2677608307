#include "fleet/bus/messages/selector.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>

namespace {

using fleet::fitsPattern;
using fleet::Labels;
using fleet::Selector;
using fleet::SelectorError;

const Labels kLabels = {{"env", "test"}, {"site", "north-1"}, {"os.family", "linux"}};

bool matches(const std::string& selector) {
    return Selector(selector).matches("web-7", kLabels);
}

struct Case {
    const char* selector;
    bool isMatch;
};

class Selectors : public testing::TestWithParam<Case> {};

TEST_P(Selectors, Match) {
    EXPECT_EQ(matches(GetParam().selector), GetParam().isMatch);
}

INSTANTIATE_TEST_SUITE_P(
    All, Selectors,
    testing::Values(Case{"env=test", true}, Case{"env=prod", false}, Case{"env = test", true},
                    Case{"none=test", false}, Case{"env!=prod", true}, Case{"env!=test", false},
                    Case{"none!=x", true}, Case{"env in (prod,test)", true},
                    Case{"env in (prod, dev)", false}, Case{"env in(test)", true},
                    Case{"none in (test)", false}, Case{"env notin (prod,dev)", true},
                    Case{"env notin (prod,test)", false}, Case{"none notin (a)", true},
                    Case{"env", true}, Case{"none", false}, Case{"!none", true},
                    Case{"!env", false}, Case{"web-*", true}, Case{"db-*", false}, Case{"*", true},
                    Case{"*-7", true}, Case{"w*-*7", true}, Case{"web-*8", false},
                    Case{"site=north-*", true}, Case{"site=south-*", false},
                    Case{"site in (south-*,north-*)", true}, Case{"env=test,site=north-1", true},
                    Case{"env=test,site=south-1", false},
                    Case{"env in (test,prod) , web-*, !none", true}, Case{"os.family=linux", true},
                    Case{"web-7", false}));

class BadSelectors : public testing::TestWithParam<const char*> {};

TEST_P(BadSelectors, AreErrors) {
    EXPECT_THROW(Selector{GetParam()}, SelectorError);
}

INSTANTIATE_TEST_SUITE_P(All, BadSelectors,
                         testing::Values("", " ", ",", "env=test,", ",env=test", "env=", "=test",
                                         "!", "env in ()", "env in (a", "env in a)", "env in a",
                                         "env notin", "env in (a,,b)", "e nv", "env=a b",
                                         "env==test", "!=x", "a!b", "env=te\nst", "(a)", "\"web\"",
                                         "web-*!", "env in (a b)"));

TEST(Patterns, StandForAnyCharacters) {
    EXPECT_TRUE(fitsPattern("*", ""));
    EXPECT_TRUE(fitsPattern("a*b*c", "aXbXbc"));
    EXPECT_FALSE(fitsPattern("a*b*c", "aXc"));
    EXPECT_FALSE(fitsPattern("", "a"));
    EXPECT_TRUE(fitsPattern("", ""));
    EXPECT_FALSE(fitsPattern("a", "ab"));
    EXPECT_TRUE(fitsPattern("**a**", "xax"));
}

TEST(Patterns, ManyStarsCostNoMoreThanTheirLength) {
    std::string pattern;
    for (int i = 0; i < 5'000; ++i)
        pattern += "*a";
    // With tries of each star for itself this would never end.
    EXPECT_FALSE(fitsPattern(pattern + "b", std::string(20'000, 'a')));
}

}  // namespace

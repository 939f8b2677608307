#include "http/url.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using http::parseTarget;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

TEST(Url, SplitsPathAndParametersInOrder) {
    const auto target = http::parseTarget("/v1/events?table=T&B=2&A=1&A=3");
    ASSERT_TRUE(target);
    EXPECT_EQ(target->path, "/v1/events");
    EXPECT_THAT(target->parameters,
                ElementsAre(Pair("table", "T"), Pair("B", "2"), Pair("A", "1"), Pair("A", "3")));
}

TEST(Url, DecodesEscapesOnlyOnce) {
    const auto target = http::parseTarget("/a%20b?n%3D=%2B%26%3d%2525");
    ASSERT_TRUE(target);
    EXPECT_EQ(target->path, "/a b");
    EXPECT_THAT(target->parameters, ElementsAre(Pair("n=", "+&=%25")));
}

TEST(Url, TakesPlusAsBlankInParametersOnly) {
    const auto target = http::parseTarget("/a+b?x=1+2");
    ASSERT_TRUE(target);
    EXPECT_EQ(target->path, "/a+b");
    EXPECT_THAT(target->parameters, ElementsAre(Pair("x", "1 2")));
}

TEST(Url, KeepsEqualsSignsInValuesAndAllowsEmptyOnes) {
    const auto target = http::parseTarget("/p?a=b=c&d=&e&&");
    ASSERT_TRUE(target);
    EXPECT_THAT(target->parameters, ElementsAre(Pair("a", "b=c"), Pair("d", ""), Pair("e", "")));
}

TEST(Url, DropsSchemeHostAndFragment) {
    EXPECT_EQ(http::parseTarget("http://localhost/v1/tables#x")->path, "/v1/tables");
    EXPECT_EQ(http::parseTarget("http://localhost")->path, "/");
    EXPECT_THAT(http::parseTarget("/x#?a=b")->parameters, IsEmpty());
}

TEST(Url, RefusesMalformedEscapes) {
    for (const char* target : {"/%", "/%4", "/%zz", "/%4g", "/p?a=%", "/p?%1=x", "/p?a=%a"}) {
        EXPECT_FALSE(http::parseTarget(target)) << target;
    }
}

TEST(Url, RefusesTheCharacterZero) {
    EXPECT_FALSE(http::parseTarget("/p?a=b%00c"));
    EXPECT_FALSE(http::parseTarget("/%00"));
}

}  // namespace

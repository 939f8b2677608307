#include "fleet/bus/nats/subject.h"

#include <gtest/gtest.h>

#include <string_view>

using namespace std::string_view_literals;

TEST(Subject, IsTokensJoinedByDots) {
    for (const auto text : {"a"sv, "task.H.1"sv, "$KV.HOSTS.h"sv, "_I.h.5"sv}) {
        EXPECT_TRUE(fleet::isSubject(text)) << text;
    }
    for (const auto text : {""sv, "."sv, "a."sv, ".a"sv, "a..b"sv, "a b"sv, "a\r\nPUB x 0"sv,
                            "a\tb"sv, "a\0b"sv, "\xc3\xa4"sv, "a.*"sv, "a.>"sv}) {
        EXPECT_FALSE(fleet::isSubject(text)) << text;
    }
}

TEST(SubjectPattern, MayHaveWildcardsAsWholeTokens) {
    for (const auto text : {"a"sv, "*"sv, ">"sv, "a.*.b"sv, "a.>"sv}) {
        EXPECT_TRUE(fleet::isSubjectPattern(text)) << text;
    }
    for (const auto text : {""sv, ">.a"sv, "a*"sv, "a.b>"sv, "a b"sv, "a.\r\n"sv}) {
        EXPECT_FALSE(fleet::isSubjectPattern(text)) << text;
    }
}

TEST(SubjectToken, IsOneWordWithoutWildcards) {
    EXPECT_TRUE(fleet::isSubjectToken("UABC"));
    for (const auto text : {""sv, "*"sv, ">"sv, "a.b"sv, "a b"sv}) {
        EXPECT_FALSE(fleet::isSubjectToken(text)) << text;
    }
}

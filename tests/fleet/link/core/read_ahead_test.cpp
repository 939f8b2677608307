#include "fleet/link/core/read_ahead.h"

#include <gtest/gtest.h>

#include <optional>

namespace {

using fleet::Directive;
using fleet::Number;
using fleet::ReadAhead;

Directive order(Number number) {
    Directive directive;
    directive.number = number;
    return directive;
}

ReadAhead begunBehind(Number taken) {
    ReadAhead ahead;
    ahead.restart(taken);
    return ahead;
}

TEST(ReadAhead, ReadsOneAfterTheOtherUpToTheFirstThatIsMissing) {
    ReadAhead ahead = begunBehind(4);
    EXPECT_EQ(ahead.next(), Number{5});
    EXPECT_EQ(ahead.next(), std::nullopt);
    EXPECT_TRUE(ahead.found(5, order(5)));
    EXPECT_EQ(ahead.next(), Number{6});
    EXPECT_FALSE(ahead.isScanned());
    EXPECT_TRUE(ahead.missing(6));
    EXPECT_EQ(ahead.next(), std::nullopt);
    EXPECT_TRUE(ahead.isScanned());
    ASSERT_NE(ahead.front(), nullptr);
    EXPECT_EQ(ahead.front()->number, Number{5});
}

TEST(ReadAhead, ABusThatDoesNotAnswerFinishesNoScan) {
    ReadAhead ahead = begunBehind(0);
    ahead.next();
    EXPECT_TRUE(ahead.unanswered(1));
    EXPECT_FALSE(ahead.isScanned());
    EXPECT_EQ(ahead.next(), std::nullopt);
    ahead.scanAgain();
    EXPECT_EQ(ahead.next(), Number{1});
}

TEST(ReadAhead, ANumberHeardOfStartsAScanAndALaterOneShowsAGap) {
    ReadAhead ahead = begunBehind(0);
    ahead.next();
    ahead.missing(1);
    EXPECT_FALSE(ahead.hasGap());
    ahead.expect(3);
    EXPECT_EQ(ahead.next(), Number{1});
    ahead.missing(1);
    EXPECT_TRUE(ahead.hasGap());
    EXPECT_EQ(ahead.front(), nullptr);
}

TEST(ReadAhead, ANumberHeardOfWhileReadingIsLookedForAgain) {
    ReadAhead ahead = begunBehind(0);
    EXPECT_EQ(ahead.next(), Number{1});
    ahead.expect(1);
    ahead.missing(1);
    EXPECT_EQ(ahead.next(), Number{1});
}

TEST(ReadAhead, AnAnswerThatNobodyWaitsForChangesNothing) {
    ReadAhead ahead = begunBehind(0);
    EXPECT_FALSE(ahead.found(1, order(1)));
    EXPECT_FALSE(ahead.missing(1));
    ahead.next();
    EXPECT_FALSE(ahead.found(2, order(2)));
    EXPECT_EQ(ahead.front(), nullptr);
}

TEST(ReadAhead, KeepsSoManyOrdersAndReadsTheOthersWhenTheirTurnComesNear) {
    constexpr Number kCount = ReadAhead::kMostKept + 10;
    ReadAhead ahead = begunBehind(0);
    for (Number number = 1; number <= kCount; ++number) {
        ASSERT_EQ(ahead.next(), number);
        ahead.found(number, order(number));
    }
    ASSERT_EQ(ahead.next(), kCount + 1);
    ahead.missing(kCount + 1);
    EXPECT_EQ(ahead.next(), std::nullopt);
    for (Number number = 1; number <= kCount; ++number) {
        while (const std::optional<Number> wanted = ahead.next())
            ahead.found(*wanted, order(*wanted));
        ASSERT_NE(ahead.front(), nullptr) << number;
        EXPECT_EQ(ahead.front()->number, number);
        ahead.drop(number);
    }
    EXPECT_EQ(ahead.front(), nullptr);
    EXPECT_EQ(ahead.next(), std::nullopt);
}

TEST(ReadAhead, AnOrderThatIsGoneWhenItsTurnComesNearIsAGap) {
    constexpr Number kCount = ReadAhead::kMostKept + 1;
    ReadAhead ahead = begunBehind(0);
    for (Number number = 1; number <= kCount; ++number) {
        ahead.next();
        ahead.found(number, order(number));
    }
    ahead.next();
    ahead.missing(kCount + 1);
    ahead.drop(kCount - 1);
    ASSERT_EQ(ahead.next(), kCount);
    ahead.missing(kCount);
    EXPECT_TRUE(ahead.hasGap());
    EXPECT_EQ(ahead.front(), nullptr);
}

TEST(ReadAhead, WhatIsDoneWithIsNoLongerAwaited) {
    ReadAhead ahead = begunBehind(0);
    EXPECT_EQ(ahead.next(), Number{1});
    ahead.drop(7);
    EXPECT_FALSE(ahead.found(1, order(1)));
    EXPECT_EQ(ahead.next(), Number{8});
}

}  // namespace

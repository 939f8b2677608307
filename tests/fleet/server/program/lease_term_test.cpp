#include "fleet/server/program/lease_term.h"

#include <gtest/gtest.h>

namespace {

using fleet::LeaseTerm;
using Kind = fleet::Lease::State::Kind;
using Next = fleet::LeaseTerm::Next;
using namespace std::chrono_literals;

/// With a clock of its own.
class TermOfALease : public testing::Test {
protected:
    /// An answer that comes `late` after it was asked for.
    Next answer(Kind kind, LeaseTerm::Milliseconds late = 10ms) {
        const auto asked = now_;
        now_ += late;
        return term_.judge(kind, asked, now_);
    }

    LeaseTerm term_{30s};
    LeaseTerm::Clock::time_point now_{std::chrono::hours(1000)};
};

TEST_F(TermOfALease, IsNobodysAtFirst) {
    EXPECT_FALSE(term_.isOurs(now_));
    EXPECT_EQ(answer(Kind::Unknown), Next::Stop);
}

TEST_F(TermOfALease, LastsUntilShortlyBeforeItIsOver) {
    const auto asked = now_;
    EXPECT_EQ(answer(Kind::Ours, 4s), Next::Renew);
    EXPECT_TRUE(term_.isOurs(asked + 27s));
    EXPECT_FALSE(term_.isOurs(asked + 28s)) << "counted from the question, not from the answer";
    EXPECT_EQ(term_.age(asked + 5s), 5s);
}

TEST_F(TermOfALease, IsAskedForAgainWhileTheBusIsAway) {
    EXPECT_EQ(answer(Kind::Ours), Next::Renew);
    now_ += term_.pause();
    for (int i = 0; i < 60; ++i) {
        EXPECT_EQ(answer(Kind::Unknown), Next::Repeat) << i;
        now_ += term_.pauseOfRepeats();
    }
    EXPECT_EQ(answer(Kind::Ours), Next::Renew) << "the bus was away for 15 seconds";
    EXPECT_TRUE(term_.isOurs(now_ + 27s));
}

TEST_F(TermOfALease, EndsBeforeAnotherCentreMayTakeIt) {
    const auto asked = now_;
    EXPECT_EQ(answer(Kind::Ours), Next::Renew);
    now_ += term_.pause();
    while (answer(Kind::Unknown) == Next::Repeat)
        now_ += term_.pauseOfRepeats();
    EXPECT_GE(now_, asked + 28s) << "as long as it is surely its own";
    EXPECT_LT(now_, asked + 30s) << "whoever waits takes it when it is older than this";
    EXPECT_FALSE(term_.isOurs(now_));
}

TEST_F(TermOfALease, IsOverAtOnceWhenAnotherHasIt) {
    EXPECT_EQ(answer(Kind::Ours), Next::Renew);
    EXPECT_EQ(answer(Kind::Others), Next::Stop);
    EXPECT_FALSE(term_.isOurs(now_));
    EXPECT_EQ(answer(Kind::Unknown), Next::Stop) << "and stays so";
}

TEST_F(TermOfALease, IsOverWhenTheAnswerComesTooLate) {
    EXPECT_EQ(answer(Kind::Ours, 29s), Next::Stop);
    EXPECT_FALSE(term_.isOurs(now_));
}

TEST_F(TermOfALease, LeavesTimeForSeveralTries) {
    EXPECT_LT(term_.pause() + 3 * term_.deadline() + term_.margin(), 30s);
}

}  // namespace

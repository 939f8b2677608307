#include "fleet/server/core/outcome_rule.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using fleet::judgeOutcome;
using fleet::Outcome;
using fleet::OutcomeVerdict;

Outcome ended(const std::string& state) {
    Outcome outcome;
    outcome.host = "host";
    outcome.order = "order";
    outcome.journal = "journal";
    outcome.state = state;
    return outcome;
}

TEST(OutcomeRule, TheFirstIsKept) {
    EXPECT_EQ(judgeOutcome({}, ended("done")), OutcomeVerdict::Keep);
    EXPECT_EQ(judgeOutcome({}, ended(fleet::kUnknown)), OutcomeVerdict::Keep);
}

TEST(OutcomeRule, TheSameAgainSaysNothingNew) {
    Outcome again = ended("done");
    again.number = 7;
    EXPECT_EQ(judgeOutcome(ended("done"), again), OutcomeVerdict::Ignore);
}

TEST(OutcomeRule, AnotherOneIsAConflict) {
    EXPECT_EQ(judgeOutcome(ended("done"), ended("failed")), OutcomeVerdict::Conflict);
    Outcome other = ended("done");
    other.task = "{\"id\":\"2\"}";
    EXPECT_EQ(judgeOutcome(ended("done"), other), OutcomeVerdict::Conflict);
}

TEST(OutcomeRule, MoreOrLessOfTheSameTaskIsNoConflict) {
    Outcome first = ended("interrupted");
    first.task = "{\"id\":\"2\",\"stdout\":\"...\"}";
    Outcome later = first;
    later.task = "{\"id\":\"2\",\"reason\":\"the inventory shows it\"}";
    EXPECT_EQ(judgeOutcome(first, later), OutcomeVerdict::Ignore);
}

TEST(OutcomeRule, UnknownGivesWayToARealOneWhicheverComesFirst) {
    EXPECT_EQ(judgeOutcome(ended(fleet::kUnknown), ended("failed")), OutcomeVerdict::Keep);
    EXPECT_EQ(judgeOutcome(ended("failed"), ended(fleet::kUnknown)), OutcomeVerdict::Ignore);
    EXPECT_EQ(judgeOutcome(ended(fleet::kUnknown), ended(fleet::kUnknown)), OutcomeVerdict::Ignore);
}

}  // namespace

#include "fleet/log/log.h"

#include <gtest/gtest.h>

namespace {

using fleet::lineOf;
using fleet::Priority;

TEST(FleetLog, ALineHasTheProgramsName) {
    fleet::nameProgram("zavlink");
    EXPECT_EQ(lineOf(Priority::Warning, "the bus is away", false), "zavlink: the bus is away\n");
}

TEST(FleetLog, TheSystemsJournalGetsThePriority) {
    EXPECT_EQ(lineOf(Priority::Warning, "away", true), "<4>away\n");
    EXPECT_EQ(lineOf(Priority::Error, "away", true), "<3>away\n");
}

TEST(FleetLog, WordsOfOthersMakeNoLinesAndControlNoTerminal) {
    EXPECT_EQ(lineOf(Priority::Info, "a\nzavlink: b\x1b[2J\x7f", true), "<6>a zavlink: b [2J \n");
}

TEST(FleetLog, ALineIsNeverLongerThanFourKiB) {
    const std::string line = lineOf(Priority::Info, std::string(10'000, 'x'), true);
    EXPECT_EQ(line.size(), 4096U);
    EXPECT_EQ(line.back(), '\n');
}

}  // namespace

#include "ctl/show/shell_quoted.h"

#include <gtest/gtest.h>

namespace {

TEST(ShellQuoted, IsTheWordItselfOrInQuotes) {
    EXPECT_EQ(ctl::shellQuoted("./a-b_c"), "./a-b_c");
    EXPECT_EQ(ctl::shellQuoted("a b"), "'a b'");
    EXPECT_EQ(ctl::shellQuoted("it's"), "'it'\\''s'");
    EXPECT_EQ(ctl::shellQuoted("|DEPLOYDIR|"), "'|DEPLOYDIR|'");
    EXPECT_EQ(ctl::shellQuoted(""), "''");
}

}  // namespace

#include "host/api/tasks/output_position.h"

#include <gtest/gtest.h>

namespace {

TEST(PositionInOutput, IsReadAsItIsWritten) {
    const std::string text = host::textOf({12, {3, 18446744073709551615ULL}});
    EXPECT_EQ(text, "12-3-18446744073709551615");
    const auto position = host::outputPositionIn(text);
    ASSERT_TRUE(position);
    EXPECT_EQ(host::textOf(*position), text);
}

TEST(PositionInOutput, IsNoOtherText) {
    for (const char* const text :
         {"", "-", "1", "1-2", "1-2-", "1--2-3", "-1-2-3", "1-2-3-", "1-2-3-4", "1-2-x", " 1-2-3",
          "1-2-3 ", "1-+2-3", "9223372036854775808-2-3", "1-2-18446744073709551616"}) {
        EXPECT_FALSE(host::outputPositionIn(text)) << text;
    }
}

}  // namespace

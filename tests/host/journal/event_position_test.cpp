#include "host/journal/event_position.h"

#include <gtest/gtest.h>

namespace {

TEST(EventPosition, IsReadAsItIsWritten) {
    const auto position = host::positionIn("0123456789abcdef-17");
    ASSERT_TRUE(position.has_value());
    EXPECT_EQ(position->journal, "0123456789abcdef");
    EXPECT_EQ(position->number, 17);
    EXPECT_EQ(host::textOf(*position), "0123456789abcdef-17");
    EXPECT_EQ(host::positionIn("other-journal-0")->journal, "other-journal");
}

TEST(EventPosition, OtherTextsAreNone) {
    for (const char* text : {"", "-", "17", "-17", "abc-", "abc-x", "abc-1x", "abc- 1", "abc--",
                             "abc-99999999999999999999", "abc-+1"}) {
        EXPECT_FALSE(host::positionIn(text).has_value()) << text;
    }
    EXPECT_FALSE(host::positionIn(std::string(1000, 'a') + "-1").has_value());
}

}  // namespace

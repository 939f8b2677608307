#include "text/calendar.h"

#include <gtest/gtest.h>

namespace {

using text::Date;
using text::dateOf;
using text::daysOf;

TEST(Calendar, CountsDaysFromTheBeginningOf1970) {
    EXPECT_EQ(daysOf({1970, 1, 1}), 0);
    EXPECT_EQ(daysOf({1969, 12, 31}), -1);
    EXPECT_EQ(daysOf({2000, 2, 29}), 11'016);
    EXPECT_EQ(daysOf({2000, 3, 1}), 11'017);
    EXPECT_EQ(daysOf({1600, 1, 1}), -135'140);
    EXPECT_EQ(daysOf({9999, 12, 31}), 2'932'896);
    EXPECT_EQ(daysOf({0, 1, 1}), -719'528);
}

TEST(Calendar, TellsTheDateOfEachDay) {
    Date before = dateOf(daysOf({-1, 12, 31}));
    for (std::int64_t days = daysOf({0, 1, 1}); days <= daysOf({2401, 1, 1}); ++days) {
        const Date date = dateOf(days);
        ASSERT_EQ(daysOf(date), days);
        const bool isNext = date.year == before.year && date.month == before.month
                                ? date.day == before.day + 1
                                : date.day == 1;
        ASSERT_TRUE(isNext) << days;
        before = date;
    }
    EXPECT_EQ(before.year, 2401);
}

}  // namespace

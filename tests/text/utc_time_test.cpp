#include "text/utc_time.h"

#include <gtest/gtest.h>

#include <limits>

namespace {

using std::chrono::milliseconds;
using text::utcTime;

TEST(UtcTime, IsWrittenWithMilliseconds) {
    EXPECT_EQ(utcTime(milliseconds(0)), "1970-01-01T00:00:00.000Z");
    EXPECT_EQ(utcTime(milliseconds(1'738'326'896'789)), "2025-01-31T12:34:56.789Z");
    EXPECT_EQ(utcTime(std::chrono::system_clock::time_point(milliseconds(1'738'326'896'789))),
              "2025-01-31T12:34:56.789Z");
}

TEST(UtcTime, MayBeBefore1970) {
    EXPECT_EQ(utcTime(milliseconds(-1)), "1969-12-31T23:59:59.999Z");
    EXPECT_EQ(utcTime(std::chrono::system_clock::time_point(milliseconds(-1))),
              "1969-12-31T23:59:59.999Z");
    EXPECT_EQ(utcTime(milliseconds(-11'676'096'000'000)), "1600-01-01T00:00:00.000Z");
}

TEST(UtcTime, MayBeFarAway) {
    EXPECT_EQ(utcTime(milliseconds(2'208'988'800'000)), "2040-01-01T00:00:00.000Z");
    EXPECT_EQ(utcTime(milliseconds(9'214'646'400'000)), "2262-01-01T00:00:00.000Z");
    EXPECT_EQ(utcTime(milliseconds(253'402'300'799'000)), "9999-12-31T23:59:59.000Z");
}

TEST(UtcTime, ThatHasNoFormIsTheNearestThatHas) {
    using Limits = std::numeric_limits<std::int64_t>;
    EXPECT_EQ(utcTime(milliseconds(253'402'300'800'000)), "9999-12-31T23:59:59.999Z");
    EXPECT_EQ(utcTime(milliseconds(Limits::max())), "9999-12-31T23:59:59.999Z");
    EXPECT_EQ(utcTime(milliseconds(Limits::min())), "0000-01-01T00:00:00.000Z");
}

}  // namespace

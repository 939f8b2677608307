#include "host/api/time_text.h"

#include <gtest/gtest.h>

#include "routes/bad_request.h"
#include "text/utc_time.h"

namespace {

using host::timeOf;
using routes::BadRequest;

TEST(TimeText, IsReadAsItIsWritten) {
    for (const char* text :
         {"1970-01-01T00:00:00.000Z", "2025-01-31T12:34:56.789Z", "2024-02-29T23:59:59.001Z"}) {
        EXPECT_EQ(text::utcTime(timeOf(text)), text);
    }
}

TEST(TimeText, MayHaveAFractionOfASecondOrNone) {
    EXPECT_EQ(text::utcTime(timeOf("2025-01-31T12:34:56Z")), "2025-01-31T12:34:56.000Z");
    EXPECT_EQ(text::utcTime(timeOf("2025-01-31T12:34:56.5Z")), "2025-01-31T12:34:56.500Z");
    EXPECT_EQ(text::utcTime(timeOf("2025-01-31T12:34:56.123456789Z")), "2025-01-31T12:34:56.123Z");
}

TEST(TimeText, MayBeFarAway) {
    for (const char* text : {"1969-12-31T23:59:59.999Z", "1700-01-01T00:00:00.001Z",
                             "2040-06-30T12:00:00.000Z", "2262-04-11T00:00:00.000Z"}) {
        EXPECT_EQ(text::utcTime(timeOf(text)), text);
    }
}

TEST(TimeText, ThatTheClockCannotHoldIsTheNearestThatItCan) {
    const auto earliest = timeOf("1600-01-01T00:00:00Z");
    const auto latest = timeOf("9999-12-31T23:59:59Z");
    EXPECT_EQ(text::utcTime(earliest), "1677-09-21T00:12:43.145Z");
    EXPECT_EQ(text::utcTime(latest), "2262-04-11T23:47:16.854Z");
    EXPECT_EQ(timeOf("0000-01-01T00:00:00Z"), earliest);
    EXPECT_EQ(timeOf("2262-05-01T00:00:00Z"), latest);
}

TEST(TimeText, ThatIsNoTimeInUtcIsRefused) {
    for (const char* text :
         {"", "Z", "now", "2025-01-31", "2025-01-31T12:34:56", "2025-01-31 12:34:56Z",
          "2025-01-31T12:34:56+01:00", "2025-01-31T12:34:56.Z", "2025-01-31T12:34:56.1x3Z",
          "2025-02-30T12:34:56Z", "2025-13-01T12:34:56Z", "2025-00-01T12:34:56Z",
          "2025-01-00T12:34:56Z", "2025-02-29T12:34:56Z", "2025-01-31T12:34:60Z",
          "2025-01-31T24:34:56Z", "2025-01-31T12:60:56Z", "-025-01-31T12:34:56Z",
          "2025-01-31T12:34:56ZZ"}) {
        EXPECT_THROW(timeOf(text), routes::BadRequest) << text;
    }
}

}  // namespace

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

TEST(TimeText, ThatIsNoTimeInUtcIsRefused) {
    for (const char* text :
         {"", "Z", "now", "2025-01-31", "2025-01-31T12:34:56", "2025-01-31 12:34:56Z",
          "2025-01-31T12:34:56+01:00", "2025-01-31T12:34:56.Z", "2025-01-31T12:34:56.1x3Z",
          "2025-02-30T12:34:56Z", "2025-13-01T12:34:56Z", "2025-01-31T24:34:56Z",
          "2025-01-31T12:60:56Z", "-025-01-31T12:34:56Z", "2025-01-31T12:34:56ZZ"}) {
        EXPECT_THROW(timeOf(text), routes::BadRequest) << text;
    }
}

}  // namespace

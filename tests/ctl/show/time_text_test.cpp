#include "ctl/show/time_text.h"

#include <gtest/gtest.h>

#include <ctime>

#include "support/scoped_env.h"

namespace {

using std::chrono::seconds;

/// A zone of the test's own, so that the texts do not depend on the machine.
class TimeText : public testing::Test {
protected:
    TimeText() : zone_("TZ", "TEST-2") { ::tzset(); }
    ~TimeText() override { ::tzset(); }

private:
    ScopedEnv zone_;
};

TEST_F(TimeText, IsLocalAndRelative) {
    const auto now = ctl::parseTime("2026-03-01T12:30:05Z");
    ASSERT_TRUE(now);
    EXPECT_EQ(ctl::timeText("2026-03-01T12:30:00.250Z", *now), "14:30:00, 5 s ago");
    EXPECT_EQ(ctl::timeText("2026-02-27T12:30:05Z", *now), "2026-02-27 14:30:05, 2 days ago");
    EXPECT_EQ(ctl::timeText("2026-03-01T12:31:00Z", *now), "14:31:00, 0 s ago") << "another clock";
}

TEST_F(TimeText, ThatIsNoneStaysAsItIs) {
    for (const char* text :
         {"", "now", "2026-03-01", "2026-03-01T12:30:05", "2026-03-01T12:30:05xZ"})
        EXPECT_FALSE(ctl::parseTime(text)) << text;
    EXPECT_EQ(ctl::timeText("soon\x1b", {}), "soon\\x1B");
}

TEST_F(TimeText, OfAYearBeyondTheClockStaysAsItIs) {
    for (const char* text : {"9999-12-31T23:59:59Z", "2262-06-01T00:00:00Z", "0001-01-01T00:00:00Z"}) {
        EXPECT_FALSE(ctl::parseTime(text)) << text;
        EXPECT_EQ(ctl::timeText(text, {}), text);
    }
}

TEST(SpanText, IsTheLargestUnit) {
    EXPECT_EQ(ctl::spanText(seconds(-3)), "0 s");
    EXPECT_EQ(ctl::spanText(seconds(59)), "59 s");
    EXPECT_EQ(ctl::spanText(seconds(3599)), "59 min");
    EXPECT_EQ(ctl::spanText(seconds(86399)), "23 h");
    EXPECT_EQ(ctl::spanText(seconds(86400)), "1 day");
    EXPECT_EQ(ctl::spanText(seconds(200000)), "2 days");
}

}  // namespace

#include "ctl/show/tasks/running_clock.h"

#include <gtest/gtest.h>

namespace {

using std::chrono::milliseconds;

TEST(ElapsedText, IsWholeSecondsAndMinutesFromTheFirstOn) {
    EXPECT_EQ(ctl::elapsedText(milliseconds(0)), "0 s");
    EXPECT_EQ(ctl::elapsedText(milliseconds(59'999)), "59 s");
    EXPECT_EQ(ctl::elapsedText(milliseconds(60'000)), "1 min 0 s");
    EXPECT_EQ(ctl::elapsedText(milliseconds(7'325'000)), "122 min 5 s");
}

TEST(RunningClock, ShowsNothingWithoutATerminal) {
    testing::internal::CaptureStderr();
    {
        ctl::RunningClock clock("start ux", true);
        clock.tick();
    }
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

}  // namespace

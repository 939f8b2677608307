#include "ctl/show/transfers/transfer_progress.h"

#include <gtest/gtest.h>

namespace {

TEST(BytesText, ChoosesTheUnit) {
    EXPECT_EQ(ctl::bytesText(0), "0 B");
    EXPECT_EQ(ctl::bytesText(999), "999 B");
    EXPECT_EQ(ctl::bytesText(1000), "1.0 kB");
    EXPECT_EQ(ctl::bytesText(12'345'678), "12.3 MB");
    EXPECT_EQ(ctl::bytesText(5e15), "5000.0 TB");
}

TEST(Progress, ShowsNothingWithoutATerminal) {
    testing::internal::CaptureStderr();
    {
        ctl::Progress progress(100, true);
        progress.add(100);
    }
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

}  // namespace

#include "ctl/show/page.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

TEST(Page, GoesToBothOutputsAndGivesItsStatus) {
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    EXPECT_EQ(ctl::print({"out\n", ctl::complaint("err"), ctl::kNoHost}), ctl::kNoHost);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "out\n");
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "zavctl: err\n");
}

TEST(Page, OfJsonIsOneIndentedDocument) {
    const ctl::Page page = ctl::jsonPage({{"A", 1}}, ctl::kHostReportedFailure);
    EXPECT_EQ(page.out, "{\n  \"A\": 1\n}\n");
    EXPECT_EQ(page.err, "");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

TEST(Page, OfJsonMendsTextThatIsNoValidUtf8) {
    EXPECT_EQ(ctl::jsonText({{"A", "\xff"}}), "{\n  \"A\": \"\xef\xbf\xbd\"\n}\n");
}

}  // namespace

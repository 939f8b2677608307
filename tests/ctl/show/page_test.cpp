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

TEST(Page, OfAFailureIsTheReasonAndTheWayOut) {
    const ctl::Failure failure(ctl::kHostReportedFailure, "no \x1b[2J", "Try \x07.", "products");
    const ctl::Page text = ctl::failurePage(failure, ctl::Format::Text);
    EXPECT_EQ(text.out, "");
    EXPECT_EQ(text.err, "zavctl: no \\x1B[2J\n  Try \\x07.\n");
    EXPECT_EQ(text.status, ctl::kHostReportedFailure);
    const ctl::Page asJson = ctl::failurePage(failure, ctl::Format::Json);
    EXPECT_EQ(
        nlohmann::json::parse(asJson.out),
        (nlohmann::json{{"error", "no \x1b[2J"}, {"guard", "products"}, {"hint", "Try \x07."}}));
    EXPECT_EQ(asJson.err, text.err);
}

TEST(Page, OfAFailureWithoutAWayOutIsOneLine) {
    const ctl::Failure failure(ctl::kNoHost, "gone");
    EXPECT_EQ(ctl::failurePage(failure, ctl::Format::Text).err, "zavctl: gone\n");
    EXPECT_EQ(ctl::failurePage(failure, ctl::Format::Json).out, "{\n  \"error\": \"gone\"\n}\n");
}

TEST(Page, OfJsonHasNoControlCharactersForATerminal) {
    EXPECT_EQ(ctl::jsonText({{"A", "\x7f\xc2\x9b"}}), "{\n  \"A\": \"\\u007F\\u009B\"\n}\n");
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

TEST(Page, OfAFailureHidesSecretsFromPeopleOnly) {
    const ctl::Failure failure(ctl::kNoHost, "refused: key=hunter2", "zavctl task show key=7");
    const ctl::Page page = ctl::failurePage(failure, ctl::Format::Json);
    EXPECT_EQ(page.err, "zavctl: refused: key=***\n  zavctl task show key=7\n")
        << "a way out is there to be copied";
    EXPECT_EQ(nlohmann::json::parse(page.out)["error"], "refused: key=hunter2");
}

}  // namespace

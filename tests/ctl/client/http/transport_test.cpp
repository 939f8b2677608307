#include "ctl/client/http/transport.h"

#include <gtest/gtest.h>

#include "support/scratch_dir.h"

namespace {

using ctl::refusal;

TEST(Refusal, OfAWrongRequestIsWrongUsageAndOneForNowIsAFailure) {
    for (const unsigned status : {400U, 404U, 405U, 413U}) {
        EXPECT_EQ(refusal(status, "").status(), ctl::kWrongUsage) << status;
    }
    for (const unsigned status : {403U, 409U, 429U, 500U, 503U}) {
        EXPECT_EQ(refusal(status, "").status(), ctl::kHostReportedFailure) << status;
    }
}

TEST(Refusal, ThatIsNoneIsTheAnswerOfNoHost) {
    for (const unsigned status : {100U, 204U, 302U}) {
        const ctl::Failure failure = refusal(status, R"({"error": "x"})");
        EXPECT_EQ(failure.status(), ctl::kNoHost) << status;
        EXPECT_EQ(failure.what(),
                  "the host refused the request: it answers with status " + std::to_string(status));
    }
}

TEST(Refusal, GivesTheHostsReasonElseItsStatus) {
    EXPECT_STREQ(refusal(400, R"({"error": "no such table"})").what(),
                 "the host refused the request: no such table");
    for (const char* body : {"", "<html>", "[1]", R"({"error": 7})", R"({"other": "x"})"}) {
        EXPECT_STREQ(refusal(503, body).what(), "the host refused the request: status 503") << body;
    }
}

TEST(Refusal, OfAGuardHasItsNameAndTheWayOut) {
    const ctl::Failure failure =
        refusal(409, R"({"error": "no such product", "guard": "products", "hint": "Try lz."})");
    EXPECT_EQ(failure.guard(), "products");
    EXPECT_EQ(failure.hint(), "Try lz.");
    EXPECT_EQ(refusal(409, R"({"error": "x", "hint": 7})").hint(), "");
}

/// Status and text of the failure to connect.
std::pair<int, std::string> failureToConnect(const std::string& path) {
    try {
        ctl::Transport transport(path);
    } catch (const ctl::Failure& failure) {
        return {failure.status(), failure.what()};
    }
    return {0, ""};
}

TEST(Transport, SaysWhyNoHostIsReached) {
    const ScratchDir scratch;
    const std::string path = scratch.path("none");
    EXPECT_EQ(failureToConnect(path),
              std::make_pair(int{ctl::kNoHost},
                             "no host reached at " + path + ": No such file or directory"));
    const std::string longPath = "/" + std::string(200, 'p');
    EXPECT_EQ(failureToConnect(longPath),
              std::make_pair(int{ctl::kNoHost},
                             "no host reached at " + longPath + ": File name too long"));
}

}  // namespace

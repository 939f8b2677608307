#include "fleet/operator/centre/answers.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "tests/fleet/operator/certified.h"

namespace {

using fleet::centreRefusal;
using fleet::HttpsError;
using nlohmann::json;

TEST(CentreAnswers, AreReadWithCare) {
    const json object = {{"text", "a"}, {"number", 3}, {"flag", true}, {"list", {1}}};
    EXPECT_EQ(fleet::memberText(object, "text"), "a");
    EXPECT_EQ(fleet::memberNumber(object, "number"), 3U);
    EXPECT_TRUE(fleet::memberFlag(object, "flag"));
    EXPECT_EQ(fleet::memberList(object, "list"), json::array({1}));
    for (const json& odd : {json(), json(1), json::array(), json::object(),
                            json{{"text", 1}, {"number", -1}, {"flag", "x"}, {"list", "y"}}}) {
        EXPECT_EQ(fleet::memberText(odd, "text"), "") << odd.dump();
        EXPECT_EQ(fleet::memberNumber(odd, "number"), 0U) << odd.dump();
        EXPECT_FALSE(fleet::memberFlag(odd, "flag")) << odd.dump();
        EXPECT_EQ(operator_test::failureOf([&] { fleet::memberList(odd, "list"); }).status(),
                  ctl::kNoHost)
            << odd.dump();
    }
}

TEST(CentreAnswers, ThatRefuseEndTheProgramByWhoCanMendIt) {
    EXPECT_EQ(std::string(centreRefusal(409, R"({"error":"it is over"})").what()),
              "the centre refused the request: it is over");
    EXPECT_EQ(std::string(centreRefusal(500, "oops").what()),
              "the centre refused the request: status 500");
    for (const unsigned status : {401U, 403U, 409U, 429U, 503U})
        EXPECT_EQ(centreRefusal(status, "").status(), ctl::kHostReportedFailure) << status;
    for (const unsigned status : {400U, 404U, 413U})
        EXPECT_EQ(centreRefusal(status, "").status(), ctl::kWrongUsage) << status;
    EXPECT_EQ(centreRefusal(302, "").status(), ctl::kNoHost);
}

TEST(CentreAnswers, ThatDoNotComeAreATimeOutOrNoCentre) {
    EXPECT_EQ(fleet::centreFailure({HttpsError::Kind::TooLate, ""}).status(), ctl::kNoOutcome);
    EXPECT_EQ(fleet::centreFailure({HttpsError::Kind::NotTrusted, ""}).status(), ctl::kNoHost);
}

}  // namespace

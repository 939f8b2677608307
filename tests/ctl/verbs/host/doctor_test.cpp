#include "ctl/verbs/host/doctor.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Failure;
using ctl::Format;
using ctl::showChecks;
using nlohmann::json;

json check(const std::string& result, const std::string& remedy = "") {
    return {{"check", "home"}, {"result", result}, {"text", "/opt/home"}, {"remedy", remedy}};
}

TEST(Doctor, ShowsALinePerCheckWithItsRemedy) {
    const ctl::Page page =
        showChecks(json::array({check("ok"), check("warning", "mend it")}), Format::Text);
    EXPECT_EQ(page.out,
              "ok       home          /opt/home\n"
              "warning  home          /opt/home; mend it\n");
    EXPECT_EQ(page.status, ctl::kSuccess);
}

TEST(Doctor, EndsWithStatusOneOnAnError) {
    const json checks = json::array({check("error", "mend it"), check("ok")});
    EXPECT_EQ(showChecks(checks, Format::Text).status, ctl::kHostReportedFailure);
    EXPECT_EQ(showChecks(checks, Format::Json).status, ctl::kHostReportedFailure);
    EXPECT_EQ(json::parse(showChecks(checks, Format::Json).out), checks);
}

TEST(Doctor, DoesNotBelieveWhatIsNoListOfChecks) {
    for (const json& document : {json::object(), json::array({1}), json::array({json::object()}),
                                 json::array({{{"check", 1}}})}) {
        EXPECT_THROW(showChecks(document, Format::Text), Failure) << document.dump();
    }
}

TEST(Doctor, ShowsControlCharactersEscaped) {
    json odd = check("ok");
    odd["text"] = "\x1b[2J";
    EXPECT_EQ(showChecks(json::array({odd}), Format::Text).out,
              "ok       home          \\x1B[2J\n");
}

}  // namespace

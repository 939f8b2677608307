#include "fleet/operator/verbs/looks/fleet_doctor.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

namespace {

using ctl::Format;
using fleet::HostAnswer;
using nlohmann::json;

json check(const std::string& result, const std::string& name, const std::string& remedy = "") {
    return {{"result", result}, {"check", name}, {"text", name + " was seen"}, {"remedy", remedy}};
}

HostAnswer answerOf(const std::string& name, const std::vector<json>& checks) {
    return {{"key", name, "here"}, json(checks), ""};
}

TEST(ChecksOfManyHosts, ShowTheWorstFirstAndLeaveOutWhatIsInOrder) {
    const ctl::Page page = fleet::showFleetChecks(
        {answerOf("web-1", {check("ok", "shell")}),
         answerOf("web-2", {check("ok", "shell"), check("warning", "disk")}),
         answerOf("web-3", {check("warning", "disk"), check("error", "plugin", "install it")}),
         answerOf("web-4", {check("ok", "shell")})},
        Format::Text);
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    EXPECT_EQ(page.err, "");
    EXPECT_EQ(page.out,
              "HOST   RESULT   CHECK   FOUND\n"
              "web-3  error    plugin  plugin was seen; install it\n"
              "web-3  warning  disk    disk was seen\n"
              "web-2  warning  disk    disk was seen\n"
              "Everything is in order on: web-1, web-4\n");
}

TEST(ChecksOfManyHosts, AreNoFailureForWarnings) {
    EXPECT_EQ(fleet::showFleetChecks({answerOf("web-1", {check("warning", "disk")})}, Format::Text)
                  .status,
              ctl::kSuccess);
    EXPECT_EQ(fleet::showFleetChecks({answerOf("web-1", {check("ok", "disk")})}, Format::Text).out,
              "Everything is in order on: web-1\n");
}

TEST(ChecksOfManyHosts, AreAFailureWhereThereAreNone) {
    const ctl::Page page =
        fleet::showFleetChecks({{{"key", "web-1", "away"}, nullptr, "it is away"},
                                answerOf("web-2", {7}),
                                answerOf("web-3", {})},
                               Format::Text);
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    EXPECT_EQ(page.err,
              "zavctl: web-1: it is away\nzavctl: web-2: its answer makes no sense\n"
              "zavctl: web-3: its answer makes no sense\n");
}

TEST(ChecksOfManyHosts, AreADocumentWithAllOfThem) {
    const ctl::Page page =
        fleet::showFleetChecks({answerOf("web-1", {check("ok", "shell"), check("error", "disk")}),
                                {{"key", "web-2", "away"}, nullptr, "it is away"}},
                               Format::Json);
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    EXPECT_EQ(
        json::parse(page.out),
        (json{{"hosts",
               {{{"host", "web-1"}, {"checks", {check("error", "disk"), check("ok", "shell")}}},
                {{"host", "web-2"}, {"error", "it is away"}}}}}));
}

}  // namespace

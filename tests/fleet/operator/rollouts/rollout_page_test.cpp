#include "fleet/operator/rollouts/rollout_page.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "tests/fleet/operator/certified.h"
#include "tests/fleet/operator/rollouts/rollout_documents.h"

namespace {

using ctl::Format;
using fleet::progressText;
using nlohmann::json;
using operator_test::rolloutIn;

/// Twelve minutes after the documents' times.
ctl::WallTime later() {
    return *ctl::parseTime("2026-03-01T12:12:00.000Z");
}

TEST(RolloutPage, CountsWhatHasBecomeOfTheHosts) {
    EXPECT_EQ(progressText(rolloutIn("running", {{"done", 1}, {"failed", 1}}, 1, 1)),
              "2 of 4 over: 1 done, 1 failed; 1 under way; 1 waiting");
    EXPECT_EQ(progressText(rolloutIn("finished", {{"done", 4}}, 0, 0)), "4 of 4 over: 4 done");
    EXPECT_EQ(progressText(rolloutIn("running", json::object(), 0, 4)), "0 of 4 over; 4 waiting");
}

TEST(RolloutPage, SaysWhomItIsWaitingFor) {
    json rollout = rolloutIn("running", {{"done", 1}}, 3, 0);
    rollout["away"] = 1;
    EXPECT_EQ(progressText(rollout),
              "1 of 4 over: 1 done; 3 under way; waiting for 1 host that is away");
    rollout["away"] = 3;
    rollout["unconfirmed"] = 2;
    rollout["expired"] = 1;
    EXPECT_EQ(progressText(rollout),
              "1 of 4 over: 1 done; 3 under way; waiting for 3 hosts that are away; 2 expired, not "
              "confirmed; 1 to be signed anew");
}

TEST(RolloutPage, ShowsAFailureWithoutSecretsAndControls) {
    EXPECT_EQ(fleet::failureText(operator_test::failedPart("web-1", "1")),
              "web-1: failed, no disk");
    EXPECT_EQ(fleet::failureText({{"host", "UA"}, {"state", "unknown"}}), "UA: unknown");
    EXPECT_EQ(fleet::failureText(
                  {{"name", "\x1b[2J"}, {"state", "failed"}, {"reason", "password=geheim"}}),
              "\\x1B[2J: failed, password=***");
}

TEST(RolloutPage, EndsWellOnlyIfAllHostsHaveDoneIt) {
    const auto statusOf = [](const json& rollout) {
        return fleet::showEnd(rollout, json::array(), Format::Text).status;
    };
    EXPECT_EQ(statusOf(rolloutIn("finished", {{"done", 4}}, 0, 0)), ctl::kSuccess);
    EXPECT_EQ(statusOf(rolloutIn("finished", {{"done", 3}}, 1, 0)), ctl::kHostReportedFailure);
    EXPECT_EQ(statusOf(rolloutIn("finished", {{"done", 3}, {"expired", 1}}, 0, 0)),
              ctl::kHostReportedFailure);
    EXPECT_EQ(statusOf(rolloutIn("paused", {{"done", 4}}, 0, 0)), ctl::kHostReportedFailure);
    EXPECT_EQ(statusOf(json::object()), ctl::kHostReportedFailure);
}

TEST(RolloutPage, TellsHowAPausedOneGoesOn) {
    json rollout = rolloutIn("paused", {{"failed", 1}}, 0, 3);
    rollout["reason"] = "1 failure, and none is allowed";
    EXPECT_EQ(fleet::showEnd(rollout, json::array(), Format::Text).out,
              "The roll-out is paused: 1 failure, and none is allowed.\n"
              "1 of 4 over: 1 failed; 3 waiting\n"
              "zavctl rollout resume 0123456789abcdef0123456789abcdef lets it go on, zavctl "
              "rollout abort 0123456789abcdef0123456789abcdef ends it.\n");
}

TEST(RolloutPage, IsOneDocumentAsJson) {
    const json rollout = rolloutIn("finished", {{"done", 3}, {"failed", 1}}, 0, 0);
    const json failures = {operator_test::failedPart("web-1", "1")};
    EXPECT_EQ(json::parse(fleet::showEnd(rollout, failures, Format::Json).out),
              (json{{"rollout", rollout}, {"failures", failures}}));
    EXPECT_EQ(json::parse(fleet::showRollout(rollout, failures, later(), Format::Json).out),
              (json{{"rollout", rollout}, {"failures", failures}}));
}

TEST(RolloutPage, ShowsAllAboutOne) {
    const json failures = json::array({operator_test::failedPart("web-1", "1")});
    const std::string text =
        fleet::showRollout(rolloutIn("running", {{"done", 1}, {"failed", 1}}, 1, 1), failures,
                           later(), Format::Text)
            .out;
    EXPECT_NE(text.find("roll-out   0123456789abcdef0123456789abcdef\n"
                        "does       START ux\n"
                        "on         env=test\n"
                        "made by    mary\n"),
              std::string::npos)
        << text;
    EXPECT_NE(text.find(", 12 min ago\n"), std::string::npos) << text;
    EXPECT_NE(
        text.find("plan       waves 1,100%, at most 0 failures, a pause of 1 min between them\n"
                  "state      running\n"),
        std::string::npos)
        << text;
    EXPECT_NE(text.find("wave 1     2 of 4 over: 1 done, 1 failed; 1 under way; 1 waiting\n"
                        "failures:\n  web-1: failed, no disk\n"),
              std::string::npos)
        << text;
}

TEST(RolloutPage, ListsTheLatest) {
    const json answer = {{"rollouts", json::array({rolloutIn("finished", {{"done", 4}}, 0, 0)})}};
    const std::string text = fleet::showRollouts(answer, later(), Format::Text).out;
    EXPECT_NE(text.find("0123456789abcdef0123456789abcdef  START ux  finished  4/4"),
              std::string::npos)
        << text;
    EXPECT_EQ(fleet::showRollouts({{"rollouts", json::array()}}, later(), Format::Text).out,
              "There are no roll-outs.\n");
    EXPECT_EQ(operator_test::failureOf([&] {
                  fleet::showRollouts(json::object(), later(), Format::Text);
              }).status(),
              ctl::kNoHost);
}

}  // namespace

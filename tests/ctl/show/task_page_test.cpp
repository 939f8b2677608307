#include "ctl/show/task_page.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using ctl::Page;
using ctl::TaskResult;
using nlohmann::json;
using std::chrono::seconds;

const json kAccepted = {{"TRANSID", "T"}, {"RETVAL", 0}};
const json kDone = {{"TRANSID", "T"}, {"RETVAL", 0}, {"RETMSGID", ""}};
const json kFailed = {{"RETVAL", 1024}, {"RETMSGID", "ZAV1024E"}, {"RETMSGPARM", "cmd"}};
const json kRefused = {{"RETVAL", 1003}, {"RETMSGID", "ZAV1003E"}};

TaskResult outcome(const json& row) {
    return {TaskResult::End::Outcome, kAccepted, json::array({row}), seconds(3)};
}

TEST(TaskPage, SaysWhetherTheCommandWasAccepted) {
    EXPECT_EQ(ctl::replyLine("start ux", kAccepted), "start ux: accepted\n");
    EXPECT_EQ(ctl::replyLine("start ux", kRefused),
              "start ux: refused; ZAV1003E: the request names no product\n");
}

TEST(TaskPage, SaysHowAndAfterWhatTimeTheTaskEnded) {
    const Page done = ctl::showTask("start ux", outcome(kDone), Format::Text);
    EXPECT_EQ(done.out, "start ux: done after 3 s\n");
    EXPECT_EQ(done.status, ctl::kSuccess);
    const Page failed = ctl::showTask("start ux", outcome(kFailed), Format::Text);
    EXPECT_EQ(failed.out,
              "start ux: failed after 3 s; ZAV1024E: the start or stop command ended with a bad "
              "return code [cmd]\n");
    EXPECT_EQ(failed.status, ctl::kHostReportedFailure);
}

TEST(TaskPage, ShowsTheMessageOfASuccess) {
    const json row = {{"RETVAL", 0}, {"RETMSGID", "ZAV1027E"}, {"RETMSGPARM", ""}};
    EXPECT_EQ(ctl::outcomeLine("restart ux", row, seconds(61)),
              "restart ux: done after 1 min 1 s; ZAV1027E: the agent instance could not be "
              "stopped\n");
}

TEST(TaskPage, HasNothingToAddToAReplyThatNobodyWaitsBehind) {
    const Page accepted = ctl::showTask(
        "start ux", {TaskResult::End::Accepted, kAccepted, json::array(), {}}, Format::Text);
    EXPECT_EQ(accepted.out + accepted.err, "");
    EXPECT_EQ(accepted.status, ctl::kSuccess);
    const Page refused = ctl::showTask(
        "start ux", {TaskResult::End::Refused, kRefused, json::array(), {}}, Format::Text);
    EXPECT_EQ(refused.out + refused.err, "");
    EXPECT_EQ(refused.status, ctl::kHostReportedFailure);
}

TEST(TaskPage, SaysWhyThereIsNoOutcome) {
    const Page gone = ctl::showTask(
        "start ux", {TaskResult::End::HostGone, kAccepted, json::array(), {}}, Format::Text);
    EXPECT_EQ(gone.out, "");
    EXPECT_EQ(gone.err, "zavctl: the host went away before the outcome came\n");
    EXPECT_EQ(gone.status, ctl::kNoHost);
    const Page late = ctl::showTask(
        "start ux", {TaskResult::End::TimedOut, kAccepted, json::array(), {}}, Format::Text);
    EXPECT_EQ(late.err, "zavctl: no outcome within the time-out\n");
    EXPECT_EQ(late.status, ctl::kNoOutcome);
}

TEST(TaskPage, IsOneDocumentAsJsonHoweverTheCommandEnded) {
    const Page done = ctl::showTask("start ux", outcome(kDone), Format::Json);
    EXPECT_EQ(json::parse(done.out), (json{{"reply", kAccepted}, {"events", {kDone}}}));
    EXPECT_EQ(done.status, ctl::kSuccess);
    const Page gone = ctl::showTask(
        "start ux", {TaskResult::End::HostGone, kAccepted, json::array(), {}}, Format::Json);
    EXPECT_EQ(json::parse(gone.out), (json{{"reply", kAccepted}, {"events", json::array()}}));
    EXPECT_EQ(gone.err, "zavctl: the host went away before the outcome came\n");
    EXPECT_EQ(gone.status, ctl::kNoHost);
}

TEST(TaskPage, OfACommandThatIsAnsweredAtOnceIsItsRow) {
    const Page text = ctl::showOutcome("complete-install", kFailed, seconds(0), Format::Text);
    EXPECT_EQ(text.out.rfind("complete-install: failed after 0 s; ZAV1024E: ", 0), 0U);
    EXPECT_EQ(text.status, ctl::kHostReportedFailure);
    const Page asJson = ctl::showOutcome("complete-install", kFailed, seconds(0), Format::Json);
    EXPECT_EQ(json::parse(asJson.out), kFailed);
    EXPECT_EQ(asJson.status, ctl::kHostReportedFailure);
}

}  // namespace

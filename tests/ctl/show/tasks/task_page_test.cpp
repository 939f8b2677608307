#include "ctl/show/tasks/task_page.h"

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
    TaskResult result;
    result.end = TaskResult::End::Outcome;
    result.reply = kAccepted;
    result.events = json::array({row});
    result.elapsed = seconds(3);
    return result;
}

TEST(TaskPage, SaysWhetherTheCommandWasAccepted) {
    EXPECT_EQ(ctl::replyLine("start ux", kAccepted), "start ux: accepted\n");
    EXPECT_EQ(ctl::replyLine("start ux", kRefused),
              "start ux: refused; ZAV1003E: the request names no product\n");
    EXPECT_EQ(ctl::replyLine("start ux", nullptr), "start ux: accepted\n") << "still to come";
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

/// A record of a task in that state that ran one command.
json record(const char* state, const json& command) {
    return {{"id", "1"},
            {"state", state},
            {"reply", nullptr},
            {"events", json::array()},
            {"details", {{"commands", {command}}}}};
}

TaskResult withRecord(const json& row, const json& kept) {
    TaskResult result = outcome(row);
    result.record = kept;
    return result;
}

const json kKilled = {{"command", "run"}, {"signal", 9}, {"stdout", "half"}};

TEST(TaskPage, OfAFailureHasTheCommandItsEndAndItsLastLines) {
    const json command = {{"command", "run"}, {"exit", 3}, {"stderr", "no space\n"}};
    const Page page =
        ctl::showTask("start ux", withRecord(kFailed, record("failed", command)), Format::Text);
    EXPECT_EQ(page.out,
              "start ux: failed after 3 s; ZAV1024E: the start or stop command ended with a bad "
              "return code [cmd]\n"
              "  command: run\n  end:     exit code 3\n  standard error:\n    no space\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

TEST(TaskPage, ShowsASuccessThatIsNone) {
    const Page page =
        ctl::showTask("start ux", withRecord(kDone, record("failed", kKilled)), Format::Text);
    EXPECT_EQ(page.out,
              "start ux: reported as done, but the command was killed by signal 9\n"
              "  command: run\n  end:     killed by signal 9\n  standard output:\n    half\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

TEST(TaskPage, TakesTheHostsWordForWhatIsAFailure) {
    // Without guards the host counts a killed command as the plug-in does.
    EXPECT_EQ(ctl::faultOf(record("done", kKilled)), "");
    EXPECT_EQ(ctl::faultOf(record("failed", {{"error", "No such file"}})),
              "the command could not be run: No such file");
    EXPECT_EQ(ctl::faultOf(record("failed", {{"exit", 0}})), "the host counts it as failed");
    EXPECT_EQ(ctl::faultOf(json{{"state", "failed"}}), "the host counts it as failed");
    EXPECT_EQ(ctl::faultOf(json()), "");
    const Page page =
        ctl::showTask("start ux", withRecord(kDone, record("done", kKilled)), Format::Text);
    EXPECT_EQ(page.out, "start ux: done after 3 s\n");
}

TEST(TaskPage, HasTheRecordAsTaskAndDetailsInItsDocument) {
    const json kept = record("failed", kKilled);
    const Page page = ctl::showTask("start ux", withRecord(kDone, kept), Format::Json);
    EXPECT_EQ(json::parse(page.out), (json{{"reply", kAccepted},
                                           {"events", {kDone}},
                                           {"task", {{"id", "1"}, {"state", "failed"}}},
                                           {"details", {{"commands", {kKilled}}}}}));
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

TEST(TaskPage, SaysWhatALookAfterwardsFound) {
    TaskResult result = outcome(kDone);
    result.doubt = "ux is still there";
    const Page doubted = ctl::showTask("uninstall ux", result, Format::Text);
    EXPECT_EQ(doubted.out, "uninstall ux: done after 3 s\n");
    EXPECT_EQ(doubted.err, "zavctl: uninstall ux: ux is still there\n");
    EXPECT_EQ(doubted.status, ctl::kHostReportedFailure);
    EXPECT_EQ(json::parse(ctl::showTask("uninstall ux", result, Format::Json).out)["doubt"],
              "ux is still there");
    result.doubt.clear();
    result.note = "not verified";
    const Page noted = ctl::showTask("uninstall ux", result, Format::Text);
    EXPECT_EQ(noted.err, "zavctl: note: not verified\n");
    EXPECT_EQ(noted.status, ctl::kSuccess);
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
    EXPECT_EQ(late.err,
              "zavctl: no outcome within the time-out\n"
              "  zavctl task show T tells how it ended\n");
    EXPECT_EQ(late.status, ctl::kNoOutcome);
}

/// A task that ended in a way that no row tells.
TaskResult over(const json& kept) {
    TaskResult result;
    result.end = TaskResult::End::Over;
    result.record = kept;
    result.elapsed = seconds(3);
    return result;
}

TEST(TaskPage, TellsInWordsOfEndsWithoutARow) {
    const std::pair<json, std::string> cases[] = {
        {{{"state", "cancelled"}}, "install ux: cancelled after 3 s\n"},
        {{{"state", "expired"}}, "install ux: expired after 3 s; its turn came too late\n"},
        {{{"state", "interrupted"}, {"reason", "the power failed"}},
         "install ux: interrupted after 3 s; the power failed\n"},
        {{{"state", "interrupted"}},
         "install ux: interrupted after 3 s; the host ended in the middle of it: it may have run "
         "in "
         "part\n"},
        {{{"state", "refused"}, {"reason", "no such product"}, {"hint", "Push it."}},
         "install ux: refused after 3 s; no such product\n  Push it.\n"}};
    for (const auto& [kept, words] : cases) {
        const Page page = ctl::showTask("install ux", over(kept), Format::Text);
        EXPECT_EQ(page.out, words);
        EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    }
    EXPECT_EQ(ctl::showTask("install ux", over({{"state", "done"}}), Format::Text).status,
              ctl::kSuccess);
}

TEST(TaskPage, ShowsTheCommandsOfATaskThatWasCutOff) {
    const Page page =
        ctl::showTask("install ux", over(record("interrupted", kKilled)), Format::Text);
    EXPECT_NE(page.out.find("  command: run\n  end:     killed by signal 9\n"), std::string::npos)
        << page.out;
}

TEST(TaskPage, OfAnInstallThatRestartedTheHostIsItsOwnResult) {
    TaskResult result = outcome(kDone);
    result.completion = kFailed;
    const Page text = ctl::showTask("install ux", result, Format::Text);
    EXPECT_EQ(text.out.rfind("install ux: failed after 3 s; ZAV1024E: ", 0), 0U) << text.out;
    EXPECT_EQ(text.status, ctl::kHostReportedFailure);
    const Page asJson = ctl::showTask("install ux", result, Format::Json);
    EXPECT_EQ(json::parse(asJson.out),
              (json{{"reply", kAccepted}, {"events", {kDone}}, {"completion", kFailed}}));
    EXPECT_EQ(asJson.status, ctl::kHostReportedFailure);
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

#include "ctl/verbs/tasks/task_wait.h"

#include <gtest/gtest.h>

namespace {

using ctl::Format;
using ctl::TaskResult;
using nlohmann::json;

TaskResult result(TaskResult::End end, const char* state) {
    TaskResult made;
    made.end = end;
    made.record = {{"id", "j-1"},
                   {"transid", "deploy-7"},
                   {"command", "START"},
                   {"product", "ux"},
                   {"state", state},
                   {"accepted", "2026-03-01T11:55:00Z"},
                   {"ended", "2026-03-01T11:55:09Z"}};
    made.elapsed = std::chrono::seconds(2);
    return made;
}

TEST(TaskWait, EndsAsTheVerbWouldAndTellsTheTasksOwnTime) {
    TaskResult done = result(TaskResult::End::Outcome, "done");
    done.events = {{{"RETVAL", 0}}};
    const ctl::Page page = ctl::showAwaited(done, Format::Text);
    EXPECT_EQ(page.out, "start ux (deploy-7): done after 9 s\n");
    EXPECT_EQ(page.status, ctl::kSuccess);
    const ctl::Page cut =
        ctl::showAwaited(result(TaskResult::End::Over, "cancelled"), Format::Text);
    EXPECT_EQ(cut.out, "start ux (deploy-7): cancelled after 9 s\n");
    EXPECT_EQ(cut.status, ctl::kHostReportedFailure);
    EXPECT_EQ(ctl::showAwaited(result(TaskResult::End::TimedOut, "queued"), Format::Text).status,
              ctl::kNoOutcome);
}

TEST(TaskWait, SaysWhyATaskWasRefused) {
    TaskResult refused = result(TaskResult::End::Refused, "refused");
    refused.reply = {{"RETVAL", 1003}, {"RETMSGID", "ZAV1003E"}};
    const ctl::Page page = ctl::showAwaited(refused, Format::Text);
    EXPECT_EQ(page.out, "start ux (deploy-7): refused; ZAV1003E: the request names no product\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

TEST(TaskWait, GivesTheVerbsDocument) {
    TaskResult done = result(TaskResult::End::Outcome, "done");
    done.events = {{{"RETVAL", 0}}};
    const json document = json::parse(ctl::showAwaited(done, Format::Json).out);
    EXPECT_EQ(document["events"], done.events);
    EXPECT_EQ(document["task"]["id"], "j-1");
}

}  // namespace

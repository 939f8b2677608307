#include "ctl/verbs/tasks/task_cancel.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

json task(const char* state) {
    return {{"id", "j-1"}, {"command", "START"}, {"product", "ux"}, {"state", state}};
}

TEST(TaskCancel, IsASuccessOnlyIfTheTaskIsCancelled) {
    const ctl::Page done = ctl::showCancelled(task("cancelled"), Format::Text);
    EXPECT_EQ(done.out, "start ux (j-1): cancelled\n");
    EXPECT_EQ(done.status, ctl::kSuccess);
    const ctl::Page late = ctl::showCancelled(task("done"), Format::Text);
    EXPECT_EQ(late.out, "");
    EXPECT_EQ(late.err, "zavctl: start ux (j-1): too late, it is done\n");
    EXPECT_EQ(late.status, ctl::kHostReportedFailure);
    EXPECT_EQ(ctl::showCancelled(task("running"), Format::Text).status, ctl::kNoOutcome);
}

TEST(TaskCancel, GivesTheTaskAsADocument) {
    const ctl::Page page = ctl::showCancelled(task("failed"), Format::Json);
    EXPECT_EQ(json::parse(page.out), task("failed"));
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

}  // namespace

#include "ctl/verbs/commands/complete_install.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using ctl::showFetchedOutcome;
using nlohmann::json;

const json kDone = {{"RETVAL", 0}};
const json kFailed = {{"RETVAL", 1031}, {"RETMSGID", "ZAV1031E"}};
const json kRecord = {
    {"details", {{"commands", {{{"command", "sh rc"}, {"exit", 3}, {"stderr", "no"}}}}}}};

ctl::Page shown(const json& row, const json& record, Format format) {
    return showFetchedOutcome("complete-install (T)", row, record, std::chrono::seconds(3), format);
}

TEST(CompleteInstall, SaysHowTheInstallEnded) {
    const ctl::Page page = shown(kDone, nullptr, Format::Text);
    EXPECT_EQ(page.out, "complete-install (T): done after 3 s\n");
    EXPECT_EQ(page.status, ctl::kSuccess);
}

TEST(CompleteInstall, OfAFailureComesWithItsCommands) {
    const ctl::Page page = shown(kFailed, kRecord, Format::Text);
    EXPECT_EQ(page.out,
              "complete-install (T): failed after 3 s; ZAV1031E: the install command ended with a "
              "bad return code\n"
              "  command: sh rc\n  end:     exit code 3\n  standard error:\n    no\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    EXPECT_EQ(shown(kFailed, nullptr, Format::Text).status, ctl::kHostReportedFailure);
}

TEST(CompleteInstall, IsTheReplyAsJsonWithTheCommandsOfAFailureBesideIt) {
    EXPECT_EQ(json::parse(shown(kDone, nullptr, Format::Json).out), kDone);
    json expected = kFailed;
    expected["details"] = kRecord["details"];
    EXPECT_EQ(json::parse(shown(kFailed, kRecord, Format::Json).out), expected);
    EXPECT_EQ(shown(kFailed, kRecord, Format::Json).status, ctl::kHostReportedFailure);
}

}  // namespace

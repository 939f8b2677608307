#include "ctl/verbs/tasks/install.h"

#include <gtest/gtest.h>

namespace {

using ctl::CompletedInstall;
using ctl::Format;
using ctl::joinedCommand;
using ctl::Page;
using ctl::TaskResult;
using nlohmann::json;

const json kAccepted = {{"RETVAL", 0}};
const json kFailed = {{"RETVAL", 1031}, {"RETMSGID", "ZAV1031E"}, {"RETMSGPARM", "3"}};

TEST(InstallCommand, KeepsAWordWithBlanksOneWord) {
    EXPECT_EQ(joinedCommand({"/bin/sh", "-c", "exit 3"}), "/bin/sh -c \"exit 3\"");
    EXPECT_EQ(joinedCommand({"a", "b"}), "a b");
}

TEST(InstallCommand, LeavesQuotesThatAreThereToGroupWhatTheyDo) {
    EXPECT_EQ(joinedCommand({"run", "'d e'", "\"f g\"", "h\\ i"}), "run 'd e' \"f g\" h\\ i");
}

TEST(InstallCommand, IsASingleWordAsItStands) {
    EXPECT_EQ(joinedCommand({"/bin/sh -c 'exit 3'"}), "/bin/sh -c 'exit 3'");
    EXPECT_EQ(joinedCommand({"run it"}), "run it");
}

TEST(CompletedInstall, EndsAsTheInstallItselfDid) {
    const CompletedInstall install = {
        {TaskResult::End::Outcome, kAccepted, json::array({kAccepted}), std::chrono::seconds(9)},
        kFailed};
    const Page text = ctl::showCompletedInstall("install ux", install, Format::Text);
    EXPECT_EQ(text.out,
              "install ux: failed after 9 s; ZAV1031E: the install command ended with a bad return "
              "code [3]\n");
    EXPECT_EQ(text.status, ctl::kHostReportedFailure);
    const Page asJson = ctl::showCompletedInstall("install ux", install, Format::Json);
    EXPECT_EQ(json::parse(asJson.out),
              (json{{"reply", kAccepted}, {"events", {kAccepted}}, {"completion", kFailed}}));
    EXPECT_EQ(asJson.status, ctl::kHostReportedFailure);
}

TEST(CompletedInstall, ThatWasRefusedHasNoCompletion) {
    const CompletedInstall install = {{TaskResult::End::Refused, kFailed, json::array(), {}}, {}};
    const Page text = ctl::showCompletedInstall("install ux", install, Format::Text);
    EXPECT_EQ(text.out.rfind("install ux: refused; ZAV1031E: ", 0), 0U);
    EXPECT_EQ(text.status, ctl::kHostReportedFailure);
    const Page asJson = ctl::showCompletedInstall("install ux", install, Format::Json);
    EXPECT_EQ(json::parse(asJson.out), (json{{"reply", kFailed}, {"events", json::array()}}));
}

TEST(CompletedInstall, ThatDidNotBeginHasNoCompletion) {
    const CompletedInstall install = {
        {TaskResult::End::Outcome, kAccepted, json::array({kFailed}), std::chrono::seconds(1)}, {}};
    const Page text = ctl::showCompletedInstall("install ux", install, Format::Text);
    EXPECT_EQ(text.out.rfind("install ux: failed after 1 s; ZAV1031E: ", 0), 0U);
    EXPECT_EQ(text.status, ctl::kHostReportedFailure);
}

}  // namespace

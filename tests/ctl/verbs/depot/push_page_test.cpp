#include "ctl/verbs/depot/push_page.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using ctl::Page;
using ctl::PushReport;
using nlohmann::json;

TEST(Push, SaysHowMuchWentAndHowFast) {
    const Page one = ctl::showPush({{{"a", "ux/a", 5000, 5000, {}}}, 0.5}, Format::Text);
    EXPECT_EQ(one.out, "push ux/a: done; 5.0 kB in 0.50 s, 10.0 kB/s\n");
    EXPECT_EQ(one.status, ctl::kSuccess);
    const Page two =
        ctl::showPush({{{"a", "a", 100, 100, {}}, {"b", "b", 200, 200, {}}}, 1}, Format::Text);
    EXPECT_EQ(two.out, "push 2 files: done; 300 B in 1.00 s, 300 B/s\n");
}

TEST(Push, OfNoTimeAtAllHasARate) {
    EXPECT_EQ(ctl::showPush({{{"a", "a", 1, 1, {}}}, 0}, Format::Text).out,
              "push a: done; 1 B in 0.00 s, 1.0 MB/s\n");
}

TEST(Push, NamesTheFilesThatWereNotTaken) {
    const PushReport report = {{{"a", "a", 10, 10, {}}, {"b", "b", 10, 0, {4, 0}}}, 1};
    const Page page = ctl::showPush(report, Format::Text);
    EXPECT_EQ(page.out,
              "b: the host could not open the file\n"
              "push 2 files: failed; 1 of 2 not taken\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

TEST(Push, ListsEveryFileAsJson) {
    const PushReport report = {{{"a", "a", 10, 10, {}}, {"b", "b", 10, 4, {5, 0}}}, 2};
    const Page page = ctl::showPush(report, Format::Json);
    EXPECT_EQ(
        json::parse(page.out),
        (json{{"files",
               {{{"name", "a"}, {"bytes", 10}, {"status", 0}, {"fault", 0}, {"meaning", "done"}},
                {{"name", "b"},
                 {"bytes", 4},
                 {"status", 5},
                 {"fault", 0},
                 {"meaning", "the host could not write the file"}}}},
              {"bytes", 14},
              {"seconds", 2.0}}));
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

/// A file that arrived, with its checksum.
ctl::PushedFile arrived(const std::string& name, const std::string& sum) {
    ctl::PushedFile file;
    file.name = name;
    file.size = file.sent = file.kept = 10;
    file.sha256 = file.arrived = sum;
    return file;
}

TEST(Push, CountsWhatIsVerified) {
    PushReport report;
    report.files = {arrived("a", "aa"), arrived("b", "bb")};
    report.seconds = 1;
    report.verification = ctl::Verification::Done;
    EXPECT_EQ(ctl::showPush(report, Format::Text).out,
              "push 2 files: done; 20 B in 1.00 s, 20 B/s\nverified: 2 files, 20 bytes\n");
    EXPECT_EQ(json::parse(ctl::showPush(report, Format::Json).out)["verified"], true);
    report.showsSums = true;
    EXPECT_EQ(ctl::showPush(report, Format::Text).out.rfind("aa  a\nbb  b\npush ", 0), 0U);
}

TEST(Push, IsAFailureWhenAFileIsNotInTheDepotAsItWasSent) {
    PushReport report;
    report.files = {arrived("a", "aa"), arrived("b", "bb")};
    report.files[1].problem = "it changed";
    report.files[1].guard = "depot-verify";
    report.verification = ctl::Verification::Done;
    const Page page = ctl::showPush(report, Format::Text);
    EXPECT_EQ(page.out, "b: it changed\npush 2 files: failed; 1 of 2 not verified\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    const json document = json::parse(ctl::showPush(report, Format::Json).out);
    EXPECT_EQ(document["verified"], false);
    EXPECT_EQ(document["files"][1]["guard"], "depot-verify");
    EXPECT_EQ(document["files"][1]["meaning"], "it changed");
}

TEST(Push, ThatCouldNotBeVerifiedIsAFailureAndSaysWhy) {
    PushReport report;
    report.files = {arrived("a", "aa")};
    report.seconds = 1;
    report.verification = ctl::Verification::Unknown;
    report.whyUnknown = "no answer within the time-out";
    const Page page = ctl::showPush(report, Format::Text);
    EXPECT_EQ(page.out,
              "push a: done; 10 B in 1.00 s, 10 B/s\n"
              "not verified: no answer within the time-out\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    const Page asJson = ctl::showPush(report, Format::Json);
    EXPECT_EQ(asJson.status, ctl::kHostReportedFailure);
    EXPECT_EQ(json::parse(asJson.out)["verified"], false);
    EXPECT_EQ(json::parse(asJson.out)["error"], "not verified: no answer within the time-out");
}

TEST(Push, ToAHostThatKnowsNoChecksumsIsASuccessWithANote) {
    PushReport report;
    report.files = {arrived("a", "aa")};
    report.seconds = 1;
    report.verification = ctl::Verification::NotOffered;
    const Page page = ctl::showPush(report, Format::Text);
    EXPECT_EQ(page.out,
              "push a: done; 10 B in 1.00 s, 10 B/s\n"
              "note: not verified: the host cannot compute checksums\n");
    EXPECT_EQ(page.status, ctl::kSuccess);
    EXPECT_EQ(json::parse(ctl::showPush(report, Format::Json).out)["verified"], false);
}

TEST(Push, ShowsARefusalWithItsWayOut) {
    PushReport report;
    report.files = {arrived("a", ""), arrived("b.mdl", "")};
    report.files[1].problem = "no text";
    report.files[1].hint = "Rename it.";
    report.files[1].worst.status = 6;
    report.refused = true;
    const Page page = ctl::showPush(report, Format::Text);
    EXPECT_EQ(page.out, "b.mdl: no text\n  Rename it.\npush 2 files: refused; nothing was sent\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    EXPECT_EQ(json::parse(ctl::showPush(report, Format::Json).out)["files"][0]["meaning"],
              "not sent");
}

TEST(Push, SaysThatANameLeadsOut) {
    const PushReport report = {{{"a", "../a", 10, 0, {6, 0}}}, 1};
    EXPECT_EQ(ctl::showPush(report, Format::Text).out,
              "../a: the name leads out of the depot\npush ../a: failed; 1 of 1 not taken\n");
}

TEST(Push, KeepsItsNotesShort) {
    PushReport report;
    report.files = {arrived("a", "")};
    report.seconds = 1;
    report.notes = {"first", "bell\a"};
    EXPECT_EQ(ctl::showPush(report, Format::Text).out,
              "note: first\nnote: bell\\x07\npush a: done; 10 B in 1.00 s, 10 B/s\n");
    report.notes.assign(25, "again");
    EXPECT_NE(ctl::showPush(report, Format::Text).out.find("note: and 5 more like these\n"),
              std::string::npos);
    EXPECT_EQ(json::parse(ctl::showPush(report, Format::Json).out)["notes"].size(), 25U);
}

}  // namespace

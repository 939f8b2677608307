#include "ctl/verbs/push.h"

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

}  // namespace

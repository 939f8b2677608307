#include "ctl/verbs/depot/depot_sum.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using ctl::Page;
using nlohmann::json;

TEST(DepotSum, PrintsSumsAndComplainsAboutTheRest) {
    const json rows = json::parse(
        R"([{"path": "a", "bytes": 1, "sha256": "aa"}, {"path": "b", "error": "no b"}])");
    const Page page = ctl::showSums(rows, Format::Text);
    EXPECT_EQ(page.out, "aa  a\n");
    EXPECT_EQ(page.err, "zavctl: no b\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    const Page document = ctl::showSums(rows, Format::Json);
    EXPECT_EQ(json::parse(document.out)["files"], rows);
    EXPECT_EQ(document.status, ctl::kHostReportedFailure);
}

TEST(DepotSum, IsASuccessWhenEveryFileHasOne) {
    const json rows = json::parse(R"([{"path": "a", "bytes": 1, "sha256": "aa"}])");
    EXPECT_EQ(ctl::showSums(rows, Format::Text).status, ctl::kSuccess);
}

}  // namespace

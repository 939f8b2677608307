#include "ctl/verbs/config_get.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using ctl::Page;
using ctl::showConfiguration;
using nlohmann::json;

TEST(ConfigGet, PrintsTheTextWithALineEnd) {
    EXPECT_EQ(showConfiguration("ux", {{"RETVAL", 0}, {"CONTEXT", "A=1"}}, Format::Text).out,
              "A=1\n");
    EXPECT_EQ(showConfiguration("ux", {{"RETVAL", 0}, {"CONTEXT", "A=1\n"}}, Format::Text).out,
              "A=1\n");
    EXPECT_EQ(showConfiguration("ux", {{"RETVAL", 0}, {"CONTEXT", ""}}, Format::Text).out, "");
}

TEST(ConfigGet, SaysWhyThereIsNoneOnStandardError) {
    const json row = {{"RETVAL", 1007}, {"RETMSGID", "ZAV1007E"}, {"RETMSGPARM", "GETCONFIG,ux"}};
    const Page page = showConfiguration("ux", row, Format::Text);
    EXPECT_EQ(page.out, "");
    EXPECT_EQ(page.err,
              "zavctl: config get ux: failed; ZAV1007E: no two-way translator was found for the "
              "product [GETCONFIG,ux]\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

TEST(ConfigGet, IsTheReplyAsJson) {
    const json row = {{"RETVAL", 1007}, {"CONTEXT", ""}};
    const Page page = showConfiguration("ux", row, Format::Json);
    EXPECT_EQ(json::parse(page.out), row);
    EXPECT_EQ(page.err, "");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

}  // namespace

#include "ctl/verbs/config/config_get.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using ctl::Page;
using ctl::showConfiguration;
using nlohmann::json;

/// What is shown of a reply without a text beside it.
Page showRow(const json& row, Format format) {
    return showConfiguration("ux", ctl::configurationIn({json::array({row})}), format);
}

/// An answer whose row holds less than the text beside it.
ctl::QueryAnswer answerWith(const std::string& text, bool isComplete) {
    ctl::QueryAnswer answer;
    answer.rows = {{{"RETVAL", 0}, {"CONTEXT", text.substr(0, ctl::kContextBytes)}}};
    answer.full = {{{"row", 0}, {"column", "CONTEXT"}, {"text", text}, {"complete", isComplete}}};
    return answer;
}

TEST(ConfigGet, PrintsTheWholeTextThatStandsBesideTheRow) {
    const std::string text(6201, 'c');
    const auto configuration = ctl::configurationIn(answerWith(text, true));
    const Page page = showConfiguration("ux", configuration, Format::Text);
    EXPECT_EQ(page.out, text + "\n");
    EXPECT_EQ(page.status, ctl::kSuccess);
    const json document = json::parse(showConfiguration("ux", configuration, Format::Json).out);
    EXPECT_EQ(document["CONTEXT"], text.substr(0, 3072));
    EXPECT_EQ(document["full"][0]["text"], text);
}

TEST(ConfigGet, SaysThatATextIsCut) {
    const auto heard = ctl::configurationIn(answerWith(std::string(5000, 'c'), false));
    const Page page = showConfiguration("ux", heard, Format::Text);
    EXPECT_EQ(page.out, std::string(5000, 'c') + "\n");
    EXPECT_EQ(
        page.err,
        "zavctl: the configuration is not whole: the host gives no more than 5000 bytes of it as "
        "text\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    const json full = {{"RETVAL", 0}, {"CONTEXT", std::string(3072, 'c')}};
    for (const Format format : {Format::Text, Format::Json})
        EXPECT_EQ(showRow(full, format).status, ctl::kHostReportedFailure);
    const json notFull = {{"RETVAL", 0}, {"CONTEXT", std::string(3071, 'c')}};
    EXPECT_EQ(showRow(notFull, Format::Text).status, ctl::kSuccess);
}

TEST(ConfigGet, TakesOnlyTheTextOfItsOwnColumnAndRow) {
    ctl::QueryAnswer answer = answerWith("A=1", true);
    answer.full[0]["row"] = 1;
    answer.full.push_back({{"row", 0}, {"column", "OTHER"}, {"text", "B"}, {"complete", true}});
    answer.full.push_back("no object");
    answer.full.push_back({{"row", 0}, {"column", "CONTEXT"}, {"text", 7}});
    EXPECT_EQ(ctl::configurationIn(answer).text, "A=1");
    EXPECT_TRUE(ctl::configurationIn(answer).isWhole);
}

TEST(ConfigGet, PrintsTheTextWithALineEnd) {
    EXPECT_EQ(showRow({{"RETVAL", 0}, {"CONTEXT", "A=1"}}, Format::Text).out, "A=1\n");
    EXPECT_EQ(showRow({{"RETVAL", 0}, {"CONTEXT", "A=1\n"}}, Format::Text).out, "A=1\n");
    EXPECT_EQ(showRow({{"RETVAL", 0}, {"CONTEXT", ""}}, Format::Text).out, "");
}

TEST(ConfigGet, SaysWhyThereIsNoneOnStandardError) {
    const json row = {{"RETVAL", 1007}, {"RETMSGID", "ZAV1007E"}, {"RETMSGPARM", "GETCONFIG,ux"}};
    const Page page = showRow(row, Format::Text);
    EXPECT_EQ(page.out, "");
    EXPECT_EQ(page.err,
              "zavctl: config get ux: failed; ZAV1007E: no two-way translator was found for the "
              "product [GETCONFIG,ux]\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

TEST(ConfigGet, IsTheReplyAsJson) {
    const json row = {{"RETVAL", 1007}, {"CONTEXT", ""}};
    const Page page = showRow(row, Format::Json);
    EXPECT_EQ(json::parse(page.out), row);
    EXPECT_EQ(page.err, "");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
}

}  // namespace

#include "util/process/report_scan.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "base/zavtoken.h"

using ZAV::findReportBody;
using ZAV::ReportBody;
using ZAV::splitFields;
using ZAV::String;
using ZAV::TokenScanner;

namespace {

std::vector<std::string> split(const std::string& text, const char* delimiters,
                               std::uint32_t start = 0) {
    std::vector<std::string> tokens;
    for (const String& token : splitFields(text.c_str(), delimiters, start)) {
        tokens.emplace_back(static_cast<const char*>(token.c_str()));
    }
    return tokens;
}

using Tokens = std::vector<std::string>;

TEST(ReportBody, FindsTheHeaderAndTheEndOfItsLine) {
    const ReportBody body = findReportBody("noise\nHEADER more\nline\n", "HEADER");
    EXPECT_EQ(body.header, 6u);
    EXPECT_EQ(body.newline, 17u);
}

TEST(ReportBody, NewlinesBeforeTheHeaderDoNotCount) {
    const ReportBody body = findReportBody("\n\nHEADER\n", "HEADER");
    EXPECT_EQ(body.header, 2u);
    EXPECT_EQ(body.newline, 8u);
}

TEST(ReportBody, TakesTheFirstOfSeveralHeaders) {
    EXPECT_EQ(findReportBody("xHEADER\nHEADER\n", "HEADER").header, 1u);
}

TEST(ReportBody, WithoutAHeaderNothingIsFound) {
    const ReportBody body = findReportBody("some\ntext\n", "HEADER");
    EXPECT_EQ(body.header, String::NPOS);
    EXPECT_EQ(body.newline, String::NPOS);
}

TEST(ReportBody, AnEmptyReportHasNoHeader) {
    EXPECT_EQ(findReportBody("", "HEADER").header, String::NPOS);
}

TEST(ReportBody, AHeaderMayBeAllThereIs) {
    const ReportBody body = findReportBody("HEADER", "HEADER");
    EXPECT_EQ(body.header, 0u);
    EXPECT_EQ(body.newline, String::NPOS);
}

TEST(SplitFields, EmptyFieldsAreNotCounted) {
    EXPECT_EQ(split("\"a\",\"\",\"b\",,\"c\"\r", "\n\r,\""), (Tokens{"a", "b", "c"}));
}

TEST(SplitFields, EmptyTextsAndTextsOfDelimitersHaveNone) {
    EXPECT_EQ(split("", ","), Tokens{});
    EXPECT_EQ(split(",,,", ","), Tokens{});
}

TEST(SplitFields, ATextWithoutDelimitersIsOneField) {
    EXPECT_EQ(split("abc", ","), Tokens{"abc"});
    EXPECT_EQ(split("a,b", ""), Tokens{"a,b"});
}

TEST(SplitFields, BeginsWhereItIsTold) {
    EXPECT_EQ(split("a\nbc\nd", "\n", 3), (Tokens{"c", "d"}));
    EXPECT_EQ(split("ab", "\n", 2), Tokens{});
    EXPECT_EQ(split("ab", "\n", 3000000000u), Tokens{});
}

TEST(SplitFields, UnitsBeyondAsciiAreNeverDelimiters) {
    // The low byte of 0x012C is a comma.
    const unsigned short units[] = {'a', 0x012C, 'b', ',', 'c', 0};
    const std::vector<String> fields = splitFields(String(units), ",");
    ASSERT_EQ(fields.size(), 2u);
    EXPECT_EQ(fields[0].length(), 3u);
    EXPECT_EQ(fields[0][1], 0x012C);
    EXPECT_TRUE(fields[1] == "c");
}

TEST(TokenScanner, LeavesTheTokenAloneAtTheEnd) {
    const String text("one two");
    TokenScanner scanner(text, " ");
    String token;
    EXPECT_TRUE(scanner.next(token));
    EXPECT_TRUE(scanner.next(token));
    EXPECT_FALSE(scanner.next(token));
    EXPECT_FALSE(scanner.next(token));
    EXPECT_TRUE(token == "two");
}

TEST(TokenScanner, CutsAsTheTokenizerDoes) {
    const char* const delimiters = "\n\r,\" :";
    const char* const texts[] = {"",       " a:b ",   "\"x\",\"y z\"\r\n", ",,,,",
                                 "single", "\n\n\na", "a,b c:d\re\nf\"g"};
    for (const char* text : texts) {
        StringTokenizer tokenizer{String(text), String(delimiters)};
        Tokens expected;
        while (tokenizer.hasMoreTokens()) {
            expected.emplace_back(static_cast<const char*>(tokenizer.nextToken().c_str()));
        }
        EXPECT_EQ(split(text, delimiters), expected) << text;
    }
}

}  // namespace

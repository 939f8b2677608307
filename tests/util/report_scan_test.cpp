#include "util/report_scan.h"

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
    EXPECT_EQ(6u, body.header);
    EXPECT_EQ(17u, body.newline);
}

TEST(ReportBody, NewlinesBeforeTheHeaderDoNotCount) {
    const ReportBody body = findReportBody("\n\nHEADER\n", "HEADER");
    EXPECT_EQ(2u, body.header);
    EXPECT_EQ(8u, body.newline);
}

TEST(ReportBody, TakesTheFirstOfSeveralHeaders) {
    EXPECT_EQ(1u, findReportBody("xHEADER\nHEADER\n", "HEADER").header);
}

TEST(ReportBody, WithoutAHeaderNothingIsFound) {
    const ReportBody body = findReportBody("some\ntext\n", "HEADER");
    EXPECT_EQ(String::NPOS, body.header);
    EXPECT_EQ(String::NPOS, body.newline);
}

TEST(ReportBody, AnEmptyReportHasNoHeader) {
    EXPECT_EQ(String::NPOS, findReportBody("", "HEADER").header);
}

TEST(ReportBody, AHeaderMayBeAllThereIs) {
    const ReportBody body = findReportBody("HEADER", "HEADER");
    EXPECT_EQ(0u, body.header);
    EXPECT_EQ(String::NPOS, body.newline);
}

TEST(SplitFields, EmptyFieldsAreNotCounted) {
    EXPECT_EQ((Tokens{"a", "b", "c"}), split("\"a\",\"\",\"b\",,\"c\"\r", "\n\r,\""));
}

TEST(SplitFields, EmptyTextsAndTextsOfDelimitersHaveNone) {
    EXPECT_EQ(Tokens{}, split("", ","));
    EXPECT_EQ(Tokens{}, split(",,,", ","));
}

TEST(SplitFields, ATextWithoutDelimitersIsOneField) {
    EXPECT_EQ(Tokens{"abc"}, split("abc", ","));
    EXPECT_EQ(Tokens{"a,b"}, split("a,b", ""));
}

TEST(SplitFields, BeginsWhereItIsTold) {
    EXPECT_EQ((Tokens{"c", "d"}), split("a\nbc\nd", "\n", 3));
    EXPECT_EQ(Tokens{}, split("ab", "\n", 2));
    EXPECT_EQ(Tokens{}, split("ab", "\n", 3000000000u));
}

TEST(SplitFields, UnitsBeyondAsciiAreNeverDelimiters) {
    // The low byte of 0x012C is a comma.
    const unsigned short units[] = {'a', 0x012C, 'b', ',', 'c', 0};
    const std::vector<String> fields = splitFields(String(units), ",");
    ASSERT_EQ(2u, fields.size());
    EXPECT_EQ(3u, fields[0].length());
    EXPECT_EQ(0x012C, fields[0][1]);
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
        EXPECT_EQ(expected, split(text, delimiters)) << text;
    }
}

}  // namespace

#include "base/zavtoken.h"

#include "support/trace_capture.h"
#include "support/units.h"

using ZAV::IndexOutOfBoundsException;
using ZAV::String;

namespace {

std::vector<std::string> tokensOf(const char* text, const char* delimiters) {
    StringTokenizer tokenizer(text, delimiters);
    std::vector<std::string> tokens;
    while (tokenizer.hasMoreTokens())
        tokens.push_back(narrow(tokenizer.nextToken()));
    return tokens;
}

using Tokens = std::vector<std::string>;

TEST(StringTokenizer, SplitsAtRunsOfDelimiters) {
    EXPECT_EQ(tokensOf(", a,,b ", ", "), (Tokens{"a", "b"}));
    EXPECT_EQ(tokensOf("a,b", ","), (Tokens{"a", "b"}));
    EXPECT_EQ(tokensOf("abc", ","), (Tokens{"abc"}));
    EXPECT_EQ(tokensOf("one two", ","), (Tokens{"one two"}));
    EXPECT_EQ(tokensOf("a,", ","), (Tokens{"a"}));
}

TEST(StringTokenizer, CountsWithoutMoving) {
    StringTokenizer tokenizer(", a,,b ", ", ");
    EXPECT_EQ(tokenizer.countTokens(), 2);
    EXPECT_EQ(tokenizer.countTokens(), 2);
    EXPECT_TRUE(tokenizer.hasMoreTokens());
    EXPECT_EQ(tokenizer.nextToken(), "a");
    EXPECT_EQ(tokenizer.countTokens(), 1);
    EXPECT_EQ(tokenizer.nextToken(), "b");
    EXPECT_EQ(tokenizer.countTokens(), 0);
    EXPECT_FALSE(tokenizer.hasMoreTokens());
}

TEST(StringTokenizer, DelimitersAloneHaveNoTokens) {
    StringTokenizer tokenizer(",, ,", ", ");
    EXPECT_FALSE(tokenizer.hasMoreTokens());
    EXPECT_EQ(tokenizer.countTokens(), 0);
}

TEST(StringTokenizer, AnEmptyTextHasNoTokens) {
    EXPECT_EQ(tokensOf("", ","), Tokens());
    StringTokenizer withoutDelimiters{String()};
    EXPECT_FALSE(withoutDelimiters.hasMoreTokens());
    EXPECT_EQ(withoutDelimiters.countTokens(), 0);
}

TEST(StringTokenizer, ThrowsWhenNoTokenIsLeft) {
    StringTokenizer tokenizer("a,", ",");
    tokenizer.nextToken();
    const TraceCapture trace("ERROR");
    EXPECT_THROW(tokenizer.nextToken(), IndexOutOfBoundsException);
    EXPECT_EQ(trace.errors("zavstr"), Tokens{"IndexOutOfBounds occurred, throwing exception"});
    EXPECT_THROW(StringTokenizer("", ",").nextToken(), IndexOutOfBoundsException);
}

TEST(StringTokenizer, ThrowsWithoutDelimiters) {
    StringTokenizer tokenizer(String("text"));
    const TraceCapture trace("ERROR");
    EXPECT_THROW(tokenizer.hasMoreTokens(), IndexOutOfBoundsException);
    EXPECT_THROW(tokenizer.countTokens(), IndexOutOfBoundsException);
    EXPECT_THROW(tokenizer.nextToken(), IndexOutOfBoundsException);
}

TEST(StringTokenizer, CopiesGoTheirOwnWay) {
    StringTokenizer first("a b c", " ");
    first.nextToken();
    StringTokenizer second(first);
    EXPECT_EQ(second.nextToken(), "b");
    EXPECT_EQ(first.countTokens(), 2);
}

}  // namespace

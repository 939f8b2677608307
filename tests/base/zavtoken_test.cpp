#include "base/zavtoken.h"

#include <gtest/gtest.h>

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

/// What the tokens of a text are, found unit by unit.
Tokens tokensOneByOne(const std::string& text, const std::string& delimiters) {
    Tokens tokens;
    std::string token;
    for (const char c : text + delimiters[0]) {
        if (delimiters.find(c) == std::string::npos) {
            token += c;
        } else if (!token.empty()) {
            tokens.push_back(token);
            token.clear();
        }
    }
    return tokens;
}

TEST(StringTokenizer, SplitsAtEveryPlaceOfTextsOfEveryLength) {
    for (std::size_t length = 1; length <= 36; ++length) {
        for (std::size_t at = 0; at < length; ++at) {
            for (const char* delimiters : {",", ", ", ",;:|", ",;:|/"}) {
                std::string text(length, 'x');
                text[at] = ',';
                EXPECT_EQ(tokensOf(text.c_str(), delimiters), tokensOneByOne(text, delimiters))
                    << text << " at " << delimiters;
            }
        }
    }
}

TEST(StringTokenizer, SplitsTextsOfEveryTokenLength) {
    std::string text;
    Tokens tokens;
    for (std::size_t length = 1; length <= 1100; length += length < 40 ? 1 : 53) {
        tokens.emplace_back(length, static_cast<char>('a' + length % 26));
        text += tokens.back() + (length % 3 == 0 ? ", " : ",");
    }
    EXPECT_EQ(tokensOf(text.c_str(), ", "), tokens);
}

TEST(StringTokenizer, SplitsAtUnitsOfEveryWidth) {
    const unsigned short text[] = {'a', 0x20AC, 0xE9, 0x20AC, 0xE9, 0xFFFF, 'b', 0};
    const unsigned short delimiters[] = {0x20AC, 0xFFFF, 0};
    StringTokenizer tokenizer{String(text), String(delimiters)};
    EXPECT_EQ(tokenizer.countTokens(), 4);
    EXPECT_EQ(tokenizer.nextToken(), "a");
    EXPECT_EQ(tokenizer.nextToken()[0], 0xE9);
    EXPECT_EQ(tokenizer.nextToken()[0], 0xE9);
    EXPECT_EQ(tokenizer.nextToken(), "b");
    EXPECT_FALSE(tokenizer.hasMoreTokens());
}

TEST(StringTokenizer, AZeroMayBeInATokenOrADelimiter) {
    const unsigned short units[] = {'a', 0, 'b', ',', 'c'};
    String text;
    text.assign(units, 5);
    StringTokenizer atComma(text, ",");
    EXPECT_EQ(atComma.nextToken().length(), 3u);
    EXPECT_EQ(atComma.nextToken(), "c");
    String zero;
    zero.append(0);
    StringTokenizer atZero(text, zero);
    EXPECT_EQ(atZero.nextToken(), "a");
    EXPECT_EQ(atZero.nextToken(), "b,c");
    EXPECT_FALSE(atZero.hasMoreTokens());
}

TEST(StringTokenizer, EveryCallIsTraced) {
    StringTokenizer tokenizer("a", ",");
    const TraceCapture trace("ALL");
    tokenizer.hasMoreTokens();
    tokenizer.countTokens();
    tokenizer.nextToken();
    Tokens events;
    for (const TraceLine& line : trace.lines())
        events.push_back(line.unit + " " + line.function + " " + line.text);
    EXPECT_EQ(events, (Tokens{"zavtoken hasMoreTokens Entry", "zavtoken hasMoreTokens Exit 1",
                              "zavtoken countTokens Entry", "zavtoken countTokens Exit 1",
                              "zavtoken nextToken Entry", "zavstr substr Entry",
                              "zavstr substr Exit", "zavtoken nextToken Exit"}));
}

}  // namespace

// String: changing texts in place, searching, and what happens at positions they do not have.

#include <gtest/gtest.h>

#include <clocale>
#include <functional>

#include "support/trace_capture.h"
#include "support/units.h"

using ZAV::IndexOutOfBoundsException;
using ZAV::String;

namespace {

TEST(StringAppend, AddsUnitsAndTexts) {
    String text;
    text.append('a').append(String("bc")).append(String("defg"), 2).append(String());
    EXPECT_EQ(text, "abcde");
    EXPECT_TRUE(isTerminated(text));
    EXPECT_EQ(text.append(String("x"), 0), "abcde");
}

TEST(StringAppend, TakesItself) {
    String text("0123456789");
    text.append(text);
    EXPECT_EQ(text, "01234567890123456789");
    text.append(text, 5);
    EXPECT_EQ(text, "0123456789012345678901234");
    EXPECT_TRUE(isTerminated(text));
}

TEST(StringAppend, KeepsTheTerminatorAtEveryLength) {
    String text;
    for (unsigned i = 0; i < 100; ++i) {
        text.append(static_cast<unsigned short>('a' + i % 26));
        ASSERT_EQ(text.length(), i + 1);
        ASSERT_TRUE(isTerminated(text));
        ASSERT_EQ(text[i], 'a' + i % 26);
    }
}

TEST(StringErase, RemovesARange) {
    EXPECT_EQ(String("abcdef").erase(2, 3), "abf");
    EXPECT_EQ(String("abcdef").erase(0, 6), "");
    EXPECT_EQ(String("abcdef").erase(2), "ab");
    EXPECT_EQ(String("abcdef").erase(0), "");
    String text("abcdef");
    EXPECT_TRUE(isTerminated(text.erase(5, 1)));
}

TEST(StringTrim, RemovesWhiteSpaceAtBothEnds) {
    EXPECT_EQ(String(" a b ").trim(), "a b");
    EXPECT_EQ(String("\n        \n\t\t a b        ").trim(), "a b");
    EXPECT_EQ(String(" \t \t").trim(), "");
    EXPECT_EQ(String("").trim(), "");
    EXPECT_EQ(String("a").trim(), "a");
    EXPECT_EQ(String("\r\n\v\fa").trim(), "a");
    EXPECT_EQ(String("a \n").trim(), "a");
    String text("  x");
    EXPECT_EQ(&text.trim(), &text);
    EXPECT_TRUE(isTerminated(text));
}

TEST(StringTrim, KeepsAZeroInTheMidst) {
    EXPECT_EQ(unitsOf(fromUnits({' ', 0, ' ', 'a', ' '}).trim()), Units({0, ' ', 'a'}));
}

TEST(StringCase, MapsEveryUnit) {
    EXPECT_EQ(String("aBc1-z").toUpper(), "ABC1-Z");
    EXPECT_EQ(String("AbC1-Z").toLower(), "abc1-z");
    EXPECT_EQ(String("").toUpper(), "");
}

TEST(StringCase, GoesByTheProcessesLocale) {
    ASSERT_NE(std::setlocale(LC_CTYPE, "C.UTF-8"), nullptr);
    EXPECT_EQ(unitsOf(fromUnits({0xE9, 0x3B1}).toUpper()), Units({0xC9, 0x391}));
    EXPECT_EQ(unitsOf(fromUnits({0xC9, 0x391}).toLower()), Units({0xE9, 0x3B1}));
    EXPECT_TRUE(String::isWhiteSpace(0x2003));
    std::setlocale(LC_CTYPE, "C");
    EXPECT_EQ(unitsOf(fromUnits({0xE9}).toUpper()), Units({0xE9}));
    EXPECT_FALSE(String::isWhiteSpace(0x2003));
}

TEST(StringWhiteSpace, IsWhatTheSystemSays) {
    for (const char c : {' ', '\t', '\n', '\v', '\f', '\r'}) {
        EXPECT_TRUE(String::isWhiteSpace(static_cast<unsigned short>(c)));
    }
    EXPECT_FALSE(String::isWhiteSpace(0));
    EXPECT_FALSE(String::isWhiteSpace('a'));
}

TEST(StringRemoveEscapes, BeforeTheSixSpecialCharacters) {
    EXPECT_EQ(String("a\\=b").removeEscapes('\\'), "a=b");
    EXPECT_EQ(String("a\\xb").removeEscapes('\\'), "a\\xb");
    EXPECT_EQ(String("\\[\\]\\{\\}\\=\\\\").removeEscapes('\\'), "[]{}=\\");
    EXPECT_EQ(String("a\\\\=b").removeEscapes('\\'), "a\\=b");
    EXPECT_EQ(String("\\\\\\\\").removeEscapes('\\'), "\\\\");
    EXPECT_EQ(String("\\\\\\=").removeEscapes('\\'), "\\=");
    EXPECT_EQ(String("end\\").removeEscapes('\\'), "end\\");
    EXPECT_EQ(String("").removeEscapes('\\'), "");
    EXPECT_EQ(String("a%=b%%").removeEscapes('%'), "a=b%%");
    String text("\\=\\=\\=");
    EXPECT_TRUE(isTerminated(text.removeEscapes('\\')));
}

TEST(StringInsertEscapes, BeforeTheCallersCharacters) {
    EXPECT_EQ(String("a=b{c}").insertEscapes('\\', "{}"), "a=b\\{c\\}");
    EXPECT_EQ(String("a\\b").insertEscapes('\\', "\\"), "a\\\\b");
    EXPECT_EQ(String("abc").insertEscapes('\\', "xyz"), "abc");
    EXPECT_EQ(String("abc").insertEscapes('\\', ""), "abc");
    EXPECT_EQ(String("").insertEscapes('\\', "a"), "");
    EXPECT_EQ(String("===").insertEscapes('!', "="), "!=!=!=");
    String text("=");
    EXPECT_TRUE(isTerminated(text.insertEscapes('\\', "=")));
}

TEST(StringInsertEscapes, ReachesTheTerminator) {
    EXPECT_EQ(unitsOf(String("ab").insertEscapes('!', fromUnits({0}))), Units({'a', 'b', '!'}));
}

TEST(StringReplace, ReplacesEveryOccurrence) {
    EXPECT_EQ(String::replace("a.b.c", ".", "/"), "a/b/c");
    EXPECT_EQ(String::replace("..", ".", ""), "");
    EXPECT_EQ(String::replace("abc", "x", "y"), "abc");
    EXPECT_EQ(String::replace("aaaa", "aa", "b"), "bb");
    EXPECT_EQ(String::replace("aaa", "aa", "b"), "ba");
    EXPECT_EQ(String::replace("xax", "x", "yy"), "yyayy");
    EXPECT_EQ(String::replace("x", "x", "x"), "x");
    EXPECT_EQ(String::replace("abc", "", "y"), "abc");
    EXPECT_EQ(String::replace("", "a", "b"), "");
    EXPECT_EQ(String::replace("ab", "abc", "x"), "ab");
    EXPECT_EQ(String::replace("ab", "ab", "ababab"), "ababab");
}

TEST(StringReplace, LeavesItsArgumentsAlone) {
    const String text("a.b"), what("."), with("-");
    EXPECT_EQ(String::replace(text, what, with), "a-b");
    EXPECT_EQ(text, "a.b");
    EXPECT_EQ(String::replace(text, text, text), "a.b");
}

TEST(StringReplace, IsTraced) {
    const String text("a.b.c"), what("."), with("/");
    const TraceCapture trace;
    String::replace(text, what, with);
    String::replace(text, "x", "y");
    EXPECT_EQ(trace.details("zavstr"),
              (std::vector<std::string>{"Str [a.b.c], replace [.] with [/]", "Returning [a/b/c]",
                                        "Str [a.b.c], replace [x] with [y]", "Returning [a.b.c]"}));
}

TEST(StringSubstr, CopiesARange) {
    const String text("abcdef");
    EXPECT_EQ(text.substr(2), "cdef");
    EXPECT_EQ(text.substr(5), "f");
    EXPECT_EQ(text.substr(1, 3), "bcd");
    EXPECT_EQ(String("abc").substr(0, 3), "abc");
    EXPECT_TRUE(isTerminated(text.substr(0, 6)));
}

TEST(StringFind, FindsAUnit) {
    const String text("abcabc");
    EXPECT_EQ(text.find('a'), 0u);
    EXPECT_EQ(text.find('c'), 2u);
    EXPECT_EQ(text.find('c', 3), 5u);
    EXPECT_EQ(text.find('x'), String::NPOS);
    EXPECT_EQ(text.find('a', 4), String::NPOS);
    EXPECT_EQ(text.find(static_cast<unsigned short>(0), 0), String::NPOS);
}

TEST(StringFind, TakesACharAsAByteValue) {
    const String text = fromUnits({'a', 0xE9});
    EXPECT_EQ(text.find('\xE9', 0), 1u);
    EXPECT_EQ(text.find(static_cast<unsigned short>(0xE9)), 1u);
}

TEST(StringFind, FindsAUnitAtEveryPlaceOfALongText) {
    for (unsigned length = 1; length < 70; ++length) {
        for (unsigned at = 0; at < length; ++at) {
            String text = repeated(length, '.');
            text[at] = 0x2603;
            ASSERT_EQ(text.find(static_cast<unsigned short>(0x2603)), at);
            ASSERT_EQ(text.find(static_cast<unsigned short>(0x2603), at), at);
            if (at + 1 < length) {
                ASSERT_EQ(text.find(static_cast<unsigned short>(0x2603), at + 1), String::NPOS);
            }
        }
    }
}

TEST(StringFind, FindsAText) {
    const String text("abcabcab");
    EXPECT_EQ(text.find(String("bc"), 0), 1u);
    EXPECT_EQ(text.find(String("bc"), 2), 4u);
    EXPECT_EQ(text.find(String("cab"), 3), 5u);
    EXPECT_EQ(text.find(String("abcabcab"), 0), 0u);
    EXPECT_EQ(text.find(String("ab"), 6), 6u);
    EXPECT_EQ(text.find(String("abx"), 0), String::NPOS);
    EXPECT_EQ(text.find(String("ab"), 7), String::NPOS);
    EXPECT_EQ(text.find(String("ab"), 4000000000u), String::NPOS);
    EXPECT_EQ(text.find(String("abcabcabc"), 0), String::NPOS);
    EXPECT_EQ(String("aab").find(String("ab"), 0), 1u);
}

TEST(StringFind, ATextIsNotFoundAcrossTheEnd) {
    EXPECT_EQ(String("xa").find(fromUnits({'a', 0}), 0), String::NPOS);
    EXPECT_EQ(fromUnits({'x', 'a', 0}).find(fromUnits({'a', 0}), 0), 1u);
}

TEST(StringFind, OfTextNeverThrowsAndNeverFindsNothing) {
    EXPECT_EQ(String().find(String("ab"), 0), String::NPOS);
    EXPECT_EQ(String().find(String(), 0), String::NPOS);
    EXPECT_EQ(String("abc").find(String(""), 0), String::NPOS);
    EXPECT_EQ(String("abc").find(String(""), 3), String::NPOS);
    EXPECT_EQ(String("abc").find(String("abc"), String::NPOS), String::NPOS);
}

TEST(StringFindUnescaped, SkipsWhatIsEscaped) {
    EXPECT_EQ(String("a\\=b=c").find('=', '\\', 0), 4u);
    EXPECT_EQ(String("a\\\\=b").find('=', '\\', 0), 3u);
    EXPECT_EQ(String("a\\\\\\=b").find('=', '\\', 0), String::NPOS);
    EXPECT_EQ(String("\\=").find('=', '\\', 0), String::NPOS);
    EXPECT_EQ(String("\\\\=").find('=', '\\', 0), 2u);
    EXPECT_EQ(String("=").find('=', '\\', 0), 0u);
    EXPECT_EQ(String("abc").find('=', '\\', 0), String::NPOS);
}

TEST(StringFindUnescaped, TakesTheStartAsItIs) {
    EXPECT_EQ(String("\\=x=").find('=', '\\', 1), 1u);
    EXPECT_EQ(String("\\=x=").find('=', '\\', 2), 3u);
}

TEST(StringFindUnescaped, CountsEscapesBeforeTheStart) {
    EXPECT_EQ(String("a\\\\=").find('=', '\\', 2), 3u);
    EXPECT_EQ(String("a\\\\\\=").find('=', '\\', 3), String::NPOS);
}

TEST(StringFindUnescaped, TheTerminatorIsNoPartOfTheText) {
    EXPECT_EQ(String("ab").find(static_cast<unsigned short>(0), '\\', 0), String::NPOS);
    EXPECT_EQ(fromUnits({'a', '\\', 0, 0}).find(static_cast<unsigned short>(0), '\\', 0), 3u);
}

TEST(StringFindUnescaped, TheEscapeItself) {
    EXPECT_EQ(String("\\\\").find('\\', '\\', 0), 0u);
    EXPECT_EQ(String("a\\\\").find('\\', '\\', 0), 1u);
}

TEST(StringRfind, ScansFromTheEndButNotTheFirstUnit) {
    EXPECT_EQ(String("abc").rfind('a'), String::NPOS);
    EXPECT_EQ(String("abc").rfind('c'), 2u);
    EXPECT_EQ(String("abcb").rfind('b'), 3u);
    EXPECT_EQ(String("aa").rfind('a'), 1u);
    EXPECT_EQ(String("abc").rfind(0), 3u);
    EXPECT_EQ(String().rfind(0), String::NPOS);
    EXPECT_EQ(String().rfind('a'), String::NPOS);
}

/// Each of these must throw, trace and leave the text alone.
struct BadCall {
    const char* name;
    const char* text;
    std::function<void(String&)> call;
};

const BadCall kBadCalls[] = {
    {"appendMoreThanThereIs", "abc", [](String& s) { s.append(String("ab"), 3); }},
    {"appendHuge", "abc", [](String& s) { s.append(s, 0xFFFFFFFFu); }},
    {"eraseNothing", "abc", [](String& s) { s.erase(1, 0); }},
    {"eraseTooMuch", "abc", [](String& s) { s.erase(1, 3); }},
    {"eraseAtTheEnd", "abc", [](String& s) { s.erase(3); }},
    {"eraseBeyondTheEnd", "abc", [](String& s) { s.erase(4); }},
    {"eraseWrapping", "abc", [](String& s) { s.erase(2, 0xFFFFFFFFu); }},
    {"eraseFarAway", "abc", [](String& s) { s.erase(0xFFFFFFFFu, 2); }},
    {"eraseEmpty", "", [](String& s) { s.erase(0); }},
    {"subscript", "abc", [](String& s) { s[4] = 'x'; }},
    {"subscriptHuge", "abc", [](String& s) { s[0xFFFFFFFFu] = 'x'; }},
    {"subscriptConst", "abc", [](String& s) { static_cast<const String&>(s)[4]; }},
    {"substrAtTheEnd", "abc", [](String& s) { s.substr(3); }},
    {"substrEmpty", "", [](String& s) { s.substr(0); }},
    {"substrNothing", "abc", [](String& s) { s.substr(1, 0); }},
    {"substrTooMuch", "abc", [](String& s) { s.substr(1, 3); }},
    {"substrWrapping", "abc", [](String& s) { s.substr(2, 0xFFFFFFFFu); }},
    {"substrFarAway", "abc", [](String& s) { s.substr(0xFFFFFFFFu, 2); }},
    {"findEmpty", "", [](String& s) { s.find('x'); }},
    {"findAtTheEnd", "abc", [](String& s) { s.find('c', 3); }},
    {"findUnitAtTheEnd", "abc", [](String& s) { s.find(static_cast<unsigned short>('c'), 3); }},
    {"findUnescapedEmpty", "", [](String& s) { s.find('x', '\\', 0); }},
    {"findUnescapedAtTheEnd", "abc", [](String& s) { s.find('x', '\\', 3); }},
};

class StringBounds : public testing::TestWithParam<BadCall> {};

TEST_P(StringBounds, AreTracedAndThrown) {
    String text(GetParam().text);
    const TraceCapture trace("ERROR");
    std::string message;
    try {
        GetParam().call(text);
    } catch (const IndexOutOfBoundsException& thrown) {
        message = thrown.getErrorMessage();
    }
    const std::vector<TraceLine> lines = trace.lines();
    ASSERT_EQ(lines.size(), 1u);
    EXPECT_EQ(lines[0].level, 'E');
    EXPECT_EQ(lines[0].unit, "zavstr");
    EXPECT_EQ(lines[0].text, "IndexOutOfBounds occurred, throwing exception");
    EXPECT_EQ(message, "line: " + std::to_string(lines[0].line) + ", file: zavstr");
    EXPECT_GT(lines[0].line, 0);
    EXPECT_EQ(text, GetParam().text);
}

INSTANTIATE_TEST_SUITE_P(All, StringBounds, testing::ValuesIn(kBadCalls),
                         [](const auto& bad) { return std::string(bad.param.name); });

}  // namespace

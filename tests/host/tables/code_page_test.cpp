#include "host/tables/code_page.h"

#include <gtest/gtest.h>

#include <clocale>

#include "host/process/start_error.h"

namespace {

using host::CodePage;

TEST(CodePage, KeepsAsciiInEveryCodePage) {
    for (const char* name : {"UTF-8", "ISO-8859-1", "CP932", "EUC-JP", "ANSI_X3.4-1968"}) {
        const CodePage page(name);
        EXPECT_EQ("TASK 1/2 [x]", page.toUtf8("TASK 1/2 [x]")) << name;
        EXPECT_EQ("TASK 1/2 [x]", page.fromUtf8("TASK 1/2 [x]")) << name;
    }
}

TEST(CodePage, ConvertsBothWays) {
    EXPECT_EQ("Gr\xC3\xB6\xC3\x9F\x65", CodePage("ISO-8859-1").toUtf8("Gr\xF6\xDF\x65"));
    EXPECT_EQ("Gr\xF6\xDF\x65", CodePage("ISO-8859-1").fromUtf8("Gr\xC3\xB6\xC3\x9F\x65"));
    EXPECT_EQ("\xE6\x97\xA5", CodePage("CP932").toUtf8("\x93\xFA"));
    EXPECT_EQ("\x93\xFA", CodePage("CP932").fromUtf8("\xE6\x97\xA5"));
}

TEST(CodePage, ReplacesASequenceThatWasCutAtTheEnd) {
    EXPECT_EQ("ab\xEF\xBF\xBD", CodePage("UTF-8").toUtf8("ab\xE6\x97"));
    EXPECT_EQ("ab\xEF\xBF\xBD", CodePage("UTF-8").toUtf8("ab\xC3"));
    EXPECT_EQ("ab\xEF\xBF\xBD", CodePage("CP932").toUtf8("ab\x93"));
}

TEST(CodePage, ReplacesWhatIsNoCharacterAndGoesOn) {
    EXPECT_EQ("a\xEF\xBF\xBDz", CodePage("UTF-8").toUtf8("a\xFFz"));
    EXPECT_EQ("a\xEF\xBF\xBDz", CodePage("ANSI_X3.4-1968").toUtf8("a\xE4z"));
}

TEST(CodePage, ReplacesSequencesBeyondUnicode) {
    const std::string mark = "\xEF\xBF\xBD";
    const CodePage page("UTF-8");
    EXPECT_EQ("a" + mark + mark + mark + mark + mark + "z", page.toUtf8("a\xFA\x8A\x8A\x8A\x8Az"));
    EXPECT_EQ("a" + mark + mark + mark + mark + "z", page.toUtf8("a\xF4\x90\x80\x80z"));
    EXPECT_EQ("a\xF4\x8F\xBF\xBFz", page.toUtf8("a\xF4\x8F\xBF\xBFz")) << "the last character";
    EXPECT_EQ("a" + mark + mark, page.toUtf8("a\xE6\x97\xF8")) << "a cut sequence before one";
    for (const char* text : {"\xF8\x88\x80\x80\x80", "\xF4\x90\x80\x80", "a\xFD\xBF"})
        EXPECT_FALSE(page.fromUtf8(text));
    EXPECT_EQ("\xF4\x8F\xBF\xBF", page.fromUtf8("\xF4\x8F\xBF\xBF"));
}

TEST(CodePage, TextLongerThanAnyBufferPasses) {
    std::string latin, utf8;
    for (int i = 0; i < 5000; ++i) {
        latin += "\xE4x";
        utf8 += "\xC3\xA4x";
    }
    EXPECT_EQ(utf8, CodePage("ISO-8859-1").toUtf8(latin));
    EXPECT_EQ(latin, CodePage("ISO-8859-1").fromUtf8(utf8));
    EXPECT_EQ(utf8, CodePage("UTF-8").toUtf8(utf8));
}

TEST(CodePage, RefusesWhatTheCodePageLacks) {
    EXPECT_FALSE(CodePage("ISO-8859-1").fromUtf8("\xE6\x97\xA5"));
    EXPECT_FALSE(CodePage("ANSI_X3.4-1968").fromUtf8("\xC3\xA4"));
}

TEST(CodePage, RefusesWhatIsNotUtf8) {
    for (const char* text : {"\xFF", "a\xC3", "\xC3(", "\xED\xA0\x80", "\xC0\x80"}) {
        EXPECT_FALSE(CodePage("UTF-8").fromUtf8(text));
        EXPECT_FALSE(CodePage("ISO-8859-1").fromUtf8(text));
    }
}

TEST(CodePage, IsThatOfTheProcess) {
    ASSERT_NE(nullptr, std::setlocale(LC_CTYPE, "C.UTF-8"));
    EXPECT_EQ("UTF-8", CodePage::ofProcess().name());
    std::setlocale(LC_CTYPE, "C");
    EXPECT_EQ("ANSI_X3.4-1968", CodePage::ofProcess().name());
}

TEST(CodePage, MustBeKnown) {
    EXPECT_THROW(CodePage("NO-SUCH-PAGE"), std::runtime_error);
}

}  // namespace

#include "host/tables/code_page.h"

#include <gtest/gtest.h>

#include <clocale>

#include "host/process/start_error.h"

namespace {

using host::CodePage;

TEST(CodePage, KeepsAsciiInEveryCodePage) {
    for (const char* name : {"UTF-8", "ISO-8859-1", "CP932", "EUC-JP", "ANSI_X3.4-1968"}) {
        const CodePage page(name);
        EXPECT_EQ(page.toUtf8("TASK 1/2 [x]"), "TASK 1/2 [x]") << name;
        EXPECT_EQ(page.fromUtf8("TASK 1/2 [x]"), "TASK 1/2 [x]") << name;
    }
}

TEST(CodePage, ConvertsAsciiWhereItIsOtherBytes) {
    const CodePage mainframe("IBM037");
    EXPECT_EQ(mainframe.fromUtf8("ux"), "\xA4\xA7");
    EXPECT_EQ(mainframe.toUtf8("\xA4\xA7"), "ux");
    EXPECT_EQ(mainframe.toUtf8("a"), "/");
    const CodePage stateful("ISO-2022-JP");
    EXPECT_EQ(stateful.toUtf8("\x1B$BF|\x1B(B"), "\xE6\x97\xA5") << "all bytes are ASCII's";
    EXPECT_EQ(stateful.fromUtf8("\xE6\x97\xA5"), "\x1B$BF|\x1B(B");
}

TEST(CodePage, ConvertsBothWays) {
    EXPECT_EQ(CodePage("ISO-8859-1").toUtf8("Gr\xF6\xDF\x65"), "Gr\xC3\xB6\xC3\x9F\x65");
    EXPECT_EQ(CodePage("ISO-8859-1").fromUtf8("Gr\xC3\xB6\xC3\x9F\x65"), "Gr\xF6\xDF\x65");
    EXPECT_EQ(CodePage("CP932").toUtf8("\x93\xFA"), "\xE6\x97\xA5");
    EXPECT_EQ(CodePage("CP932").fromUtf8("\xE6\x97\xA5"), "\x93\xFA");
}

TEST(CodePage, ReplacesASequenceThatWasCutAtTheEnd) {
    EXPECT_EQ(CodePage("UTF-8").toUtf8("ab\xE6\x97"), "ab\xEF\xBF\xBD");
    EXPECT_EQ(CodePage("UTF-8").toUtf8("ab\xC3"), "ab\xEF\xBF\xBD");
    EXPECT_EQ(CodePage("CP932").toUtf8("ab\x93"), "ab\xEF\xBF\xBD");
}

TEST(CodePage, ReplacesWhatIsNoCharacterAndGoesOn) {
    EXPECT_EQ(CodePage("UTF-8").toUtf8("a\xFFz"), "a\xEF\xBF\xBDz");
    EXPECT_EQ(CodePage("ANSI_X3.4-1968").toUtf8("a\xE4z"), "a\xEF\xBF\xBDz");
}

TEST(CodePage, ReplacesSequencesBeyondUnicode) {
    const std::string mark = "\xEF\xBF\xBD";
    const CodePage page("UTF-8");
    EXPECT_EQ(page.toUtf8("a\xFA\x8A\x8A\x8A\x8Az"), "a" + mark + mark + mark + mark + mark + "z");
    EXPECT_EQ(page.toUtf8("a\xF4\x90\x80\x80z"), "a" + mark + mark + mark + mark + "z");
    EXPECT_EQ(page.toUtf8("a\xF4\x8F\xBF\xBFz"), "a\xF4\x8F\xBF\xBFz") << "the last character";
    EXPECT_EQ(page.toUtf8("a\xE6\x97\xF8"), "a" + mark + mark) << "a cut sequence before one";
    for (const char* text : {"\xF8\x88\x80\x80\x80", "\xF4\x90\x80\x80", "a\xFD\xBF"})
        EXPECT_FALSE(page.fromUtf8(text));
    EXPECT_EQ(page.fromUtf8("\xF4\x8F\xBF\xBF"), "\xF4\x8F\xBF\xBF");
}

TEST(CodePage, TextLongerThanAnyBufferPasses) {
    std::string latin, utf8;
    for (int i = 0; i < 5000; ++i) {
        latin += "\xE4x";
        utf8 += "\xC3\xA4x";
    }
    EXPECT_EQ(CodePage("ISO-8859-1").toUtf8(latin), utf8);
    EXPECT_EQ(CodePage("ISO-8859-1").fromUtf8(utf8), latin);
    EXPECT_EQ(CodePage("UTF-8").toUtf8(utf8), utf8);
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
    ASSERT_NE(std::setlocale(LC_CTYPE, "C.UTF-8"), nullptr);
    EXPECT_EQ(CodePage::ofProcess().name(), "UTF-8");
    std::setlocale(LC_CTYPE, "C");
    EXPECT_EQ(CodePage::ofProcess().name(), "ANSI_X3.4-1968");
}

TEST(CodePage, MustBeKnown) {
    EXPECT_THROW(CodePage("NO-SUCH-PAGE"), std::runtime_error);
}

}  // namespace

#include "ctl/show/printable.h"

#include <gtest/gtest.h>

namespace {

TEST(Printable, ShowsControlCharactersAsEscapes) {
    EXPECT_EQ(ctl::printable("cmd,\x03"), "cmd,\\x03");
    EXPECT_EQ(ctl::printable("a\x1b[2J\x7f"), "a\\x1B[2J\\x7F");
    EXPECT_EQ(ctl::printable(std::string("\0\n", 2)), "\\x00\\x0A");
}

TEST(Printable, ShowsTheControlCharactersOfLatin1AsEscapesToo) {
    EXPECT_EQ(ctl::printable("a\xc2\x9b"
                             "2J\xc2\xa0"),
              "a\\x9B2J\xc2\xa0");
    EXPECT_EQ(ctl::printable("\xc2"), "\xc2");
}

TEST(Printable, RedactedTextHasNoSecretsEither) {
    EXPECT_EQ(ctl::redacted("a\x1b password=hunter2 b"), "a\\x1B password=*** b");
    EXPECT_EQ(ctl::redacted("key=a\nnext"), "key=***\\x0Anext") << "a value ends with its line";
    EXPECT_EQ(ctl::printable("key=a"), "key=a");
}

TEST(Printable, LinesKeepTheirEndsAndTabs) {
    EXPECT_EQ(ctl::printableLines("a\tb\n\x1b[2J\r"), "a\tb\n\\x1B[2J\\x0D");
}

TEST(Printable, JsonKeepsItsMeaning) {
    EXPECT_EQ(ctl::withoutTerminalControls("{\n \"\x7f\xc2\x9b\"}"), "{\n \"\\u007F\\u009B\"}");
}

TEST(Printable, LeavesTextAsItIs) {
    EXPECT_EQ(ctl::printable("gr\xc3\xbc\xc3\x9f ~"), "gr\xc3\xbc\xc3\x9f ~");
}

}  // namespace

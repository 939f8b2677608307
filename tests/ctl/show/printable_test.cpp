#include "ctl/show/printable.h"

#include <gtest/gtest.h>

namespace {

TEST(Printable, ShowsControlCharactersAsEscapes) {
    EXPECT_EQ(ctl::printable("cmd,\x03"), "cmd,\\x03");
    EXPECT_EQ(ctl::printable("a\x1b[2J\x7f"), "a\\x1B[2J\\x7F");
    EXPECT_EQ(ctl::printable(std::string("\0\n", 2)), "\\x00\\x0A");
}

TEST(Printable, LeavesTextAsItIs) {
    EXPECT_EQ(ctl::printable("gr\xc3\xbc\xc3\x9f ~"), "gr\xc3\xbc\xc3\x9f ~");
}

}  // namespace

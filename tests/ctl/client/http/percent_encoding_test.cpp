#include "ctl/client/http/percent_encoding.h"

#include <gtest/gtest.h>

namespace {

using ctl::percentEncoded;

TEST(PercentEncoding, LeavesLettersDigitsAndFourSignsAsTheyAre) {
    EXPECT_EQ(percentEncoded("azAZ09-._~"), "azAZ09-._~");
}

TEST(PercentEncoding, WritesEveryOtherByteInHexadecimal) {
    EXPECT_EQ(percentEncoded("a b&c=d+%/"), "a%20b%26c%3Dd%2B%25%2F");
    EXPECT_EQ(percentEncoded("\xc3\xbc"), "%C3%BC");
    EXPECT_EQ(percentEncoded(std::string("\0\n", 2)), "%00%0A");
}

}  // namespace

#include "ctl/client/transfer/checksum.h"

#include <gtest/gtest.h>

namespace {

std::string sumOf(const std::string& text, std::size_t piece) {
    ctl::Checksum sum;
    for (std::size_t at = 0; at < text.size(); at += piece) {
        const std::string part = text.substr(at, piece);
        sum.add(reinterpret_cast<const unsigned char*>(part.data()), part.size());
    }
    return sum.finish();
}

TEST(Checksum, IsTheOneOfTheStandardHoweverTheBytesCome) {
    EXPECT_EQ(sumOf("", 1), "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
    for (const std::size_t piece : {1U, 2U, 3U})
        EXPECT_EQ(sumOf("abc", piece),
                  "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
}

}  // namespace

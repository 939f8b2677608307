#include "host/journal/keyed_hash.h"

#include <gtest/gtest.h>

namespace {

/// The bytes 0, 1, 2, ...
std::string counting(int count) {
    std::string bytes;
    for (int i = 0; i < count; ++i)
        bytes.push_back(static_cast<char>(i));
    return bytes;
}

std::string hexadecimal(const std::string& bytes) {
    const char* const digits = "0123456789abcdef";
    std::string text;
    for (const char byte : bytes) {
        text += digits[static_cast<unsigned char>(byte) >> 4];
        text += digits[static_cast<unsigned char>(byte) & 15U];
    }
    return text;
}

TEST(KeyedHash, IsTheOneThatItsAuthorsPublished) {
    const std::string key = counting(16) + counting(16);
    EXPECT_EQ(hexadecimal(host::keyedHash(key, "")), "310e0edd47db6f72310e0edd47db6f72");
    EXPECT_EQ(hexadecimal(host::keyedHash(key, counting(15))), "e545be4961ca29a1e545be4961ca29a1");
}

TEST(KeyedHash, DependsOnBothHalvesOfTheKey) {
    const std::string hash = host::keyedHash(counting(32), "secret");
    EXPECT_EQ(hash, host::keyedHash(counting(32), "secret"));
    EXPECT_NE(hash, host::keyedHash(counting(32), "Secret"));
    std::string other = counting(32);
    other[31] = 'x';
    EXPECT_EQ(hash.substr(0, 8), host::keyedHash(other, "secret").substr(0, 8));
    EXPECT_NE(hash.substr(8), host::keyedHash(other, "secret").substr(8));
}

}  // namespace

#include "fleet/bus/accounts/base32.h"

#include <cstddef>

namespace fleet {

namespace {

constexpr std::string_view kBase32Alphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZ234567";
constexpr unsigned kBitsOfDigit = 5;
constexpr unsigned kBitsOfByte = 8;

}  // namespace

std::string base32Encoded(std::string_view bytes) {
    std::string text;
    // No copies of a secret are left behind.
    text.reserve((bytes.size() * kBitsOfByte + kBitsOfDigit - 1) / kBitsOfDigit);
    unsigned pending = 0;
    unsigned bits = 0;
    for (const char byte : bytes) {
        pending = (pending << kBitsOfByte | static_cast<unsigned char>(byte)) & 0xFFFU;
        bits += kBitsOfByte;
        for (; bits >= kBitsOfDigit; bits -= kBitsOfDigit) {
            text += kBase32Alphabet[pending >> (bits - kBitsOfDigit) & 0x1FU];
        }
    }
    if (bits > 0) text += kBase32Alphabet[pending << (kBitsOfDigit - bits) & 0x1FU];
    return text;
}

std::optional<std::string> base32Decoded(std::string_view text) {
    std::string bytes;
    unsigned pending = 0;
    unsigned bits = 0;
    for (const char digit : text) {
        const std::size_t value = kBase32Alphabet.find(digit);
        if (value == std::string_view::npos) return std::nullopt;
        pending = (pending << kBitsOfDigit | static_cast<unsigned>(value)) & 0xFFFU;
        bits += kBitsOfDigit;
        if (bits >= kBitsOfByte) {
            bits -= kBitsOfByte;
            bytes += static_cast<char>(pending >> bits & 0xFFU);
        }
    }
    if (base32Encoded(bytes) != text) return std::nullopt;
    return bytes;
}

}  // namespace fleet

/// The fast path that conversions share: runs of ASCII, sixteen characters at a time.
#pragma once

#include <cstdint>
#include <cstring>

namespace nls2 {

constexpr unsigned kAsciiBlock = 16;

/// Copies the ASCII characters that `text` begins with, at most `count`; returns how many.
inline unsigned widenAscii(const char* text, unsigned count, unsigned short* out) {
    constexpr std::uint64_t kHighBits = 0x8080808080808080u;
    unsigned i = 0;
    for (; count - i >= kAsciiBlock; i += kAsciiBlock) {
        std::uint64_t bytes[2];
        std::memcpy(bytes, text + i, sizeof bytes);
        if (((bytes[0] | bytes[1]) & kHighBits) != 0) break;
        for (unsigned k = 0; k < kAsciiBlock; ++k) {
            out[i + k] = static_cast<unsigned char>(text[i + k]);
        }
    }
    for (; i < count && static_cast<unsigned char>(text[i]) < 0x80; ++i) {
        out[i] = static_cast<unsigned char>(text[i]);
    }
    return i;
}

/// Copies the units that `text` begins with and that are not above `Last`, at most `count`; returns
/// how many.
template <unsigned short Last>
unsigned narrowUpTo(const unsigned short* text, unsigned count, char* out) {
    static_assert(((Last + 1) & Last) == 0, "all bits of the limit are set");
    unsigned i = 0;
    for (; count - i >= kAsciiBlock; i += kAsciiBlock) {
        unsigned short bits = 0;
        for (unsigned k = 0; k < kAsciiBlock; ++k) {
            bits = static_cast<unsigned short>(bits | text[i + k]);
        }
        if (bits > Last) break;
        for (unsigned k = 0; k < kAsciiBlock; ++k)
            out[i + k] = static_cast<char>(text[i + k]);
    }
    for (; i < count && text[i] <= Last; ++i)
        out[i] = static_cast<char>(text[i]);
    return i;
}

inline unsigned narrowAscii(const unsigned short* text, unsigned count, char* out) {
    return narrowUpTo<0x7F>(text, count, out);
}

}  // namespace nls2

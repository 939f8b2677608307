/// The fast path that conversions share: runs of ASCII, a block of characters at a time.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace nls2 {

/// Characters that are converted together.
constexpr unsigned kBlock = 16;

using ByteBlock = unsigned char __attribute__((vector_size(kBlock)));
using UnitBlock = unsigned short __attribute__((vector_size(kBlock * 2)));

/// Makes a unit of each byte of a block.
inline void widenBlock(const char* text, unsigned short* out) {
    ByteBlock bytes;
    std::memcpy(&bytes, text, sizeof bytes);
    const UnitBlock units = __builtin_convertvector(bytes, UnitBlock);
    std::memcpy(out, &units, sizeof units);
}

/// Makes a byte of each unit of a block, of which the low half counts.
inline void narrowBlock(const unsigned short* text, char* out) {
    UnitBlock units;
    std::memcpy(&units, text, sizeof units);
    const ByteBlock bytes = __builtin_convertvector(units, ByteBlock);
    std::memcpy(out, &bytes, sizeof bytes);
}

/// Whether any of a block's words, read as 64 bits each, has a bit of `mask`.
template <std::size_t Words>
bool hasBits(const void* block, std::uint64_t mask) {
    std::uint64_t words[Words];
    std::memcpy(words, block, sizeof words);
    std::uint64_t all = 0;
    for (const std::uint64_t word : words)
        all |= word;
    return (all & mask) != 0;
}

/// The index, in memory order, of the first element of `Bits` bits that has a bit set in `word`,
/// which is not 0.
template <unsigned Bits>
unsigned elementsBefore(std::uint64_t word) {
#if __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__
    return static_cast<unsigned>(__builtin_ctzll(word)) / Bits;
#else
    return static_cast<unsigned>(__builtin_clzll(word)) / Bits;
#endif
}

/// Copies the ASCII characters that `text` begins with, at most `count`; returns how many.
inline unsigned widenAscii(const char* text, unsigned count, unsigned short* out) {
    unsigned i = 0;
    for (; count - i >= kBlock && !hasBits<2>(text + i, 0x8080808080808080u); i += kBlock) {
        widenBlock(text + i, out + i);
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
    constexpr std::uint64_t kAbove = (0xFFFFu - Last) * 0x0001000100010001u;
    unsigned i = 0;
    for (; count - i >= kBlock && !hasBits<4>(text + i, kAbove); i += kBlock) {
        narrowBlock(text + i, out + i);
    }
    for (; i < count && text[i] <= Last; ++i)
        out[i] = static_cast<char>(text[i]);
    return i;
}

inline unsigned narrowAscii(const unsigned short* text, unsigned count, char* out) {
    return narrowUpTo<0x7F>(text, count, out);
}

}  // namespace nls2

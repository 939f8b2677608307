/// Characters of UTF-16 text.
#pragma once

namespace utf16 {

constexpr char32_t kUnpaired = 0xFFFFFFFF;

/// One character of a text, or an unpaired surrogate (kUnpaired).
struct Taken {
    char32_t character;
    unsigned units;
};

/// The first character of `text`, which has at least one unit.
inline Taken take(const unsigned short* text, unsigned length) {
    const char32_t first = text[0];
    if (first < 0xD800 || first > 0xDFFF) return {first, 1};
    if (first < 0xDC00 && length > 1 && text[1] >= 0xDC00 && text[1] <= 0xDFFF) {
        return {0x10000 + ((first - 0xD800) << 10) + (text[1] - 0xDC00u), 2};
    }
    return {kUnpaired, 1};
}

inline unsigned unitsOf(char32_t character) {
    return character < 0x10000 ? 1 : 2;
}

/// Writes a character and returns the number of its units.
inline unsigned put(char32_t character, unsigned short* out) {
    if (character < 0x10000) {
        out[0] = static_cast<unsigned short>(character);
        return 1;
    }
    out[0] = static_cast<unsigned short>(0xD7C0 + (character >> 10));
    out[1] = static_cast<unsigned short>(0xDC00 + (character & 0x3FF));
    return 2;
}

}  // namespace utf16

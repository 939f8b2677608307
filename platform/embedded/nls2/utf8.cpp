// UTF-8 by hand: the code page that nearly every machine has.

#include <algorithm>

#include "common/utf16.h"
#include "nls2/ascii.h"
#include "nls2/locale.h"

namespace nls2 {
namespace {

constexpr char32_t kMalformed = 0xFFFFFFFF;

/// One character of UTF-8, or as many bytes as a malformed one has that could have begun a
/// character.
struct Decoded {
    char32_t character;  // kMalformed if it is none
    unsigned bytes;
};

/// What the second byte may be after a lead byte; it keeps out overlong forms, surrogates and what
/// lies beyond U+10FFFF.
struct Second {
    unsigned low, high;
};

Second secondAfter(unsigned lead) {
    switch (lead) {
        case 0xE0:
            return {0xA0, 0xBF};
        case 0xED:
            return {0x80, 0x9F};
        case 0xF0:
            return {0x90, 0xBF};
        case 0xF4:
            return {0x80, 0x8F};
        default:
            return {0x80, 0xBF};
    }
}

/// Decodes at a byte that is not ASCII.
Decoded decode(const char* text, unsigned length) {
    const auto lead = static_cast<unsigned char>(text[0]);
    if (lead < 0xC2 || lead > 0xF4) return {kMalformed, 1};
    const unsigned count = lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : 4;
    char32_t character = lead & (0x7Fu >> count);
    Second range = secondAfter(lead);
    for (unsigned i = 1; i < count; ++i) {
        const unsigned byte = i < length ? static_cast<unsigned char>(text[i]) : 0;
        if (byte < range.low || byte > range.high) return {kMalformed, i};
        character = character << 6 | (byte & 0x3F);
        range = {0x80, 0xBF};
    }
    return {character, count};
}

unsigned bytesOf(char32_t character) {
    return character < 0x80 ? 1 : character < 0x800 ? 2 : character < 0x10000 ? 3 : 4;
}

/// Writes the bytes of a character.
void encode(char32_t character, unsigned bytes, char* out) {
    if (bytes == 1) {
        out[0] = static_cast<char>(character);
        return;
    }
    for (unsigned i = bytes - 1; i > 0; --i, character >>= 6) {
        out[i] = static_cast<char>(0x80 | (character & 0x3F));
    }
    const unsigned marker = 0xF00u >> bytes & 0xFF;
    out[0] = static_cast<char>(marker | character);
}

struct Utf8Locale : NLS2_LOCALE {
    using NLS2_LOCALE::NLS2_LOCALE;

    Conversion toUTF16(const char* text, unsigned length, unsigned short* out,
                       unsigned capacity) const override {
        Conversion result{0, NLS2_OK};
        unsigned i = 0;
        while (i < length) {
            const unsigned run = widenAscii(
                text + i, std::min(length - i, capacity - result.written), out + result.written);
            i += run;
            result.written += run;
            if (i == length) break;
            if (result.written == capacity) return {result.written, NLS2_TRUNCATED};
            const Decoded next = decode(text + i, length - i);
            const bool malformed = next.character == kMalformed;
            const char32_t character = malformed ? kReplacementUnit : next.character;
            if (utf16::unitsOf(character) > capacity - result.written) {
                return {result.written, NLS2_TRUNCATED};
            }
            if (malformed) result.status = NLS2_SUBSTITUTED;
            result.written += utf16::put(character, out + result.written);
            i += next.bytes;
        }
        return result;
    }

    Conversion fromUTF16(const unsigned short* text, unsigned length, char* out,
                         unsigned capacity) const override {
        Conversion result{0, NLS2_OK};
        unsigned i = 0;
        while (i < length) {
            const unsigned run = narrowAscii(
                text + i, std::min(length - i, capacity - result.written), out + result.written);
            i += run;
            result.written += run;
            if (i == length) break;
            const utf16::Taken next = utf16::take(text + i, length - i);
            const char32_t character =
                next.character == utf16::kUnpaired ? kReplacementByte : next.character;
            const unsigned bytes = bytesOf(character);
            if (bytes > capacity - result.written) return {result.written, NLS2_TRUNCATED};
            if (next.character == utf16::kUnpaired) result.status = NLS2_SUBSTITUTED;
            encode(character, bytes, out + result.written);
            result.written += bytes;
            i += next.units;
        }
        return result;
    }
};

}  // namespace

std::unique_ptr<NLS2_LOCALE> makeUtf8Locale(int codepage) {
    return std::make_unique<Utf8Locale>(codepage);
}

}  // namespace nls2

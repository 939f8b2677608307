// UTF-8 by hand: the code page that nearly every machine has.

#include <cstdint>
#include <cstring>

#include "common/utf16.h"
#include "nls2/ascii.h"
#include "nls2/locale.h"

namespace nls2 {
namespace {

constexpr char32_t kMalformed = 0xFFFFFFFF;

/// One character of UTF-8, or as many bytes as a malformed one has that could have begun a
/// character.
struct Decoded {
    char32_t character;  // kMalformed if it is not one
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

/// Decodes the character that `text`, of at least one byte, begins with.
Decoded decode(const char* text, std::size_t length) {
    const auto lead = static_cast<unsigned char>(text[0]);
    if (lead < 0x80) return {lead, 1};
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

/// Half a block: the ASCII text between multi-byte characters is often shorter than a whole one.
constexpr unsigned kHalf = 8;
using HalfBytes = unsigned char __attribute__((vector_size(kHalf)));
using HalfUnits = unsigned short __attribute__((vector_size(kHalf * 2)));

/// Where a conversion stands. Each pointer moves towards its end.
struct Widening {
    const char* in;
    const char* const inEnd;
    unsigned short* out;
    unsigned short* const outEnd;
    int status = NLS2_OK;

    std::size_t left() const { return static_cast<std::size_t>(inEnd - in); }
    std::size_t room() const { return static_cast<std::size_t>(outEnd - out); }
    unsigned byte(unsigned i) const { return static_cast<unsigned char>(in[i]); }
    bool isContinuation(unsigned i) const { return (byte(i) & 0xC0) == 0x80; }
    void put(unsigned unit, unsigned bytes) {
        *out++ = static_cast<unsigned short>(unit);
        in += bytes;
    }
};

/// Converts the next character, or replaces malformed bytes. Returns false when there is no room.
bool widenAny(Widening& at) {
    const Decoded next = decode(at.in, at.left());
    const bool malformed = next.character == kMalformed;
    const char32_t character = malformed ? kReplacementUnit : next.character;
    if (utf16::unitsOf(character) > at.room()) return false;
    if (malformed) at.status = NLS2_SUBSTITUTED;
    at.out += utf16::put(character, at.out);
    at.in += next.bytes;
    return true;
}

/// The same for a position with three bytes that hold no ASCII character first, and room for a
/// unit, as nearly all have.
inline bool widenLong(Widening& at) {
    const unsigned lead = at.byte(0);
    if (lead >= 0xC2 && lead < 0xE0 && at.isContinuation(1)) {
        at.put((lead & 0x1F) << 6 | (at.byte(1) & 0x3F), 2);
        return true;
    }
    const unsigned unit = (lead & 0xF) << 12 | (at.byte(1) & 0x3F) << 6 | (at.byte(2) & 0x3F);
    const bool isSurrogate = unit >= 0xD800 && unit < 0xE000;
    const bool isOverlong = unit < 0x800;
    if ((lead & 0xF0) != 0xE0 || !at.isContinuation(1) || !at.isContinuation(2) || isSurrogate ||
        isOverlong) {
        return widenAny(at);
    }
    at.put(unit, 3);
    return true;
}

/// Makes units of the ASCII characters among the next eight bytes that come before any other;
/// returns how many. There is room for all eight.
inline unsigned widenAscii(Widening& at) {
    std::uint64_t word;
    std::memcpy(&word, at.in, sizeof word);
    // What is written too much is overwritten by what follows, or is not counted.
    HalfBytes bytes;
    std::memcpy(&bytes, &word, sizeof bytes);
    const HalfUnits units = __builtin_convertvector(bytes, HalfUnits);
    std::memcpy(at.out, &units, sizeof units);
    const std::uint64_t others = word & 0x8080808080808080u;
    const unsigned count = others == 0 ? kHalf : elementsBefore<8>(others);
    at.in += count;
    at.out += count;
    return count;
}

/// Converts all that there is; false when it has no room.
bool widenAll(Widening& at) {
    while (at.left() >= kHalf && at.room() >= kHalf) {
        if (widenAscii(at) == kHalf) continue;
        // Characters of one script follow each other.
        while (at.left() >= 3 && at.room() > 0 && at.byte(0) >= 0x80) {
            if (!widenLong(at)) return false;
        }
        if (at.left() < 3) break;
    }
    while (at.left() > 0) {
        if (at.byte(0) < 0x80 && at.room() > 0) {
            at.put(at.byte(0), 1);
        } else if (!widenAny(at)) {
            return false;
        }
    }
    return true;
}

/// The same the other way round.
struct Narrowing {
    const unsigned short* in;
    const unsigned short* const inEnd;
    char* out;
    char* const outEnd;
    int status = NLS2_OK;

    std::size_t left() const { return static_cast<std::size_t>(inEnd - in); }
    std::size_t room() const { return static_cast<std::size_t>(outEnd - out); }
};

inline void narrowRun(Narrowing& at) {
    while (at.left() >= kHalf && at.room() >= kHalf) {
        HalfUnits units;
        std::memcpy(&units, at.in, sizeof units);
        const HalfBytes bytes = __builtin_convertvector(units, HalfBytes);
        std::memcpy(at.out, &bytes, sizeof bytes);
        std::uint64_t words[2];
        std::memcpy(words, at.in, sizeof words);
        const std::uint64_t first = words[0] & 0xFF80FF80FF80FF80u;
        const std::uint64_t second = words[1] & 0xFF80FF80FF80FF80u;
        const unsigned run = first != 0    ? elementsBefore<16>(first)
                             : second != 0 ? kHalf / 2 + elementsBefore<16>(second)
                                           : kHalf;
        at.in += run;
        at.out += run;
        if (run < kHalf) return;
    }
    while (at.left() > 0 && at.room() > 0 && *at.in < 0x80)
        *at.out++ = static_cast<char>(*at.in++);
}

/// Converts a unit that is a character of two or three bytes; false when it is something else or
/// there is no room for three.
inline bool narrowShort(Narrowing& at) {
    const unsigned unit = *at.in;
    const bool isSurrogate = unit >= 0xD800 && unit < 0xE000;
    if (unit < 0x80 || isSurrogate || at.room() < 3) return false;
    if (unit < 0x800) {
        at.out[0] = static_cast<char>(0xC0 | unit >> 6);
        at.out[1] = static_cast<char>(0x80 | (unit & 0x3F));
        at.out += 2;
    } else {
        at.out[0] = static_cast<char>(0xE0 | unit >> 12);
        at.out[1] = static_cast<char>(0x80 | (unit >> 6 & 0x3F));
        at.out[2] = static_cast<char>(0x80 | (unit & 0x3F));
        at.out += 3;
    }
    ++at.in;
    return true;
}

bool narrowAny(Narrowing& at) {
    const utf16::Taken next = utf16::take(at.in, static_cast<unsigned>(at.left()));
    const bool unpaired = next.character == utf16::kUnpaired;
    const char32_t character = unpaired ? kReplacementByte : next.character;
    const unsigned bytes = bytesOf(character);
    if (bytes > at.room()) return false;
    if (unpaired) at.status = NLS2_SUBSTITUTED;
    encode(character, bytes, at.out);
    at.out += bytes;
    at.in += next.units;
    return true;
}

struct Utf8Locale : NLS2_LOCALE {
    using NLS2_LOCALE::NLS2_LOCALE;

    Conversion toUTF16(const char* text, unsigned length, unsigned short* out,
                       unsigned capacity) const override {
        Widening at{text, text + length, out, out + capacity};
        const bool fits = widenAll(at);
        return {static_cast<unsigned>(at.out - out), fits ? at.status : NLS2_TRUNCATED};
    }

    Conversion fromUTF16(const unsigned short* text, unsigned length, char* out,
                         unsigned capacity) const override {
        Narrowing at{text, text + length, out, out + capacity};
        const auto written = [&] { return static_cast<unsigned>(at.out - out); };
        for (;;) {
            narrowRun(at);
            while (at.left() > 0 && at.room() > 0 && *at.in >= 0x80) {
                if (!narrowShort(at) && !narrowAny(at)) return {written(), NLS2_TRUNCATED};
            }
            if (at.left() == 0) return {written(), at.status};
            if (at.room() == 0) return {written(), NLS2_TRUNCATED};
        }
    }
};

}  // namespace

std::unique_ptr<NLS2_LOCALE> makeUtf8Locale(int codepage) {
    return std::make_unique<Utf8Locale>(codepage);
}

}  // namespace nls2

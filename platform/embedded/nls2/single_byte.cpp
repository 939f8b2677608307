// Code pages of one byte per character: ISO 8859-1, whose bytes are the units, and the others by
// table.

#include <algorithm>
#include <array>

#include "common/utf16.h"
#include "nls2/ascii.h"
#include "nls2/locale.h"

namespace nls2 {
namespace {

/// Narrows by `byteOf(unit, byte)`, which is false for a unit without a counterpart; `narrowRun`
/// takes the runs that need no look at each unit.
template <typename NarrowRun, typename ByteOf>
Conversion narrow(const unsigned short* text, unsigned length, char* out, unsigned capacity,
                  char replacement, NarrowRun narrowRun, ByteOf byteOf) {
    Conversion result{0, NLS2_OK};
    unsigned i = 0;
    while (i < length) {
        const unsigned room = std::min(length - i, capacity - result.written);
        const unsigned run = narrowRun(text + i, room, out + result.written);
        i += run;
        result.written += run;
        if (i == length) break;
        if (result.written == capacity) return {result.written, NLS2_TRUNCATED};
        char& byte = out[result.written++];
        if (byteOf(text[i], byte)) {
            ++i;
        } else {
            byte = replacement;
            result.status = NLS2_SUBSTITUTED;
            i += utf16::take(text + i, length - i).units;
        }
    }
    return result;
}

struct Latin1Locale : NLS2_LOCALE {
    using NLS2_LOCALE::NLS2_LOCALE;

    Conversion toUTF16(const char* text, unsigned length, unsigned short* out,
                       unsigned capacity) const override {
        const unsigned count = std::min(length, capacity);
        unsigned i = 0;
        for (; count - i >= kBlock; i += kBlock)
            widenBlock(text + i, out + i);
        for (; i < count; ++i)
            out[i] = static_cast<unsigned char>(text[i]);
        return {count, count < length ? NLS2_TRUNCATED : NLS2_OK};
    }

    Conversion fromUTF16(const unsigned short* text, unsigned length, char* out,
                         unsigned capacity) const override {
        return narrow(text, length, out, capacity, kReplacementByte, narrowUpTo<0xFF>,
                      [](unsigned short, char&) { return false; });
    }
};

class SingleByteLocale : public NLS2_LOCALE {
public:
    SingleByteLocale(int number, const unsigned short* units) : NLS2_LOCALE(number) {
        std::copy_n(units, units_.size(), units_.begin());
        // From the last to the first: of two bytes with the same character the lower one stands.
        for (unsigned byte = 256; byte-- > 0;) {
            if (units_[byte] != kReplacementUnit) {
                bytes_[units_[byte]] = static_cast<char>(byte);
            }
        }
        if (bytes_['?'] != 0) replacement_ = bytes_['?'];
        for (unsigned short byte = 0; byte < 0x80; ++byte) {
            ascii_ = ascii_ && units_[byte] == byte && bytes_[byte] == static_cast<char>(byte);
        }
    }

    Conversion toUTF16(const char* text, unsigned length, unsigned short* out,
                       unsigned capacity) const override {
        const unsigned count = std::min(length, capacity);
        bool substituted = false;
        for (unsigned i = 0; i < count;) {
            if (ascii_) i += widenAscii(text + i, count - i, out + i);
            if (i == count) break;
            out[i] = units_[static_cast<unsigned char>(text[i])];
            substituted = substituted || out[i] == kReplacementUnit;
            ++i;
        }
        return {count, count < length ? NLS2_TRUNCATED : substituted ? NLS2_SUBSTITUTED : NLS2_OK};
    }

    Conversion fromUTF16(const unsigned short* text, unsigned length, char* out,
                         unsigned capacity) const override {
        return narrow(
            text, length, out, capacity, replacement_,
            [this](const unsigned short* run, unsigned count, char* to) {
                return ascii_ ? narrowAscii(run, count, to) : 0u;
            },
            [this](unsigned short unit, char& byte) {
                byte = bytes_[unit];
                return byte != 0 || unit == units_[0];
            });
    }

private:
    std::array<unsigned short, 256> units_{};
    std::array<char, 65536> bytes_{};  // 0 where a unit has no byte
    char replacement_ = kReplacementByte;
    bool ascii_ = true;  // ASCII characters are themselves
};

}  // namespace

std::unique_ptr<NLS2_LOCALE> makeLatin1Locale(int codepage) {
    return std::make_unique<Latin1Locale>(codepage);
}

std::unique_ptr<NLS2_LOCALE> makeSingleByteLocale(int codepage, const unsigned short* units) {
    return std::make_unique<SingleByteLocale>(codepage, units);
}

}  // namespace nls2

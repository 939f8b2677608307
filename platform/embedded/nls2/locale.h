/// What a locale of the embedded platform is: a code page and its two conversions.
///
/// Locales are made once per code page and stay, so a handle that one thread releases is still
/// good in another that is converting with it.
#pragma once

#include <memory>

#include "nls2/codepages.h"
#include "platform/nls2.h"

namespace nls2 {

/// What a conversion wrote, in units or bytes, and how it went (NLS2_OK and so on).
struct Conversion {
    unsigned written;
    int status;
};

constexpr unsigned short kReplacementUnit = 0xFFFD;
constexpr char kReplacementByte = '?';

}  // namespace nls2

struct NLS2_LOCALE {
    explicit NLS2_LOCALE(int number) : codepage(number) {}
    virtual ~NLS2_LOCALE() = default;
    NLS2_LOCALE(const NLS2_LOCALE&) = delete;
    NLS2_LOCALE& operator=(const NLS2_LOCALE&) = delete;

    /// Both are called by any number of threads at once.
    virtual nls2::Conversion toUTF16(const char* text, unsigned length, unsigned short* out,
                                     unsigned capacity) const = 0;
    virtual nls2::Conversion fromUTF16(const unsigned short* text, unsigned length, char* out,
                                       unsigned capacity) const = 0;

    const int codepage;
};

namespace nls2 {

std::unique_ptr<NLS2_LOCALE> makeUtf8Locale(int codepage);
std::unique_ptr<NLS2_LOCALE> makeLatin1Locale(int codepage);
/// A code page of one byte per character. `units` has the character of each of the 256 bytes,
/// kReplacementUnit where there is none.
std::unique_ptr<NLS2_LOCALE> makeSingleByteLocale(int codepage, const unsigned short* units);
/// Any code page that iconv knows; one of single bytes is turned into a table. Null when this
/// machine's iconv lacks it.
std::unique_ptr<NLS2_LOCALE> makeIconvLocale(const CodePage& page);

}  // namespace nls2

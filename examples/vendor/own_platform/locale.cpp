// Locales: UTF-8 and ISO 8859-1, which is all that this vendor's agents run in. Other code pages
// are left out.

#include <langinfo.h>
#include <locale.h>

#include <clocale>
#include <cstring>
#include <string>

#include "platform/nls2.h"

struct NLS2_LOCALE {
    int codepage;
};

namespace {

constexpr unsigned kReplacement = 0xFFFD;

// There are two locales, and they have no state: a handle points to one of them.
NLS2_LOCALE utf8{NLS2_CP_UTF8};
NLS2_LOCALE latin1{NLS2_CP_ISO8859_1};

NLS2_LOCALE* localeOf(int codepage) {
    if (codepage == NLS2_CP_UTF8) return &utf8;
    if (codepage == NLS2_CP_ISO8859_1) return &latin1;
    return nullptr;
}

/// The process's own locale or, while it has set none, the one that the environment names.
bool processIsUtf8() {
    const char* const own = std::setlocale(LC_CTYPE, nullptr);
    const bool isUnset = own == nullptr || std::strcmp(own, "C") == 0;
    if (!isUnset) return std::strcmp(::nl_langinfo(CODESET), "UTF-8") == 0;
    const locale_t environment = ::newlocale(LC_CTYPE_MASK, "", nullptr);
    if (environment == nullptr) return false;
    const bool isUtf8 = std::strcmp(::nl_langinfo_l(CODESET, environment), "UTF-8") == 0;
    ::freelocale(environment);
    return isUtf8;
}

void setStatus(int* status, int value) {
    if (status != nullptr) *status = value;
}

/// One character taken from a text, and the bytes or units that it took.
struct Taken {
    unsigned character;  ///< kReplacement for what is malformed
    unsigned length;
    bool wellFormed;
};

Taken takeUtf8(const char* text, unsigned left) {
    const auto at = [text](unsigned i) { return static_cast<unsigned char>(text[i]); };
    const unsigned lead = at(0);
    if (lead < 0x80) return {lead, 1, true};
    const unsigned length = lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : 2;
    const Taken malformed{kReplacement, 1, false};
    if (lead < 0xC2 || lead > 0xF4 || length > left) return malformed;
    unsigned character = lead & (0x7FU >> length);
    for (unsigned i = 1; i < length; ++i) {
        if ((at(i) & 0xC0) != 0x80) return malformed;
        character = character << 6 | (at(i) & 0x3F);
    }
    constexpr unsigned kSmallest[] = {0, 0, 0x80, 0x800, 0x10000};
    const bool isSurrogate = character >= 0xD800 && character <= 0xDFFF;
    if (character < kSmallest[length] || character > 0x10FFFF || isSurrogate) return malformed;
    return {character, length, true};
}

Taken takeUtf16(const unsigned short* text, unsigned left) {
    const unsigned first = text[0];
    if (first < 0xD800 || first > 0xDFFF) return {first, 1, true};
    if (first > 0xDBFF || left < 2 || text[1] < 0xDC00 || text[1] > 0xDFFF) {
        return {'?', 1, false};
    }
    return {0x10000 + ((first - 0xD800) << 10) + (text[1] - 0xDC00U), 2, true};
}

unsigned putUtf16(unsigned character, unsigned short* out) {
    if (character < 0x10000) {
        out[0] = static_cast<unsigned short>(character);
        return 1;
    }
    out[0] = static_cast<unsigned short>(0xD7C0 + (character >> 10));
    out[1] = static_cast<unsigned short>(0xDC00 + (character & 0x3FF));
    return 2;
}

unsigned putUtf8(unsigned character, char* out) {
    if (character < 0x80) {
        out[0] = static_cast<char>(character);
        return 1;
    }
    const unsigned length = character < 0x800 ? 2 : character < 0x10000 ? 3 : 4;
    for (unsigned i = length - 1; i > 0; --i, character >>= 6)
        out[i] = static_cast<char>(0x80 | (character & 0x3F));
    constexpr unsigned kLead[] = {0, 0, 0xC0, 0xE0, 0xF0};
    out[0] = static_cast<char>(kLead[length] | character);
    return length;
}

}  // namespace

NLS2_LOCALE* NLS2_GetLocale(int selector, int codepage, int, int* status) {
    NLS2_LOCALE* locale = nullptr;
    if (selector == NLS2_BY_DEFAULT) locale = processIsUtf8() ? &utf8 : &latin1;
    if (selector == NLS2_BY_CODEPAGE) locale = localeOf(codepage);
    setStatus(status, locale != nullptr ? NLS2_OK : NLS2_NO_LOCALE);
    return locale;
}

int NLS2_GetLocaleCodepageId(NLS2_LOCALE* locale, int* status) {
    setStatus(status, locale != nullptr ? NLS2_OK : NLS2_NO_LOCALE);
    return locale != nullptr ? locale->codepage : 0;
}

void NLS2_ReleaseLocale(NLS2_LOCALE*) {}

unsigned NLS2_toUTF16(NLS2_LOCALE* locale, const char* text, unsigned length, unsigned short* out,
                      unsigned capacity, int* status) {
    setStatus(status, locale != nullptr ? NLS2_OK : NLS2_NO_LOCALE);
    if (locale == nullptr) return 0;
    unsigned written = 0;
    for (unsigned at = 0; at < length;) {
        const Taken taken = locale == &utf8 ? takeUtf8(text + at, length - at)
                                            : Taken{static_cast<unsigned char>(text[at]), 1, true};
        if (written + (taken.character < 0x10000 ? 1 : 2) > capacity) {
            setStatus(status, NLS2_TRUNCATED);
            break;
        }
        if (!taken.wellFormed) setStatus(status, NLS2_SUBSTITUTED);
        written += putUtf16(taken.character, out + written);
        at += taken.length;
    }
    return written;
}

unsigned NLS2_fromUTF16(NLS2_LOCALE* locale, const unsigned short* text, unsigned length, char* out,
                        unsigned capacity, int* status) {
    setStatus(status, locale != nullptr ? NLS2_OK : NLS2_NO_LOCALE);
    if (locale == nullptr) return 0;
    unsigned written = 0;
    for (unsigned at = 0; at < length;) {
        Taken taken = takeUtf16(text + at, length - at);
        if (locale == &latin1 && taken.character > 0xFF) {
            taken.character = '?';
            taken.wellFormed = false;
        }
        char bytes[4] = {static_cast<char>(taken.character)};
        const unsigned count = locale == &utf8 ? putUtf8(taken.character, bytes) : 1;
        if (written + count > capacity) {
            setStatus(status, NLS2_TRUNCATED);
            break;
        }
        if (!taken.wellFormed) setStatus(status, NLS2_SUBSTITUTED);
        std::memcpy(out + written, bytes, count);
        written += count;
        at += taken.length;
    }
    return written;
}

/// National language support: locales and their code pages, conversion from and to UTF-16.
///
/// A locale handle may be used by several threads at once.
#pragma once

/// An open locale; owned by the platform.
struct NLS2_LOCALE;

enum : int {
    NLS2_OK = 0,
    NLS2_NO_LOCALE = 1,    ///< the handle is null, or no such locale or code page
    NLS2_SUBSTITUTED = 2,  ///< something could not be converted and was replaced
    NLS2_TRUNCATED = 3,    ///< the output was too small for the whole text
};

/// Selectors of NLS2_GetLocale.
enum : int {
    NLS2_BY_DEFAULT = 0,          ///< the process's own locale
    NLS2_BY_CODEPAGE = 25690123,  ///< 0x0188000B: the code page in the second argument
};

/// Code page numbers that callers name.
enum : int {
    NLS2_CP_ISO8859_1 = 819,
    NLS2_CP932 = 932,
    NLS2_CP943 = 943,
    NLS2_CP_UTF8 = 1208,
    NLS2_CP_EUC_JP = 33722,
};

extern "C" {

/// Opens a locale. `selector` is one of the two above; `codepage` counts with NLS2_BY_CODEPAGE
/// only; `flags` is 0. Returns null and sets `*status` to NLS2_NO_LOCALE if there is no such
/// locale. The caller releases the handle with NLS2_ReleaseLocale.
NLS2_LOCALE* NLS2_GetLocale(int selector, int codepage, int flags, int* status);

/// The number of the locale's code page; 0 for a null handle.
int NLS2_GetLocaleCodepageId(NLS2_LOCALE* locale, int* status);

/// Releases a locale; null is ignored.
void NLS2_ReleaseLocale(NLS2_LOCALE* locale);

/// Converts `length` bytes of text in the locale's code page to UTF-16 in `out`, which has room for
/// `capacity` units. A terminating 0 is converted if `length` counts it. Writes whole characters
/// only and never more than fits; what cannot be converted becomes U+FFFD. Returns the number of
/// units written, 0 for a null handle, and sets `*status`.
unsigned NLS2_toUTF16(NLS2_LOCALE* locale, const char* text, unsigned length, unsigned short* out,
                      unsigned capacity, int* status);

/// Converts `length` UTF-16 units to the locale's code page in `out`, which has room for `capacity`
/// bytes. Writes whole characters only and never more than fits; what cannot be converted becomes
/// "?". Returns the number of bytes written, 0 for a null handle, and sets `*status`.
unsigned NLS2_fromUTF16(NLS2_LOCALE* locale, const unsigned short* text, unsigned length, char* out,
                        unsigned capacity, int* status);

}  // extern "C"

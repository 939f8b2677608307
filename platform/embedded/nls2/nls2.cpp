// Locales: which one the process has, and one object for each code page that was ever opened.

#include "platform/nls2.h"

#include <langinfo.h>
#include <locale.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>
#include <map>
#include <mutex>
#include <string>

#include "nls2/locale.h"

using nls2::CodePage;
using nls2::Conversion;

namespace {

/// The opened locales; immortal, as texts are converted until the process is gone.
struct Opened {
    std::mutex mutex;
    std::map<int, std::unique_ptr<NLS2_LOCALE>> locales;  // guarded by mutex; never removed
};

Opened& opened() {
    static Opened& instance = *new Opened;
    return instance;
}

std::unique_ptr<NLS2_LOCALE> make(const CodePage& page) {
    switch (page.number) {
        case NLS2_CP_UTF8:
            return nls2::makeUtf8Locale(page.number);
        case NLS2_CP_ISO8859_1:
            return nls2::makeLatin1Locale(page.number);
        default:
            return nls2::makeIconvLocale(page);
    }
}

/// The locale of a code page; null when this machine's iconv lacks it.
NLS2_LOCALE* open(const CodePage& page) {
    const std::lock_guard<std::mutex> lock(opened().mutex);
    std::unique_ptr<NLS2_LOCALE>& locale = opened().locales[page.number];
    if (!locale) locale = make(page);
    return locale.get();
}

/// The locale that was last asked for its codeset. Opening one maps files, which takes longer than
/// reading a small document, and most processes have the same one from start to end.
class LastLocale {
public:
    /// The codeset of a locale by its name ("" is the environment's); empty when there is none
    /// such.
    std::string codesetOf(const char* localeName) {
        const std::lock_guard<std::mutex> lock(mutex_);
        const Key key = keyOf(localeName);
        if (locale_ == locale_t{} || !std::equal(key.begin(), key.end(), key_.begin())) {
            std::array<std::string, kKeyParts> kept;
            std::copy(key.begin(), key.end(), kept.begin());
            const locale_t opened = ::newlocale(LC_CTYPE_MASK, localeName, locale_t{});
            if (opened == locale_t{}) return {};
            if (locale_ != locale_t{}) ::freelocale(locale_);
            locale_ = opened;
            key_.swap(kept);
        }
        return ::nl_langinfo_l(CODESET, locale_);
    }

private:
    /// All that decides which locale a name leads to: itself and variables of the environment.
    static constexpr std::size_t kKeyParts = 5;
    using Key = std::array<const char*, kKeyParts>;

    static Key keyOf(const char* localeName) {
        return {localeName, valueOf("LOCPATH"), valueOf("LC_ALL"), valueOf("LC_CTYPE"),
                valueOf("LANG")};
    }

    /// A variable that is empty counts as one that is not set.
    static const char* valueOf(const char* variable) {
        const char* const value = std::getenv(variable);
        return value != nullptr ? value : "";
    }

    std::mutex mutex_;
    // Guarded by mutex_:
    locale_t locale_{};
    std::array<std::string, kKeyParts> key_;  // that locale_ was opened with
};

LastLocale& lastLocale() {
    static LastLocale& instance = *new LastLocale;
    return instance;
}

/// The codeset of the locale that the process has set. A process that has set none is taken to
/// want what its environment says; an environment without a usable locale is plain C.
std::string processCodeset() {
    const char* const set = ::setlocale(LC_CTYPE, nullptr);
    const bool isPlain =
        set == nullptr || std::strcmp(set, "C") == 0 || std::strcmp(set, "POSIX") == 0;
    const std::string codeset = lastLocale().codesetOf(isPlain ? "" : set);
    return codeset.empty() ? "ASCII" : codeset;
}

/// The process's locale. One whose code page is not known is replaced by ISO 8859-1, which at least
/// keeps every byte as it is.
NLS2_LOCALE* openDefault(int& status) {
    if (const CodePage* const page = nls2::codePageOfCodeset(processCodeset())) {
        if (NLS2_LOCALE* const locale = open(*page)) return locale;
    }
    status = NLS2_SUBSTITUTED;
    return open(*nls2::codePageNumbered(NLS2_CP_ISO8859_1));
}

NLS2_LOCALE* openNumbered(int codepage, int& status) {
    const CodePage* const page = nls2::codePageNumbered(codepage);
    NLS2_LOCALE* const locale = page != nullptr ? open(*page) : nullptr;
    if (locale == nullptr) status = NLS2_NO_LOCALE;
    return locale;
}

void report(int status, int* out) {
    if (out != nullptr) *out = status;
}

}  // namespace

NLS2_LOCALE* NLS2_GetLocale(int selector, int codepage, int /*flags*/, int* status) {
    int outcome = NLS2_OK;
    NLS2_LOCALE* locale = nullptr;
    if (selector == NLS2_BY_DEFAULT) {
        locale = openDefault(outcome);
    } else if (selector == NLS2_BY_CODEPAGE) {
        locale = openNumbered(codepage, outcome);
    } else {
        outcome = NLS2_NO_LOCALE;
    }
    report(outcome, status);
    return locale;
}

int NLS2_GetLocaleCodepageId(NLS2_LOCALE* locale, int* status) {
    report(locale != nullptr ? NLS2_OK : NLS2_NO_LOCALE, status);
    return locale != nullptr ? locale->codepage : 0;
}

void NLS2_ReleaseLocale(NLS2_LOCALE* /*locale*/) {
    // A locale is shared by all who opened its code page, and stays for the next one.
}

unsigned NLS2_toUTF16(NLS2_LOCALE* locale, const char* text, unsigned length, unsigned short* out,
                      unsigned capacity, int* status) {
    const Conversion done = locale != nullptr ? locale->toUTF16(text, length, out, capacity)
                                              : Conversion{0, NLS2_NO_LOCALE};
    report(done.status, status);
    return done.written;
}

unsigned NLS2_fromUTF16(NLS2_LOCALE* locale, const unsigned short* text, unsigned length, char* out,
                        unsigned capacity, int* status) {
    const Conversion done = locale != nullptr ? locale->fromUTF16(text, length, out, capacity)
                                              : Conversion{0, NLS2_NO_LOCALE};
    report(done.status, status);
    return done.written;
}

// What nls2.h promises: locales and conversions. The code pages that the header names must exist;
// the rules on conversions ask of each of them what they ask of every code page.

#include "platform/nls2.h"

#include <algorithm>
#include <atomic>
#include <clocale>
#include <cstdlib>
#include <memory>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "conformance/rule.h"

namespace conformance {
namespace {

using Units = std::vector<unsigned short>;

constexpr unsigned short kReplacement = 0xFFFD;
constexpr const char* kUtf8Locale = "C.UTF-8";

struct Release {
    void operator()(NLS2_LOCALE* locale) const { NLS2_ReleaseLocale(locale); }
};
using Locale = std::unique_ptr<NLS2_LOCALE, Release>;

Locale tryOpen(int codepage) {
    int status = -1;
    return Locale(NLS2_GetLocale(NLS2_BY_CODEPAGE, codepage, 0, &status));
}

Locale openPage(int codepage) {
    Locale locale = tryOpen(codepage);
    require(locale != nullptr, "code page " + std::to_string(codepage) + " cannot be opened");
    return locale;
}

template <typename Text>
struct Converted {
    Text text;
    int status;
};

/// Converts into a buffer of exactly that capacity, behind which nothing may change.
Converted<Units> widen(NLS2_LOCALE* locale, const std::string& bytes, unsigned capacity) {
    constexpr unsigned short kGuard = 0x5A5A;
    constexpr unsigned kGuards = 4;
    Units out(capacity + kGuards, kGuard);
    int status = -1;
    const unsigned written = NLS2_toUTF16(locale, bytes.data(), static_cast<unsigned>(bytes.size()),
                                          out.data(), capacity, &status);
    require(written <= capacity, "says to have written more than fits");
    require(std::all_of(out.end() - kGuards, out.end(), [](auto u) { return u == kGuard; }),
            "wrote behind the output");
    out.resize(written);
    return {out, status};
}

Converted<std::string> narrow(NLS2_LOCALE* locale, const Units& units, unsigned capacity) {
    constexpr char kGuard = 'Z';
    std::string out(capacity + 8U, kGuard);
    int status = -1;
    const unsigned written = NLS2_fromUTF16(
        locale, units.data(), static_cast<unsigned>(units.size()), out.data(), capacity, &status);
    require(written <= capacity, "says to have written more than fits");
    require(out.find_first_not_of(kGuard, capacity) == std::string::npos,
            "wrote behind the output");
    out.resize(written);
    return {out, status};
}

Units widened(NLS2_LOCALE* locale, const std::string& bytes) {
    return widen(locale, bytes, static_cast<unsigned>(bytes.size()) * 2 + 4).text;
}

std::string narrowed(NLS2_LOCALE* locale, const Units& units) {
    return narrow(locale, units, static_cast<unsigned>(units.size()) * 4 + 4).text;
}

struct Sample {
    int codepage;
    std::string bytes;
    Units units;
};

/// The code pages that the header names, each with a text that it can hold.
const std::vector<Sample>& samples() {
    static const std::vector<Sample> all = {
        {NLS2_CP_UTF8,
         "\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80z",
         {0xE9, 0x20AC, 0xD83D, 0xDE00, 'z'}},
        {NLS2_CP_ISO8859_1, "a\xE9\xFF", {'a', 0xE9, 0xFF}},
        {NLS2_CP932, "a\x82\xA0\x83\x5Cz", {'a', 0x3042, 0x30BD, 'z'}},
        {NLS2_CP943, "a\x82\xA0z", {'a', 0x3042, 'z'}},
        {NLS2_CP_EUC_JP, "a\xA4\xA2z", {'a', 0x3042, 'z'}},
    };
    return all;
}

/// Runs a check on each named code page that can be opened; that all can be is GetLocale's promise.
template <typename Check>
void onEveryPage(Check check) {
    for (const Sample& sample : samples()) {
        const Locale locale = tryOpen(sample.codepage);
        if (!locale) continue;
        try {
            check(locale.get(), sample);
        } catch (const Unfulfilled& broken) {
            throw Unfulfilled("code page " + std::to_string(sample.codepage) + ": " +
                              broken.what());
        }
    }
}

// --- Opening ----------------------------------------------------------------------------------

void opensTheNamedPages(Bench&) {
    std::string missing;
    for (const Sample& sample : samples()) {
        int status = -1;
        const Locale locale(NLS2_GetLocale(NLS2_BY_CODEPAGE, sample.codepage, 0, &status));
        if (!locale || status != NLS2_OK) missing += " " + std::to_string(sample.codepage);
    }
    require(missing.empty(), "without" + missing);
}

void refusesOtherPages(Bench&) {
    for (const int codepage : {12345, 0, -1}) {
        int status = -1;
        require(NLS2_GetLocale(NLS2_BY_CODEPAGE, codepage, 0, &status) == nullptr,
                "opened code page " + std::to_string(codepage));
        requireEqual(status, int{NLS2_NO_LOCALE}, "the status");
    }
}

void refusesOtherSelectors(Bench&) {
    int status = -1;
    require(NLS2_GetLocale(7, NLS2_CP_UTF8, 0, &status) == nullptr, "took selector 7");
    requireEqual(status, int{NLS2_NO_LOCALE}, "the status");
}

int defaultPage() {
    int status = -1;
    const Locale locale(NLS2_GetLocale(NLS2_BY_DEFAULT, 0, 0, &status));
    require(locale != nullptr, "the default locale cannot be opened");
    return NLS2_GetLocaleCodepageId(locale.get(), &status);
}

void takesTheEnvironmentsLocale(Bench&) {
    std::setlocale(LC_ALL, "C");
    ::setenv("LC_ALL", kUtf8Locale, 1);
    requireEqual(defaultPage(), int{NLS2_CP_UTF8}, "the code page");
    requireEqual(std::string(std::setlocale(LC_ALL, nullptr)), "C", "the process's own locale");
}

void takesTheProcessesLocale(Bench&) {
    ::setenv("LC_ALL", "C", 1);
    require(std::setlocale(LC_CTYPE, kUtf8Locale) != nullptr, "this machine has no C.UTF-8");
    requireEqual(defaultPage(), int{NLS2_CP_UTF8}, "the code page");
}

void givesThePagesNumber(Bench&) {
    onEveryPage([](NLS2_LOCALE* locale, const Sample& sample) {
        int status = -1;
        requireEqual(NLS2_GetLocaleCodepageId(locale, &status), sample.codepage, "the number");
        requireEqual(status, int{NLS2_OK}, "the status");
    });
}

void hasNoNumberForNoLocale(Bench&) {
    int status = -1;
    requireEqual(NLS2_GetLocaleCodepageId(nullptr, &status), 0, "the number");
    requireEqual(status, int{NLS2_NO_LOCALE}, "the status");
}

void ignoresNoLocale(Bench&) {
    NLS2_ReleaseLocale(nullptr);
}

// --- Conversion -------------------------------------------------------------------------------

void knowsTheCharactersOfBytes(Bench&) {
    onEveryPage([](NLS2_LOCALE* locale, const Sample& sample) {
        requireEqual(widened(locale, sample.bytes), sample.units, "the text");
    });
}

void knowsTheBytesOfCharacters(Bench&) {
    onEveryPage([](NLS2_LOCALE* locale, const Sample& sample) {
        requireEqual(narrowed(locale, sample.units), sample.bytes, "the text");
    });
}

void widensATerminatorThatCounts(Bench&) {
    onEveryPage([](NLS2_LOCALE* locale, const Sample&) {
        requireEqual(widened(locale, std::string("a\0", 2)), Units{'a', 0}, "the text");
        requireEqual(widen(locale, "", 0).text, Units{}, "no text");
    });
}

void narrowsATerminatorThatCounts(Bench&) {
    onEveryPage([](NLS2_LOCALE* locale, const Sample&) {
        requireEqual(narrowed(locale, {'a', 0}), std::string("a\0", 2), "the text");
        requireEqual(narrow(locale, {}, 0).text, "", "no text");
    });
}

void widensWholeCharactersOnly(Bench&) {
    onEveryPage([](NLS2_LOCALE* locale, const Sample& sample) {
        for (unsigned capacity = 0; capacity <= sample.units.size() + 2; ++capacity) {
            const Converted<Units> cut = widen(locale, sample.bytes, capacity);
            requireEqual(cut.status == NLS2_TRUNCATED, capacity < sample.units.size(),
                         "truncated with room for " + std::to_string(capacity));
            require(std::equal(cut.text.begin(), cut.text.end(), sample.units.begin()),
                    "a cut text is not the beginning of the whole");
            require(cut.text.empty() || (cut.text.back() & 0xFC00) != 0xD800, "half a pair");
            require(cut.text.size() + 1 >= std::min<std::size_t>(capacity, sample.units.size()),
                    "a character was left out that fits");
        }
    });
}

void narrowsWholeCharactersOnly(Bench&) {
    onEveryPage([](NLS2_LOCALE* locale, const Sample& sample) {
        for (unsigned capacity = 0; capacity <= sample.bytes.size() + 2; ++capacity) {
            const Converted<std::string> cut = narrow(locale, sample.units, capacity);
            requireEqual(cut.status == NLS2_TRUNCATED, capacity < sample.bytes.size(),
                         "truncated with room for " + std::to_string(capacity));
            const Units back = widened(locale, cut.text);
            require(back.size() <= sample.units.size() &&
                        std::equal(back.begin(), back.end(), sample.units.begin()),
                    "a cut text is not the beginning of the whole");
            require(cut.text.size() + 3 >= std::min<std::size_t>(capacity, sample.bytes.size()),
                    "a character was left out that fits");
        }
    });
}

void replacesMalformedBytes(Bench&) {
    const Locale utf8 = openPage(NLS2_CP_UTF8);
    for (const char* const bytes :
         {"\x80", "\xC0\x80", "\xED\xA0\x80", "\xF4\x90\x80\x80", "\xFF", "\xE2\x82"}) {
        const Converted<Units> result = widen(utf8.get(), std::string(bytes) + "z", 10);
        requireEqual(result.status, int{NLS2_SUBSTITUTED}, "the status for " + shown(bytes));
        require(result.text.size() >= 2 && result.text.back() == 'z' &&
                    std::all_of(result.text.begin(), result.text.end() - 1,
                                [](auto unit) { return unit == kReplacement; }),
                shown(bytes) + " became " + shown(result.text));
    }
}

void replacesWhatThePageLacks(Bench&) {
    const Locale latin1 = openPage(NLS2_CP_ISO8859_1);
    const Converted<std::string> result =
        narrow(latin1.get(), {'a', 0x20AC, 0xD83D, 0xDE00, 'b'}, 10);
    requireEqual(result.text, "a??b", "the text");
    requireEqual(result.status, int{NLS2_SUBSTITUTED}, "the status");
}

void replacesHalfPairs(Bench&) {
    const Locale utf8 = openPage(NLS2_CP_UTF8);
    requireEqual(narrowed(utf8.get(), {0xDE00, 0xD83D, 'a'}), "??a", "two halves, turned");
    requireEqual(narrowed(utf8.get(), {0xD83D, 0xD83D, 0xDE00}), "?\xF0\x9F\x98\x80",
                 "a half before a pair");
    requireEqual(narrow(utf8.get(), {0xD83D}, 4).status, int{NLS2_SUBSTITUTED}, "the status");
}

void keepsEveryCharacterOfUtf8(Bench&) {
    const Locale utf8 = openPage(NLS2_CP_UTF8);
    Units units;
    for (unsigned unit = 0; unit < 0x10000; ++unit) {
        if (unit < 0xD800 || unit > 0xDFFF) units.push_back(static_cast<unsigned short>(unit));
    }
    for (unsigned high = 0xD800; high < 0xDC00; ++high) {
        for (unsigned low = 0xDC00; low < 0xE000; low += 13) {
            units.push_back(static_cast<unsigned short>(high));
            units.push_back(static_cast<unsigned short>(low));
        }
    }
    const Converted<std::string> bytes =
        narrow(utf8.get(), units, static_cast<unsigned>(units.size()) * 3);
    requireEqual(bytes.status, int{NLS2_OK}, "the status of the way there");
    const Converted<Units> back =
        widen(utf8.get(), bytes.text, static_cast<unsigned>(units.size()));
    requireEqual(back.status, int{NLS2_OK}, "the status of the way back");
    require(back.text == units, "a character did not come back");
}

void widensAnyBytes(Bench&) {
    onEveryPage([](NLS2_LOCALE* locale, const Sample& sample) {
        std::minstd_rand random(static_cast<unsigned>(sample.codepage));
        for (int turn = 0; turn < 300; ++turn) {
            std::string bytes;
            for (auto left = random() % 40; left > 0; --left)
                bytes += static_cast<char>(random() >> 8);
            bytes += '\0';
            const Converted<Units> result =
                widen(locale, bytes, static_cast<unsigned>(bytes.size()) * 2);
            require(result.status != NLS2_TRUNCATED, "needs more than two units for a byte");
            require(!result.text.empty() && result.text.back() == 0, "ate the terminator");
            widen(locale, bytes, static_cast<unsigned>(random() % 20));
        }
    });
}

void narrowsAnyUnits(Bench&) {
    onEveryPage([](NLS2_LOCALE* locale, const Sample& sample) {
        std::minstd_rand random(static_cast<unsigned>(sample.codepage));
        for (int turn = 0; turn < 300; ++turn) {
            Units units;
            for (auto left = random() % 40; left > 0; --left) {
                // Many surrogates, some of them paired by chance.
                const auto any = random() >> 4;
                units.push_back(static_cast<unsigned short>(
                    any % 3 == 0 ? 0xD800 | (any >> 8 & 0x7FF) : any >> 8));
            }
            units.push_back(0);
            const Converted<std::string> result =
                narrow(locale, units, static_cast<unsigned>(units.size()) * 4);
            require(result.status != NLS2_TRUNCATED, "needs more than four bytes for a unit");
            require(!result.text.empty() && result.text.back() == '\0', "ate the terminator");
            narrow(locale, units, static_cast<unsigned>(random() % 20));
        }
    });
}

void widensNothingWithoutALocale(Bench&) {
    const Converted<Units> result = widen(nullptr, "abc", 4);
    requireEqual(result.text, Units{}, "the text");
    requireEqual(result.status, int{NLS2_NO_LOCALE}, "the status");
}

void narrowsNothingWithoutALocale(Bench&) {
    const Converted<std::string> result = narrow(nullptr, {'a'}, 4);
    requireEqual(result.text, "", "the text");
    requireEqual(result.status, int{NLS2_NO_LOCALE}, "the status");
}

/// Runs `convert`, which says whether all went well, on several threads with one handle.
template <typename Convert>
void shareAHandle(Convert convert) {
    onEveryPage([&](NLS2_LOCALE* locale, const Sample& sample) {
        std::atomic<int> wrong{0};
        std::vector<std::thread> threads;
        for (int i = 0; i < 8; ++i) {
            threads.emplace_back([&] {
                for (int turn = 0; turn < 100; ++turn) {
                    if (!convert(locale, sample)) ++wrong;
                }
            });
        }
        for (std::thread& thread : threads)
            thread.join();
        requireEqual(wrong.load(), 0, "the number of wrong texts");
    });
}

void widensOnSeveralThreads(Bench&) {
    shareAHandle([](NLS2_LOCALE* locale, const Sample& sample) {
        Units out(sample.units.size());
        int status = -1;
        const unsigned written =
            NLS2_toUTF16(locale, sample.bytes.data(), static_cast<unsigned>(sample.bytes.size()),
                         out.data(), static_cast<unsigned>(out.size()), &status);
        return written == out.size() && out == sample.units;
    });
}

void narrowsOnSeveralThreads(Bench&) {
    shareAHandle([](NLS2_LOCALE* locale, const Sample& sample) {
        std::string out(sample.bytes.size(), '\0');
        int status = -1;
        const unsigned written =
            NLS2_fromUTF16(locale, sample.units.data(), static_cast<unsigned>(sample.units.size()),
                           out.data(), static_cast<unsigned>(out.size()), &status);
        return written == out.size() && out == sample.bytes;
    });
}

}  // namespace

std::vector<Operation> nls2Operations() {
    return {
        {"NLS2_GetLocale",
         {{"opens every code page that the header names", opensTheNamedPages},
          {"refuses code pages that do not exist", refusesOtherPages},
          {"refuses other selectors", refusesOtherSelectors},
          {"takes the environment's locale when the process has set none",
           takesTheEnvironmentsLocale},
          {"takes the process's locale when it has set one", takesTheProcessesLocale}}},
        {"NLS2_GetLocaleCodepageId",
         {{"gives the code page's number", givesThePagesNumber},
          {"gives 0 for a null handle", hasNoNumberForNoLocale}}},
        {"NLS2_ReleaseLocale", {{"ignores null", ignoresNoLocale}}},
        {"NLS2_toUTF16",
         {{"knows the characters of bytes", knowsTheCharactersOfBytes},
          {"converts a terminator that is counted", widensATerminatorThatCounts},
          {"writes whole characters and never more than fits", widensWholeCharactersOnly},
          {"replaces malformed bytes", replacesMalformedBytes},
          {"takes any bytes", widensAnyBytes},
          {"converts nothing without a locale", widensNothingWithoutALocale},
          {"serves several threads with one handle", widensOnSeveralThreads}}},
        {"NLS2_fromUTF16",
         {{"knows the bytes of characters", knowsTheBytesOfCharacters},
          {"converts a terminator that is counted", narrowsATerminatorThatCounts},
          {"writes whole characters and never more than fits", narrowsWholeCharactersOnly},
          {"replaces what the code page lacks", replacesWhatThePageLacks},
          {"replaces halves of surrogate pairs", replacesHalfPairs},
          {"keeps every character in UTF-8", keepsEveryCharacterOfUtf8},
          {"takes any units", narrowsAnyUnits},
          {"converts nothing without a locale", narrowsNothingWithoutALocale},
          {"serves several threads with one handle", narrowsOnSeveralThreads}}},
    };
}

}  // namespace conformance

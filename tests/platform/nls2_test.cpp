#include "platform/nls2.h"

#include <gtest/gtest.h>
#include <iconv.h>
#include <langinfo.h>
#include <locale.h>

#include <algorithm>
#include <cstdlib>
#include <random>

#include "nls2/codepages.h"

namespace {

/// The codeset that locales seem to have; null for their real one.
const char* pretendedCodeset = nullptr;

}  // namespace

/// Stands in front of the C library's, so that locales which this machine lacks can be tried.
extern "C" char* nl_langinfo_l(nl_item item, locale_t locale) noexcept {
    if (item == CODESET && pretendedCodeset != nullptr) {
        return const_cast<char*>(pretendedCodeset);
    }
    const locale_t before = ::uselocale(locale);
    char* const answer = ::nl_langinfo(item);
    ::uselocale(before);
    return answer;
}

namespace {

using Units = std::vector<unsigned short>;

constexpr unsigned short kReplacement = 0xFFFD;

/// Numbers that are the same in every run.
class Random {
public:
    explicit Random(unsigned seed) : engine_(seed) {}
    unsigned operator()() { return static_cast<unsigned>(engine_()); }

private:
    std::mt19937 engine_;
};

/// What a conversion yielded.
template <typename Text>
struct Result {
    Text text;
    int status;
};

/// Converts into a buffer of exactly that capacity, so that a sanitizer sees any step beyond it.
Result<Units> widen(NLS2_LOCALE* locale, const std::string& bytes, unsigned capacity) {
    const std::vector<char> exact(bytes.begin(), bytes.end());
    Units out(capacity, 0x5555);
    int status = -1;
    const unsigned written = NLS2_toUTF16(locale, exact.data(), static_cast<unsigned>(exact.size()),
                                          out.data(), capacity, &status);
    EXPECT_LE(written, capacity);
    out.resize(written);
    return {out, status};
}

Result<std::string> narrow(NLS2_LOCALE* locale, const Units& units, unsigned capacity) {
    std::vector<char> out(capacity, 'U');
    int status = -1;
    const unsigned written = NLS2_fromUTF16(
        locale, units.data(), static_cast<unsigned>(units.size()), out.data(), capacity, &status);
    EXPECT_LE(written, capacity);
    return {std::string(out.data(), written), status};
}

Units widened(NLS2_LOCALE* locale, const std::string& bytes) {
    return widen(locale, bytes, static_cast<unsigned>(bytes.size()) * 2 + 4).text;
}

std::string narrowed(NLS2_LOCALE* locale, const Units& units) {
    return narrow(locale, units, static_cast<unsigned>(units.size()) * 4 + 4).text;
}

NLS2_LOCALE* openPage(int codepage) {
    int status = -1;
    NLS2_LOCALE* const locale = NLS2_GetLocale(NLS2_BY_CODEPAGE, codepage, 0, &status);
    EXPECT_EQ(status, locale != nullptr ? NLS2_OK : NLS2_NO_LOCALE);
    return locale;
}

int defaultPage(int& status) {
    NLS2_LOCALE* const locale = NLS2_GetLocale(NLS2_BY_DEFAULT, 0, 0, &status);
    int other = -1;
    const int number = NLS2_GetLocaleCodepageId(locale, &other);
    NLS2_ReleaseLocale(locale);
    return number;
}

// --- Opening ---------------------------------------------------------------------------------

TEST(Nls2Open, SelectorIsTheGivenNumber) {
    EXPECT_EQ(NLS2_BY_CODEPAGE, 0x0188000B);
}

class Nls2Default : public testing::Test {
protected:
    void TearDown() override {
        pretendedCodeset = nullptr;
        ::setlocale(LC_ALL, "C");
    }
    static int page(const char* environment, int expectedStatus = NLS2_OK) {
        ::setenv("LC_ALL", environment, 1);
        int status = -1;
        const int number = defaultPage(status);
        EXPECT_EQ(status, expectedStatus);
        return number;
    }
};

TEST_F(Nls2Default, OfPlainCKeepsEveryByte) {
    EXPECT_EQ(page("C"), 819);
    EXPECT_EQ(page("POSIX"), 819);
    ::unsetenv("LC_ALL");
    ::unsetenv("LC_CTYPE");
    ::unsetenv("LANG");
    int status = -1;
    EXPECT_EQ(defaultPage(status), 819);
}

TEST_F(Nls2Default, OfALocaleThatIsNotInstalledIsPlainC) {
    EXPECT_EQ(page("xx_YY.no-such-codeset"), 819);
}

TEST_F(Nls2Default, GoesByTheCodeset) {
    pretendedCodeset = "EUC-JP";
    EXPECT_EQ(page("C.UTF-8"), 33722);
    pretendedCodeset = "SHIFT_JIS";
    EXPECT_EQ(page("C.UTF-8"), 943);
    pretendedCodeset = "ISO-8859-15";
    EXPECT_EQ(page("C.UTF-8"), 923);
}

TEST_F(Nls2Default, FollowsTheEnvironmentAndTheProcess) {
    EXPECT_EQ(page("C.UTF-8"), 1208);
    EXPECT_EQ(page("C"), 819);
    EXPECT_EQ(page("C.UTF-8"), 1208);
    ::setenv("LC_CTYPE", "C.UTF-8", 1);
    EXPECT_EQ(page(""), 1208) << "an empty variable counts as none";
    EXPECT_EQ(page("xx_YY.no-such-codeset"), 819);
    EXPECT_EQ(page("POSIX"), 819);
    ASSERT_NE(::setlocale(LC_ALL, "C.UTF-8"), nullptr);
    EXPECT_EQ(page("POSIX"), 1208) << "what the process has set counts";
    ::setlocale(LC_ALL, "C");
    EXPECT_EQ(page("POSIX"), 819);
    ::unsetenv("LC_CTYPE");
}

TEST_F(Nls2Default, WithACodesetThatHasNoNumberIsReplaced) {
    pretendedCodeset = "GEORGIAN-PS";
    EXPECT_EQ(page("C.UTF-8", NLS2_SUBSTITUTED), 819);
}

TEST(Nls2Codesets, LeadToTheirNumbers) {
    const struct {
        const char* codeset;
        int number;
    } cases[] = {
        {"UTF-8", 1208},      {"utf8", 1208},      {"ANSI_X3.4-1968", 819}, {"US-ASCII", 819},
        {"646", 819},         {"ISO-8859-1", 819}, {"iso88591", 819},       {"ISO-8859-2", 912},
        {"ISO-8859-5", 915},  {"ISO-8859-7", 813}, {"ISO-8859-9", 920},     {"CP1251", 1251},
        {"KOI8-R", 878},      {"EUC-JP", 33722},   {"eucJP", 33722},        {"WINDOWS-31J", 932},
        {"EUC-KR", 970},      {"UHC", 1363},       {"CP949", 1363},         {"BIG5", 950},
        {"BIG5-HKSCS", 1375}, {"GB2312", 1383},    {"GBK", 1386},           {"GB18030", 1392},
        {"EUC-TW", 964},      {"TIS-620", 9066}};
    for (const auto& each : cases) {
        const nls2::CodePage* const page = nls2::codePageOfCodeset(each.codeset);
        ASSERT_NE(page, nullptr) << each.codeset;
        EXPECT_EQ(page->number, each.number) << each.codeset;
    }
    EXPECT_EQ(nls2::codePageOfCodeset("no-such-codeset"), nullptr);
    EXPECT_EQ(nls2::codePageOfCodeset(""), nullptr);
}

// --- Every code page -------------------------------------------------------------------------

constexpr int kAsciiPages[] = {
    1208, 819,  367, 874,   932, 936,  949, 1250, 1251, 1252, 1253, 1254, 1255, 1256, 1257,
    1258, 437,  737, 775,   850, 852,  855, 857,  858,  860,  861,  862,  863,  865,  866,
    869,  1125, 813, 912,   913, 914,  915, 916,  919,  920,  921,  923,  1089, 878,  1168,
    9066, 1129, 954, 33722, 950, 1375, 964, 970,  1363, 1383, 1386, 1392, 5488};
// Some of these differ from ASCII in a control character or a sign only.
constexpr int kOtherPages[] = {943,  864,  1361, 37,   273,  277,  278,  280,  284,  285,
                               297,  424,  500,  870,  871,  875,  1025, 1026, 1047, 1140,
                               1141, 1142, 1143, 1144, 1145, 1146, 1147, 1148, 1149};

template <typename Check>
void forEach(const std::vector<int>& codepages, Check check) {
    for (const int codepage : codepages) {
        SCOPED_TRACE(codepage);
        check(openPage(codepage), codepage);
    }
}

std::vector<int> allPages() {
    std::vector<int> pages(std::begin(kAsciiPages), std::end(kAsciiPages));
    pages.insert(pages.end(), std::begin(kOtherPages), std::end(kOtherPages));
    return pages;
}

std::vector<int> asciiPages() {
    return {std::begin(kAsciiPages), std::end(kAsciiPages)};
}

TEST(Nls2EveryPage, OpensUnderItsNumber) {
    forEach(allPages(), [](NLS2_LOCALE* locale, int codepage) {
        ASSERT_NE(locale, nullptr);
        int status = -1;
        EXPECT_EQ(NLS2_GetLocaleCodepageId(locale, &status), codepage);
        EXPECT_EQ(status, NLS2_OK);
    });
}

TEST(Nls2EveryPage, KeepsTheTerminator) {
    forEach(allPages(), [](NLS2_LOCALE* locale, int) {
        EXPECT_EQ(widened(locale, std::string(1, '\0')), Units{0});
        EXPECT_EQ(narrowed(locale, {0}), std::string(1, '\0'));
        EXPECT_EQ(widen(locale, "", 0).text, Units());
        EXPECT_EQ(narrow(locale, {}, 0).text, "");
    });
}

TEST(Nls2EveryPage, WhatAByteMeansComesBack) {
    forEach(allPages(), [](NLS2_LOCALE* locale, int) {
        for (unsigned byte = 0; byte < 256; ++byte) {
            const Units units = widened(locale, std::string(1, static_cast<char>(byte)));
            ASSERT_EQ(units.size(), 1u) << byte;
            if (units[0] == kReplacement) continue;
            ASSERT_EQ(widened(locale, narrowed(locale, units)), units) << byte;
        }
    });
}

TEST(Nls2EveryPage, NeverWritesMoreThanFits) {
    forEach(allPages(), [](NLS2_LOCALE* locale, int) {
        const Units units = {'a', 'b', 0x416, 0xE9, 0x3042, 0x4E2D, 0xD83D, 0xDE00, 'z', 0};
        const std::string bytes = narrowed(locale, units);
        const Units back = widened(locale, bytes);
        for (unsigned capacity = 0; capacity <= bytes.size() + 2; ++capacity) {
            const Result<std::string> cut = narrow(locale, units, capacity);
            ASSERT_EQ(cut.text, bytes.substr(0, cut.text.size()));
            ASSERT_EQ(cut.status == NLS2_TRUNCATED, capacity < bytes.size());
            // Whole characters: what was cut off still means the beginning of the text.
            const Units part = widened(locale, cut.text);
            ASSERT_LE(part.size(), back.size());
            ASSERT_TRUE(std::equal(part.begin(), part.end(), back.begin()));
            ASSERT_GE(cut.text.size() + 3, std::min<std::size_t>(capacity, bytes.size()));
        }
        for (unsigned capacity = 0; capacity <= back.size() + 2; ++capacity) {
            const Result<Units> cut = widen(locale, bytes, capacity);
            ASSERT_EQ(cut.status == NLS2_TRUNCATED, capacity < back.size());
            ASSERT_TRUE(std::equal(cut.text.begin(), cut.text.end(), back.begin()));
            ASSERT_TRUE(cut.text.empty() || (cut.text.back() & 0xFC00) != 0xD800) << "half a pair";
            ASSERT_GE(cut.text.size() + 1, std::min<std::size_t>(capacity, back.size()));
        }
    });
}

TEST(Nls2EveryPage, SurvivesArbitraryBytes) {
    forEach(allPages(), [](NLS2_LOCALE* locale, int codepage) {
        Random random(static_cast<unsigned>(codepage));
        for (int turn = 0; turn < 300; ++turn) {
            std::string bytes;
            for (unsigned i = random() % 40; i > 0; --i)
                bytes += static_cast<char>(random());
            bytes += '\0';
            const Result<Units> result =
                widen(locale, bytes, static_cast<unsigned>(bytes.size()) * 2);
            ASSERT_NE(result.status, NLS2_TRUNCATED);
            ASSERT_EQ(result.text.back(), 0) << "the terminator was eaten";
            widen(locale, bytes, random() % 20);
        }
    });
}

TEST(Nls2EveryPage, SurvivesArbitraryUnits) {
    forEach(allPages(), [](NLS2_LOCALE* locale, int codepage) {
        Random random(static_cast<unsigned>(codepage));
        for (int turn = 0; turn < 300; ++turn) {
            Units units;
            for (unsigned i = random() % 40; i > 0; --i) {
                // Many surrogates, some of them paired by chance.
                const unsigned any = random();
                units.push_back(static_cast<unsigned short>(
                    any % 3 == 0 ? 0xD800 | (any >> 8 & 0x7FF) : any >> 8));
            }
            units.push_back(0);
            const Result<std::string> result =
                narrow(locale, units, static_cast<unsigned>(units.size()) * 4);
            ASSERT_NE(result.status, NLS2_TRUNCATED);
            ASSERT_EQ(result.text.back(), '\0');
            narrow(locale, units, random() % 20);
        }
    });
}

TEST(Nls2AsciiPage, ConvertsAsciiOfEveryLength) {
    forEach(asciiPages(), [](NLS2_LOCALE* locale, int) {
        std::string bytes;
        Units units;
        for (unsigned length = 0; length < 140; ++length) {
            ASSERT_EQ(widen(locale, bytes, length).text, units);
            ASSERT_EQ(narrow(locale, units, length).text, bytes);
            bytes += static_cast<char>(length % 127 + 1);
            units.push_back(static_cast<unsigned short>(length % 127 + 1));
        }
    });
}

TEST(Nls2AsciiPage, FindsOtherCharactersAtEveryPlace) {
    forEach(asciiPages(), [](NLS2_LOCALE* locale, int) {
        for (std::size_t at = 0; at < 40; ++at) {
            Units units(40, 'x');
            units[at] = 0xD800;
            std::string expected(40, 'x');
            expected[at] = '?';
            const Result<std::string> result = narrow(locale, units, 40);
            ASSERT_EQ(result.text, expected);
            ASSERT_EQ(result.status, NLS2_SUBSTITUTED);
        }
    });
}

struct Meaning {
    int codepage;
    const char* bytes;
    Units units;
};

const Meaning kMeanings[] = {
    {367, "az", {'a', 'z'}},
    {819, "a\xE9\xFF", {'a', 0xE9, 0xFF}},
    {923, "\xA4", {0x20AC}},
    {1252, "\x80\xE9", {0x20AC, 0xE9}},
    {1251, "\xC6", {0x416}},
    {437, "\x82", {0xE9}},
    {850, "\x82\xD5", {0xE9, 0x131}},
    {858, "\xD5", {0x20AC}},
    {912, "\xB1", {0x105}},
    {813, "\xE1", {0x3B1}},
    {878, "\xF6", {0x416}},
    {932, "a\x82\xA0\\", {'a', 0x3042, '\\'}},
    {932,
     "\x83\x5C"
     "b",
     {0x30BD, 'b'}},  // a trail byte that looks like a backslash
    {943, "\x82\xA0", {0x3042}},
    {954, "\xA4\xA2", {0x3042}},
    {33722, "\xA4\xA2", {0x3042}},
    {970, "\xB0\xA1", {0xAC00}},
    {1363, "\xB0\xA1", {0xAC00}},
    {950, "\xA4\xA4", {0x4E2D}},
    {1375, "\xA4\xA4", {0x4E2D}},
    {1383, "\xD6\xD0", {0x4E2D}},
    {1386, "\xD6\xD0", {0x4E2D}},
    {1392, "\xD6\xD0", {0x4E2D}},
    {1392, "\x94\x39\xFC\x36", {0xD83D, 0xDE00}},
    {37, "\xC1\x81\xF1", {'A', 'a', '1'}},
    {500, "\xC1\x4A", {'A', '['}},
    {1140, "\x9F", {0x20AC}},
    {1208, "\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80", {0xE9, 0x20AC, 0xD83D, 0xDE00}},
};

TEST(Nls2, KnowsItsCodePages) {
    for (const Meaning& meaning : kMeanings) {
        NLS2_LOCALE* const locale = openPage(meaning.codepage);
        EXPECT_EQ(widened(locale, meaning.bytes), meaning.units) << meaning.codepage;
        EXPECT_EQ(narrowed(locale, meaning.units), meaning.bytes) << meaning.codepage;
    }
}

TEST(Nls2, ReplacesWhatACodePageLacks) {
    EXPECT_EQ(narrow(openPage(819), {'a', 0x20AC, 'b'}, 3).text, "a?b");
    EXPECT_EQ(narrow(openPage(819), {0xD83D, 0xDE00, 'b'}, 3).text, "?b");
    EXPECT_EQ(narrow(openPage(819), {0x20AC}, 3).status, NLS2_SUBSTITUTED);
    EXPECT_EQ(narrow(openPage(367), {0xE9}, 3).text, "?");
    EXPECT_EQ(widen(openPage(367), "\xE9", 3).text, Units{kReplacement});
    EXPECT_EQ(widen(openPage(367), "\xE9", 3).status, NLS2_SUBSTITUTED);
    EXPECT_EQ(narrow(openPage(932), {0xE9, 0x3042}, 3).text, "?\x82\xA0");
    EXPECT_EQ(narrow(openPage(932), {0xD83D, 0xDE00, 'b'}, 3).text, "?b");
    EXPECT_EQ(narrow(openPage(932), {0xD83D, 0xDE00, 'b'}, 3).status, NLS2_SUBSTITUTED);
    EXPECT_EQ(narrow(openPage(932), {'a', 0xD83D}, 3).text, "a?");
    EXPECT_EQ(narrow(openPage(37), {0x416}, 3).text, "\x6F") << "a question mark in its own code";
}

TEST(Nls2, ReplacesMalformedMultibyteText) {
    EXPECT_EQ(widened(openPage(932), "a\x82"), Units({'a', kReplacement}));
    EXPECT_EQ(widened(openPage(932), std::string("a\x82\0", 3)), Units({'a', kReplacement, 0}));
    EXPECT_EQ(widened(openPage(970), "\xB0\xA1\xB0"), Units({0xAC00, kReplacement}));
    EXPECT_EQ(widen(openPage(970), "\xB0", 2).status, NLS2_SUBSTITUTED);
    EXPECT_EQ(widened(openPage(1392), std::string("\x81\x30\x81\0", 4)),
              Units({kReplacement, '0', kReplacement, 0}));
}

TEST(Nls2, WritesACharacterThatAConverterHeldBack) {
    // In this code page a character may be followed by a combining mark.
    EXPECT_EQ(widened(openPage(1375), "\x88\x66"), Units{0xCA});
    EXPECT_EQ(widened(openPage(1375), "\x88\x62"), Units({0xCA, 0x304}));
    EXPECT_EQ(narrowed(openPage(1375), {0xCA}), "\x88\x66");
    EXPECT_EQ(narrowed(openPage(1375), {0xCA, 0x304}), "\x88\x62");
    EXPECT_EQ(narrowed(openPage(1375), {0xCA, 'a'}),
              "\x88\x66"
              "a");
}

// --- UTF-8 -----------------------------------------------------------------------------------

TEST(Nls2Utf8, ReplacesEachMalformedPart) {
    const unsigned short R = kReplacement;
    const struct {
        const char* bytes;
        Units units;
    } cases[] = {
        {"\x80", {R}},
        {"\xBF\x80", {R, R}},
        {"\xC0\x80", {R, R}},  // overlong
        {"\xC1\xBF", {R, R}},
        {"\xE0\x80\x80", {R, R, R}},
        {"\xE0\x9F\xBF", {R, R, R}},
        {"\xF0\x8F\xBF\xBF", {R, R, R, R}},
        {"\xED\xA0\x80", {R, R, R}},  // a surrogate
        {"\xED\xBF\xBF", {R, R, R}},
        {"\xF4\x90\x80\x80", {R, R, R, R}},  // beyond the last character
        {"\xF5\x80\x80\x80", {R, R, R, R}},
        {"\xFE\xFF", {R, R}},
        {"\xC3", {R}},  // ends too early
        {"\xE2\x82", {R}},
        {"\xF0\x9F\x98", {R}},
        {"\xC3z", {R, 'z'}},
        {"\xE2\x82z", {R, 'z'}},
        {"\xE2z", {R, 'z'}},
        {"\xF0\x9F\x98z", {R, 'z'}},
        {"\xE2\x82\xC3\xA9", {R, 0xE9}},
        {"\xEF\xBF\xBD", {R}},
        {"\xEF\xBB\xBF"
         "a",
         {0xFEFF, 'a'}},
        {"\xED\x9F\xBF\xEE\x80\x80", {0xD7FF, 0xE000}},
        {"\xF4\x8F\xBF\xBF", {0xDBFF, 0xDFFF}},
        {"\xF0\x90\x80\x80", {0xD800, 0xDC00}},
    };
    NLS2_LOCALE* const locale = openPage(NLS2_CP_UTF8);
    for (const auto& each : cases) {
        EXPECT_EQ(widened(locale, each.bytes), each.units) << testing::PrintToString(each.bytes);
        Units terminated = each.units;
        terminated.push_back(0);
        EXPECT_EQ(widened(locale, each.bytes + std::string(1, '\0')), terminated);
    }
    EXPECT_EQ(widen(locale, "\xFF", 1).status, NLS2_SUBSTITUTED);
    EXPECT_EQ(widen(locale, "\xEF\xBF\xBD", 1).status, NLS2_OK);
}

/// A piece of UTF-8 and what it is in UTF-16, either of which may be malformed: characters of every
/// length, and what may not become part of one whatever follows.
struct Utf8Piece {
    std::string bytes;
    Units units;
};

const std::vector<Utf8Piece>& wellFormedPieces() {
    static const std::vector<Utf8Piece> pieces = {
        {"a", {'a'}},
        {"the quick ", {'t', 'h', 'e', ' ', 'q', 'u', 'i', 'c', 'k', ' '}},
        {"\xC2\x80", {0x80}},
        {"\xDF\xBF", {0x7FF}},
        {"\xE0\xA0\x80", {0x800}},
        {"\xED\x9F\xBF", {0xD7FF}},
        {"\xEE\x80\x80", {0xE000}},
        {"\xEF\xBF\xBF", {0xFFFF}},
        {"\xF0\x90\x80\x80", {0xD800, 0xDC00}},
        {"\xF4\x8F\xBF\xBF", {0xDBFF, 0xDFFF}},
    };
    return pieces;
}

const std::vector<Utf8Piece>& malformedBytes() {
    static const std::vector<Utf8Piece> pieces = {
        {"\xC0", {0xFFFD}},
        {"\xFF", {0xFFFD}},
        {"\xC3", {0xFFFD}},
        {"\xE2\x82", {0xFFFD}},
        {"\xF0\x9F\x98", {0xFFFD}},
        {"\xE0\x9F\xBF", {0xFFFD, 0xFFFD, 0xFFFD}},
        {"\xED\xA0\x80", {0xFFFD, 0xFFFD, 0xFFFD}},
        {"\xF4\x90", {0xFFFD, 0xFFFD}},
    };
    return pieces;
}

const std::vector<Utf8Piece>& malformedUnits() {
    static const std::vector<Utf8Piece> pieces = {
        {"?x", {0xD800, 'x'}},
        {"?x", {0xDBFF, 'x'}},
        {"?x", {0xDC00, 'x'}},
    };
    return pieces;
}

/// The first whole characters of a text that have room.
Units cut(const Units& units, std::size_t room) {
    const bool splits = room > 0 && room < units.size() && (units[room - 1] & 0xFC00) == 0xD800;
    const auto count = static_cast<std::ptrdiff_t>(std::min(units.size(), room - (splits ? 1 : 0)));
    return Units(units.begin(), units.begin() + count);
}

std::string cut(const std::string& bytes, std::size_t room) {
    if (room >= bytes.size()) return bytes;
    while (room > 0 && (bytes[room] & 0xC0) == 0x80)
        --room;
    return bytes.substr(0, room);
}

/// Calls `check` with texts made of `pieces` and well-formed ones in many orders.
template <typename Check>
void forEachText(const std::vector<Utf8Piece>& pieces, Check check) {
    Random random(7);
    for (int turn = 0; turn < 400; ++turn) {
        Utf8Piece text;
        bool malformed = false;
        while (text.bytes.size() < 30) {
            const bool isOdd = turn % 2 == 1 && random() % 4 == 0;
            const std::vector<Utf8Piece>& some = isOdd ? pieces : wellFormedPieces();
            const Utf8Piece& piece = some[random() % some.size()];
            text.bytes += piece.bytes;
            text.units.insert(text.units.end(), piece.units.begin(), piece.units.end());
            malformed = malformed || isOdd;
        }
        check(text, malformed ? NLS2_SUBSTITUTED : NLS2_OK);
    }
}

TEST(Nls2Utf8, WidensWhateverStandsTogetherIntoAnyRoom) {
    NLS2_LOCALE* const locale = openPage(NLS2_CP_UTF8);
    forEachText(malformedBytes(), [locale](const Utf8Piece& text, int status) {
        for (unsigned room = 0; room < text.units.size(); ++room) {
            const Result<Units> result = widen(locale, text.bytes, room);
            ASSERT_EQ(result.text, cut(text.units, room));
            ASSERT_EQ(result.status, NLS2_TRUNCATED);
        }
        for (const unsigned more : {0u, 1u, 50u}) {
            const auto room = static_cast<unsigned>(text.units.size()) + more;
            const Result<Units> result = widen(locale, text.bytes, room);
            ASSERT_EQ(result.text, text.units);
            ASSERT_EQ(result.status, status);
        }
    });
}

TEST(Nls2Utf8, NarrowsWhateverStandsTogetherIntoAnyRoom) {
    NLS2_LOCALE* const locale = openPage(NLS2_CP_UTF8);
    forEachText(malformedUnits(), [locale](const Utf8Piece& text, int status) {
        for (unsigned room = 0; room < text.bytes.size(); ++room) {
            const Result<std::string> result = narrow(locale, text.units, room);
            ASSERT_EQ(result.text, cut(text.bytes, room));
            ASSERT_EQ(result.status, NLS2_TRUNCATED);
        }
        for (const unsigned more : {0u, 1u, 50u}) {
            const auto room = static_cast<unsigned>(text.bytes.size()) + more;
            const Result<std::string> result = narrow(locale, text.units, room);
            ASSERT_EQ(result.text, text.bytes);
            ASSERT_EQ(result.status, status);
        }
    });
}

TEST(Nls2Utf8, ReplacesACharacterThatTheTextEndsWithinWhereverThatIs) {
    NLS2_LOCALE* const locale = openPage(NLS2_CP_UTF8);
    for (const Utf8Piece& last : wellFormedPieces()) {
        for (std::size_t before = 0; before < 20; ++before) {
            for (std::size_t kept = 1; kept < last.bytes.size(); ++kept) {
                if (last.bytes.size() > 4) continue;
                Units expected(before, 'x');
                expected.push_back(kReplacement);
                const std::string text = std::string(before, 'x') + last.bytes.substr(0, kept);
                const Result<Units> result = widen(locale, text, 40);
                ASSERT_EQ(result.text, expected);
                ASSERT_EQ(result.status, NLS2_SUBSTITUTED);
            }
        }
    }
}

TEST(Nls2Utf8, AgreesWithTheCLibrary) {
    NLS2_LOCALE* const locale = openPage(NLS2_CP_UTF8);
    const iconv_t descriptor = ::iconv_open("UTF-8", "UTF-16LE");
    ASSERT_NE(descriptor, reinterpret_cast<iconv_t>(-1));
    Random random(7);
    for (int turn = 0; turn < 200; ++turn) {
        Units units;
        for (unsigned i = random() % 60; i > 0; --i) {
            const unsigned limits[] = {0x80, 0x800, 0xD800};
            units.push_back(static_cast<unsigned short>(random() % limits[random() % 3]));
        }
        std::string expected(units.size() * 3, '\0');
        char* in = reinterpret_cast<char*>(units.data());
        std::size_t inLeft = units.size() * 2;
        char* out = expected.data();
        std::size_t outLeft = expected.size();
        ASSERT_EQ(::iconv(descriptor, &in, &inLeft, &out, &outLeft), 0u);
        expected.resize(expected.size() - outLeft);
        ASSERT_EQ(narrowed(locale, units), expected);
        ASSERT_EQ(widened(locale, expected), units);
    }
    ::iconv_close(descriptor);
}

}  // namespace

#include "nls2/codepages.h"

#include <cctype>

namespace nls2 {
namespace {

// No stateful encodings: a character must be the same bytes wherever it stands.
constexpr CodePage kCodePages[] = {
    {1208, "UTF-8"},
    {819, "ISO-8859-1"},
    {367, "ANSI_X3.4-1968"},
    // Windows
    {874, "CP874"},
    {932, "CP932"},
    {936, "CP936"},
    {949, "CP949"},
    {1250, "CP1250"},
    {1251, "CP1251"},
    {1252, "CP1252"},
    {1253, "CP1253"},
    {1254, "CP1254"},
    {1255, "CP1255"},
    {1256, "CP1256"},
    {1257, "CP1257"},
    {1258, "CP1258"},
    // PC
    {437, "IBM437"},
    {737, "CP737"},
    {775, "CP775"},
    {850, "IBM850"},
    {852, "IBM852"},
    {855, "IBM855"},
    {857, "IBM857"},
    {858, "CP858"},
    {860, "IBM860"},
    {861, "IBM861"},
    {862, "IBM862"},
    {863, "IBM863"},
    {864, "IBM864"},
    {865, "IBM865"},
    {866, "IBM866"},
    {869, "IBM869"},
    {1125, "CP1125"},
    // ISO 8859
    {813, "ISO-8859-7"},
    {912, "ISO-8859-2"},
    {913, "ISO-8859-3"},
    {914, "ISO-8859-4"},
    {915, "ISO-8859-5"},
    {916, "ISO-8859-8"},
    {919, "ISO-8859-10"},
    {920, "ISO-8859-9"},
    {921, "ISO-8859-13"},
    {923, "ISO-8859-15"},
    {1089, "ISO-8859-6"},
    // KOI8, Thai, Vietnamese
    {878, "KOI8-R"},
    {1168, "KOI8-U"},
    {9066, "TIS-620"},
    {1129, "CP1129"},
    // East Asia
    {943, "IBM943"},
    {954, "EUC-JP"},
    {33722, "EUC-JP"},
    {950, "BIG5"},
    {1375, "BIG5-HKSCS"},
    {964, "EUC-TW"},
    {970, "EUC-KR"},
    {1363, "CP949"},
    {1361, "JOHAB"},
    {1383, "GB2312"},
    {1386, "GBK"},
    {1392, "GB18030"},
    {5488, "GB18030"},
    // EBCDIC
    {37, "IBM037"},
    {273, "IBM273"},
    {277, "IBM277"},
    {278, "IBM278"},
    {280, "IBM280"},
    {284, "IBM284"},
    {285, "IBM285"},
    {297, "IBM297"},
    {424, "IBM424"},
    {500, "IBM500"},
    {870, "IBM870"},
    {871, "IBM871"},
    {875, "CP875"},
    {1025, "IBM1025"},
    {1026, "IBM1026"},
    {1047, "IBM1047"},
    {1140, "IBM1140"},
    {1141, "IBM1141"},
    {1142, "IBM1142"},
    {1143, "IBM1143"},
    {1144, "IBM1144"},
    {1145, "IBM1145"},
    {1146, "IBM1146"},
    {1147, "IBM1147"},
    {1148, "IBM1148"},
    {1149, "IBM1149"},
};

/// Codesets whose name does not lead to the number meant: several numbers share the converter, or
/// locales name it otherwise.
constexpr struct {
    const char* codeset;
    int number;
} kAliases[] = {
    {"ANSI_X3.4-1968", 819}, {"US-ASCII", 819},    {"ASCII", 819},     {"646", 819},
    {"EUC-JP", 33722},       {"EUC-CN", 1383},     {"BIG5-ETEN", 950}, {"SHIFT_JIS", 943},
    {"SJIS", 943},           {"WINDOWS-31J", 932}, {"CP949", 1363},    {"UHC", 1363},
    {"CP936", 1386},
};

/// Returns the next letter or digit, in lower case, and moves `at` past it; 0 at the end of the
/// text.
int nextOf(const char*& at) {
    while (*at != '\0') {
        const int byte = static_cast<unsigned char>(*at++);
        if (std::isalnum(byte) != 0) return std::tolower(byte);
    }
    return 0;
}

bool isSameCodeset(const char* a, const char* b) {
    for (;;) {
        const int one = nextOf(a);
        if (one != nextOf(b)) return false;
        if (one == 0) return true;
    }
}

}  // namespace

const CodePage* codePageNumbered(int number) {
    for (const CodePage& page : kCodePages) {
        if (page.number == number) return &page;
    }
    return nullptr;
}

const CodePage* codePageOfCodeset(const std::string& codeset) {
    for (const auto& alias : kAliases) {
        if (isSameCodeset(alias.codeset, codeset.c_str())) return codePageNumbered(alias.number);
    }
    for (const CodePage& page : kCodePages) {
        if (isSameCodeset(page.iconvName, codeset.c_str())) return &page;
    }
    return nullptr;
}

}  // namespace nls2

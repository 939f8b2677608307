// Conversions from and to the code pages. An input is the code page, how much room there is, and
// the text: one time as bytes of the code page, one time as UTF-16 units.

#include <algorithm>
#include <cstring>
#include <iterator>
#include <vector>

#include "platform/nls2.h"
#include "support/fuzz_support.h"

using fuzz::require;

namespace {

constexpr int kCodePages[] = {NLS2_CP_UTF8, NLS2_CP_ISO8859_1, 1252, NLS2_CP932,
                              NLS2_CP943,   NLS2_CP_EUC_JP,    850,  950};
/// Room enough for whatever a unit becomes, shift sequences included.
constexpr unsigned kMostBytesPerUnit = 8;

/// Opened once: opening is not what is tested here.
NLS2_LOCALE* localeOf(unsigned index) {
    static NLS2_LOCALE* locales[std::size(kCodePages)] = {};
    int status = NLS2_OK;
    if (locales[index] == nullptr) {
        locales[index] = NLS2_GetLocale(NLS2_BY_CODEPAGE, kCodePages[index], 0, &status);
    }
    return locales[index];
}

std::vector<unsigned short> toUnits(NLS2_LOCALE* locale, const std::vector<char>& bytes,
                                    unsigned capacity, int& status) {
    std::vector<unsigned short> units(capacity);
    const unsigned written = NLS2_toUTF16(locale, bytes.data(), static_cast<unsigned>(bytes.size()),
                                          units.data(), capacity, &status);
    require(written <= capacity, "no more units than there is room for");
    units.resize(written);
    return units;
}

std::vector<char> toBytes(NLS2_LOCALE* locale, const std::vector<unsigned short>& units,
                          unsigned capacity, int& status) {
    std::vector<char> bytes(capacity);
    const unsigned written = NLS2_fromUTF16(
        locale, units.data(), static_cast<unsigned>(units.size()), bytes.data(), capacity, &status);
    require(written <= capacity, "no more bytes than there is room for");
    bytes.resize(written);
    return bytes;
}

/// A short room holds the beginning of what a long one does.
template <typename Sequence>
void requireBeginning(const Sequence& part, const Sequence& whole) {
    require(part.size() <= whole.size() && std::equal(part.begin(), part.end(), whole.begin()),
            "what fits is the beginning of the whole");
}

void checkBytes(NLS2_LOCALE* locale, const std::vector<char>& bytes, unsigned room) {
    int status = NLS2_OK;
    const auto enough = static_cast<unsigned>(2 * bytes.size() + 2);
    const std::vector<unsigned short> units = toUnits(locale, bytes, enough, status);
    require(status == NLS2_OK || status == NLS2_SUBSTITUTED, "twice as many units are enough");
    const bool exact = status == NLS2_OK;
    requireBeginning(toUnits(locale, bytes, room, status), units);
    if (!exact) return;
    const auto back =
        toBytes(locale, units, static_cast<unsigned>(units.size() + 1) * kMostBytesPerUnit, status);
    // Two sequences of a code page may be one character, so only the text is sure to be the same.
    require(toUnits(locale, back, enough, status) == units, "what was understood comes back");
}

void checkUnits(NLS2_LOCALE* locale, const std::vector<unsigned short>& units, unsigned room) {
    int status = NLS2_OK;
    const auto enough = static_cast<unsigned>(units.size() + 1) * kMostBytesPerUnit;
    const std::vector<char> bytes = toBytes(locale, units, enough, status);
    require(status == NLS2_OK || status == NLS2_SUBSTITUTED, "eight bytes per unit are enough");
    const bool exact = status == NLS2_OK;
    requireBeginning(toBytes(locale, units, room, status), bytes);
    if (!exact) return;
    const auto roomBack = static_cast<unsigned>(2 * bytes.size() + 2);
    const std::vector<unsigned short> back = toUnits(locale, bytes, roomBack, status);
    require(toBytes(locale, back, enough, status) == bytes, "what was written means the same");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    NLS2_LOCALE* const locale = localeOf(input.below(std::size(kCodePages)));
    if (locale == nullptr) return 0;
    const unsigned room = input.byte();
    const std::string_view text = input.rest();
    checkBytes(locale, {text.begin(), text.end()}, room);
    std::vector<unsigned short> units(text.size() / sizeof(unsigned short));
    if (!units.empty()) std::memcpy(units.data(), text.data(), units.size() * sizeof units[0]);
    checkUnits(locale, units, room);
    return 0;
}

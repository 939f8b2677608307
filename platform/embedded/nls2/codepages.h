/// The code pages that this platform knows by number.
#pragma once

#include <string>

namespace nls2 {

/// One code page: its number and the name that iconv knows it by.
struct CodePage {
    int number;
    const char* iconvName;
};

/// The code page of that number; null when there is none.
const CodePage* codePageNumbered(int number);

/// The code page of a codeset as nl_langinfo names it, such as "UTF-8" or "EUC-JP"; capitals and
/// punctuation do not matter. ASCII counts as ISO 8859-1, so that every byte survives a round trip.
/// Null when no code page has that codeset.
const CodePage* codePageOfCodeset(const std::string& codeset);

}  // namespace nls2

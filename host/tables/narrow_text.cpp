#include "host/tables/narrow_text.h"

#include <algorithm>

namespace host {

std::size_t utf16Units(std::string_view utf8) {
    std::size_t units = 0;
    for (const char c : utf8) {
        const auto byte = static_cast<unsigned char>(c);
        const bool continues = (byte & 0xC0U) == 0x80;
        if (!continues) units += byte >= 0xF0 ? 2 : 1;
    }
    return units;
}

std::size_t bytesBeyondUnits(const std::string& text, const CodePage& codePage) {
    const bool isAscii = std::all_of(text.begin(), text.end(),
                                     [](char c) { return static_cast<unsigned char>(c) < 0x80; });
    if (isAscii) return 0;
    const std::size_t units = utf16Units(codePage.toUtf8(text));
    return text.size() > units ? text.size() - units : 0;
}

std::size_t bytesCut(const std::string& text, const CodePage& codePage) {
    const std::size_t beyond = bytesBeyondUnits(text, codePage);
    return beyond > 1 ? beyond - 1 : 0;
}

}  // namespace host

#include "ctl/show/printable.h"

#include <cstdio>
#include <string_view>

#include "secrets/masked.h"

namespace ctl {
namespace {

/// Replaces each control character, but those in `kept`, by a prefix and its number. In UTF-8,
/// U+0080 to U+009F are two bytes, the first of which is 0xC2.
std::string escaped(const std::string& text, std::string_view prefix, std::string_view kept) {
    std::string out;
    for (std::size_t i = 0; i < text.size(); ++i) {
        auto byte = static_cast<unsigned char>(text[i]);
        const auto next = static_cast<unsigned char>(i + 1 < text.size() ? text[i + 1] : '\0');
        const bool isUpper = byte == 0xC2 && next >= 0x80 && next <= 0x9F;
        const bool isLower = (byte < 0x20 || byte == 0x7F) && kept.find(text[i]) == kept.npos;
        if (!isUpper && !isLower) {
            out += text[i];
            continue;
        }
        if (isUpper) byte = static_cast<unsigned char>(text[++i]);
        char number[4];
        std::snprintf(number, sizeof number, "%02X", byte);
        out.append(prefix).append(number);
    }
    return out;
}

}  // namespace

std::string printable(const std::string& text) {
    return escaped(text, "\\x", "");
}

std::string redacted(const std::string& text) {
    return printable(secrets::masked(text));
}

std::string printableLines(const std::string& text) {
    return escaped(text, "\\x", "\n\t");
}

std::string withoutTerminalControls(const std::string& json) {
    return escaped(json, "\\u00", "\n");
}

}  // namespace ctl

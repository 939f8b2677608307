#include "ctl/show/fold.h"

#include <algorithm>

namespace ctl {
namespace {

/// The length in bytes of what stands at a place: a colour, which takes no room, or a character.
std::size_t unitAt(const std::string& text, std::size_t at) {
    std::size_t end = at + 1;
    if (text[at] == '\x1b') {
        const std::size_t last = text.find('m', at);
        return last == std::string::npos ? 1 : last + 1 - at;
    }
    while (end < text.size() && (static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80U)
        ++end;
    return end - at;
}

/// How many bytes of the text, from a place on, take at most `width` places.
std::size_t bytesThatFit(const std::string& text, std::size_t from, std::size_t width) {
    std::size_t at = from;
    std::size_t places = 0;
    while (at < text.size()) {
        if (text[at] != '\x1b' && ++places > width) break;
        at += unitAt(text, at);
    }
    return at - from;
}

}  // namespace

std::size_t widthOf(const std::string& text) {
    std::size_t places = 0;
    for (std::size_t at = 0; at < text.size(); at += unitAt(text, at))
        places += text[at] == '\x1b' ? 0U : 1U;
    return places;
}

std::vector<std::string> folded(const std::string& line, std::size_t width) {
    std::vector<std::string> pieces;
    std::size_t from = 0;
    for (;;) {
        const std::size_t most = bytesThatFit(line, from, width);
        if (from + most >= line.size()) break;
        const std::size_t blank = line.rfind(' ', from + most);
        const bool isBroken = blank == std::string::npos || blank <= from;
        std::size_t end = isBroken ? from + most : blank;
        const std::size_t next = isBroken ? end : line.find_first_not_of(' ', end);
        while (!isBroken && end > from && line[end - 1] == ' ')
            --end;
        if (end > from) pieces.push_back(line.substr(from, end - from));
        from = next;
        if (from == std::string::npos) return pieces;
    }
    pieces.push_back(line.substr(from));
    return pieces;
}

std::string foldedText(const std::string& text, std::size_t width) {
    std::string out;
    for (std::size_t start = 0; start < text.size();) {
        const std::size_t end = std::min(text.find('\n', start), text.size());
        const std::string line = text.substr(start, end - start);
        const std::size_t blanks = std::min(line.find_first_not_of(' '), line.size());
        const std::size_t indent = std::min(blanks + 2, width / 2);
        if (widthOf(line) <= width) {
            out += line;
        } else {
            const std::string first = line.substr(0, std::min(blanks, width / 2));
            const std::vector<std::string> pieces = folded(line.substr(blanks), width - indent);
            for (std::size_t i = 0; i < pieces.size(); ++i)
                out += (i == 0 ? first : "\n" + std::string(indent, ' ')) + pieces[i];
        }
        if (end < text.size()) out += '\n';
        start = end + 1;
    }
    return out;
}

}  // namespace ctl

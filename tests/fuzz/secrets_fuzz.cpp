// The masking of secret values: it finds the same values whatever pieces a text comes in, and what
// a second reader of the whole text finds. An input is a byte for the size of the pieces and the
// text.

#include <algorithm>
#include <cctype>

#include "secrets/masked.h"
#include "support/fuzz_support.h"

using fuzz::require;

namespace {

std::string maskedInPieces(std::string_view text, std::size_t piece) {
    secrets::Masker masker;
    std::string shown;
    for (; !text.empty(); text.remove_prefix(std::min(piece, text.size())))
        shown += masker.feed(text.substr(0, piece));
    return shown;
}

bool isIn(char c, std::string_view set) {
    return set.find(c) != std::string_view::npos;
}

/// How many of the character stand at the end of the text.
std::size_t countAtEnd(const std::string& text, char c) {
    return text.size() - (text.find_last_not_of(c) + 1);
}

/// Whether the text ends in a secret's name, perhaps in a quotation mark, with backslashes before
/// that, and blanks.
bool endsInName(std::string text) {
    while (!text.empty() && isIn(text.back(), " \t"))
        text.pop_back();
    if (!text.empty() && isIn(text.back(), "\"'")) {
        text.pop_back();
        text.resize(text.size() - std::min<std::size_t>(countAtEnd(text, '\\'), 15));
    }
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return c < 0x80 ? std::tolower(c) : c; });
    for (const std::string name : {"password", "passwd", "pwd", "secret", "token", "key"}) {
        if (text.size() >= name.size() && text.substr(text.size() - name.size()) == name)
            return true;
    }
    return false;
}

/// Where the value ends that begins there: with its line, or at a blank outside quotation marks that
/// no backslash makes part of it.
std::size_t endOfValue(const std::string& text, std::size_t at) {
    const std::size_t begin = at;
    char open = '\0';
    std::size_t opened = 0;  // the backslashes before the mark that is open
    for (; at < text.size() && !isIn(text[at], "\r\n"); ++at) {
        const std::size_t escapes = countAtEnd(text.substr(begin, at - begin), '\\');
        if (open == '\0' && isIn(text[at], " \t") && escapes % 2 == 0) break;
        if (open == text[at]) {
            const bool isPairs = escapes > opened && (escapes - opened) % (2 * opened + 2) == 0;
            if (escapes <= opened || isPairs) open = '\0';
        } else if (open == '\0' && isIn(text[at], "\"'")) {
            open = text[at];
            opened = escapes;
        }
    }
    return at;
}

/// The second reader: a whole text, one character after the other.
std::string maskedAtOnce(const std::string& text) {
    std::string shown;
    for (std::size_t at = 0; at < text.size();) {
        const char c = text[at++];
        shown += c;
        if (!isIn(c, "=:") || !endsInName(text.substr(0, at - 1))) continue;
        for (; at < text.size() && isIn(text[at], " \t=>:"); ++at)
            shown += text[at];
        const std::size_t end = endOfValue(text, at);
        if (end > at) shown += secrets::kMask;
        at = end;
    }
    return shown;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const std::size_t piece = input.byte() % 32U + 1;
    const std::string text(input.rest());
    const std::string shown = secrets::masked(text);
    require(shown == maskedAtOnce(text), "every value is masked, and nothing else");
    require(maskedInPieces(text, piece) == shown, "pieces do not matter");
    require(secrets::masked(shown) == shown, "what is masked stays as it is");
    return 0;
}

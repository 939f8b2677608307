#include "fleet/bus/nats/subject.h"

#include <algorithm>
#include <cstddef>

namespace fleet {

namespace {

bool isVisible(std::string_view text) {
    return std::all_of(text.begin(), text.end(), [](char c) { return c > ' ' && c < '\x7f'; });
}

/// Whether all tokens are good in the judge's eyes, who hears whether it is the last one.
template <typename Judge>
bool allTokens(std::string_view text, Judge good) {
    for (;;) {
        const std::size_t dot = text.find('.');
        const bool last = dot == std::string_view::npos;
        if (!good(text.substr(0, dot), last)) return false;
        if (last) return true;
        text.remove_prefix(dot + 1);
    }
}

}  // namespace

bool isSubjectToken(std::string_view text) {
    return !text.empty() && isVisible(text) && text.find_first_of(".*>") == std::string_view::npos;
}

bool isSubject(std::string_view text) {
    return allTokens(text, [](std::string_view token, bool) { return isSubjectToken(token); });
}

bool isSubjectPattern(std::string_view text) {
    return allTokens(text, [](std::string_view token, bool last) {
        return token == "*" || (last && token == ">") || isSubjectToken(token);
    });
}

}  // namespace fleet

// Comparisons of a row's fields with a requester's values.

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

#include "platform/oxa.h"

namespace {

bool holds(_IntfOper op, int comparison) {
    switch (op) {
        case OPER_EQ:
            return comparison == 0;
        case OPER_NE:
            return comparison != 0;
        case OPER_LT:
            return comparison < 0;
        case OPER_LE:
            return comparison <= 0;
        case OPER_GT:
            return comparison > 0;
        case OPER_GE:
            return comparison >= 0;
        case OPER_LIKE:
            break;
    }
    return false;
}

std::string_view trimmed(std::string_view text) {
    return text.substr(0, text.find_last_not_of(' ') + 1);
}

/// Whether the text begins, goes on and ends as the pieces between the pattern's "*" say. Each
/// piece is taken where it first fits, so the time is at most the product of the two lengths.
bool matches(std::string_view text, std::string_view pattern) {
    const std::size_t first = pattern.find('*');
    if (first == std::string_view::npos) return text == pattern;
    if (text.substr(0, first) != pattern.substr(0, first)) return false;
    text.remove_prefix(first);
    pattern.remove_prefix(first + 1);
    for (std::size_t star = pattern.find('*'); star != std::string_view::npos;
         star = pattern.find('*')) {
        const std::size_t found = text.find(pattern.substr(0, star));
        if (found == std::string_view::npos) return false;
        text.remove_prefix(found + star);
        pattern.remove_prefix(star + 1);
    }
    return text.size() >= pattern.size() && text.substr(text.size() - pattern.size()) == pattern;
}

/// The pattern up to where it holds more than `width` bytes besides its "*".
std::string_view cut(std::string_view pattern, std::size_t width) {
    std::size_t letters = 0;
    const auto end = std::find_if(pattern.begin(), pattern.end(),
                                  [&](char c) { return c != '*' && ++letters > width; });
    return pattern.substr(0, static_cast<std::size_t>(end - pattern.begin()));
}

}  // namespace

int rtoxa::IsException(_IntfOper op, const char* field, const char* value, int length) {
    const std::size_t width = static_cast<std::size_t>(std::max(length, 0));
    if (op == OPER_LIKE) {
        const std::string_view text(field, width);
        return matches(trimmed(text), trimmed(cut(value, width))) ? 1 : 0;
    }
    std::string padded(value, ::strnlen(value, width));
    padded.resize(width, ' ');
    return holds(op, std::memcmp(field, padded.data(), width)) ? 1 : 0;
}

int rtoxa::IsException(_IntfOper op, int field, const char* value) {
    if (op == OPER_LIKE) return matches(std::to_string(field), trimmed(value)) ? 1 : 0;
    char* end = nullptr;
    const long long number = std::strtoll(value, &end, 10);
    if (end == value || !trimmed(end).empty()) return 0;
    return holds(op, field < number ? -1 : field > number ? 1 : 0) ? 1 : 0;
}

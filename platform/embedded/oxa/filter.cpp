// Filters: which rows a request selects.

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

#include "oxa/internal.h"

namespace {

/// Whether the operator holds for this result of a comparison (negative, 0 or positive).
bool satisfies(_IntfOper op, int comparison) {
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

std::string_view withoutTrailingBlanks(std::string_view text) {
    const std::size_t last = text.find_last_not_of(' ');
    return text.substr(0, last == std::string_view::npos ? 0 : last + 1);
}

/// Compares a field with a value that is no longer than it, as if blanks followed the value.
int comparePadded(std::string_view field, std::string_view value) {
    const int head = std::memcmp(field.data(), value.data(), value.size());
    if (head != 0) return head;
    for (const char c : field.substr(value.size())) {
        if (c != ' ') return static_cast<unsigned char>(c) < ' ' ? -1 : 1;
    }
    return 0;
}

/// Cuts a pattern after `width` bytes, not counting its "*". A longer one could never match.
std::string_view cutPattern(std::string_view pattern, std::size_t width) {
    std::size_t literals = 0;
    for (std::size_t i = 0; i < pattern.size(); ++i) {
        if (pattern[i] != '*' && ++literals > width) return pattern.substr(0, i);
    }
    return pattern;
}

/// Whether the text matches the pattern. Backtracking to the latest "*" is enough: an earlier one
/// could match nothing that this one cannot.
bool matches(std::string_view text, std::string_view pattern) {
    std::size_t at = 0, inPattern = 0;
    std::size_t afterStar = std::string_view::npos, starAt = 0;
    while (at < text.size()) {
        if (inPattern < pattern.size() && pattern[inPattern] == '*') {
            afterStar = ++inPattern;
            starAt = at;
        } else if (inPattern < pattern.size() && pattern[inPattern] == text[at]) {
            ++inPattern;
            ++at;
        } else if (afterStar != std::string_view::npos) {
            inPattern = afterStar;
            at = ++starAt;
        } else {
            return false;
        }
    }
    return pattern.find_first_not_of('*', inPattern) == std::string_view::npos;
}

/// Parses a decimal number, which may have blanks around it. One that is out of range becomes the
/// nearest number in range.
bool parseNumber(const char* text, long long& number) {
    char* end = nullptr;
    number = std::strtoll(text, &end, 10);
    if (end == text) return false;
    while (*end == ' ')
        ++end;
    return *end == '\0';
}

std::vector<bool> entriesThatRestrict(const std::vector<oxa::Predicate>& filter, rtoxa& object) {
    const std::vector<oxa::Column> columns = oxa::columnsOf(object);
    std::vector<bool> restricts;
    restricts.reserve(filter.size());
    for (const oxa::Predicate& entry : filter) {
        restricts.push_back(std::any_of(
            columns.begin(), columns.end(),
            [&entry](const oxa::Column& column) { return column.name == entry.column; }));
    }
    return restricts;
}

}  // namespace

std::vector<oxa::Column> oxa::columnsOf(rtoxa& object) {
    std::vector<Column> columns;
    const int count = object.NumColumns();
    for (int i = 0; i < count; ++i) {
        ColumnInfo info{};
        if (object.GetColumnInfo(&info, i) != OXA_OK || info.name == nullptr) continue;
        Column column{info.name, info.offset, info.length, info.type};
        for (char& c : column.name) {
            if (c >= 'a' && c <= 'z') c = static_cast<char>(c - 'a' + 'A');
        }
        columns.push_back(std::move(column));
    }
    return columns;
}

int rtoxa::CheckForException(char* row) {
    State& state = *state_;
    if (state.restricts.size() != state.filter.size()) {
        state.restricts = entriesThatRestrict(state.filter, *this);
    }
    for (std::size_t i = 0; i < state.filter.size(); ++i) {
        oxa::Predicate& entry = state.filter[i];
        if (state.restricts[i] &&
            ColumnIsException(entry.column.data(), row, entry.op, entry.value.data()) == 0) {
            return 0;
        }
    }
    return 1;
}

int rtoxa::ColumnIsException(char*, char*, _IntfOper, char*) {
    return 0;
}

int rtoxa::IsException(_IntfOper op, const char* field, const char* value, int length) {
    const std::size_t width = length > 0 ? static_cast<std::size_t>(length) : 0;
    const std::string_view whole(field, width);
    if (op == OPER_LIKE) {
        const std::string_view pattern = cutPattern(value, width);
        return matches(withoutTrailingBlanks(whole), withoutTrailingBlanks(pattern)) ? 1 : 0;
    }
    const std::string_view counted(value, ::strnlen(value, width));
    return satisfies(op, comparePadded(whole, counted)) ? 1 : 0;
}

int rtoxa::IsException(_IntfOper op, int field, const char* value) {
    if (op == OPER_LIKE)
        return matches(std::to_string(field), withoutTrailingBlanks(value)) ? 1 : 0;
    long long number = 0;
    if (!parseNumber(value, number)) return 0;
    return satisfies(op, field < number ? -1 : field > number ? 1 : 0) ? 1 : 0;
}

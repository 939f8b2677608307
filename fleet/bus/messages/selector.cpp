#include "fleet/bus/messages/selector.h"

#include <algorithm>
#include <optional>

namespace fleet {
namespace {

constexpr std::string_view kBlanks = " \t";

std::string_view trimmed(std::string_view text) {
    const std::size_t first = text.find_first_not_of(kBlanks);
    if (first == std::string_view::npos) return {};
    return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

bool isNameCharacter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
           c == '_' || c == '.' || c == '/';
}

bool isName(std::string_view text) {
    return !text.empty() && std::all_of(text.begin(), text.end(), isNameCharacter);
}

bool isPattern(std::string_view text) {
    return !text.empty() && std::all_of(text.begin(), text.end(),
                                        [](char c) { return isNameCharacter(c) || c == '*'; });
}

[[noreturn]] void throwBad(std::string_view term, const char* why) {
    throw SelectorError("the selector's term \"" + std::string(term) + "\" " + why);
}

/// The parts between commas that stand in no brackets.
std::vector<std::string_view> splitAtCommas(std::string_view text) {
    std::vector<std::string_view> parts;
    std::size_t begin = 0;
    bool isInBrackets = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '(') isInBrackets = true;
        if (text[i] == ')') isInBrackets = false;
        if (text[i] != ',' || isInBrackets) continue;
        parts.push_back(trimmed(text.substr(begin, i - begin)));
        begin = i + 1;
    }
    parts.push_back(trimmed(text.substr(begin)));
    return parts;
}

/// The values of "(a,b)".
std::vector<std::string> valuesIn(std::string_view term, std::string_view text) {
    if (text.size() < 2 || text.front() != '(' || text.back() != ')') {
        throwBad(term, "lacks a list such as (a,b)");
    }
    std::vector<std::string> values;
    for (const std::string_view value : splitAtCommas(text.substr(1, text.size() - 2))) {
        if (!isPattern(value)) throwBad(term, "has a value that is none");
        values.emplace_back(value);
    }
    return values;
}

/// What stands before and behind a word between blanks.
std::optional<std::pair<std::string_view, std::string_view>> splitAt(std::string_view term,
                                                                     std::string_view word) {
    const std::size_t blank = term.find_first_of(kBlanks);
    if (blank == std::string_view::npos) return std::nullopt;
    const std::string_view rest = trimmed(term.substr(blank));
    if (rest.substr(0, word.size()) != word) return std::nullopt;
    const std::string_view list = rest.substr(word.size());
    if (list.empty() || (list.front() != '(' && kBlanks.find(list.front()) == kBlanks.npos)) {
        return std::nullopt;
    }
    return std::make_pair(term.substr(0, blank), trimmed(list));
}

}  // namespace

bool fitsPattern(std::string_view pattern, std::string_view text) {
    std::size_t p = 0;
    std::size_t t = 0;
    std::size_t star = std::string_view::npos;
    std::size_t behindStar = 0;
    while (t < text.size()) {
        if (p < pattern.size() && pattern[p] == '*') {
            star = p++;
            behindStar = t;
        } else if (p < pattern.size() && pattern[p] == text[t]) {
            ++p;
            ++t;
        } else if (star != std::string_view::npos) {
            // The last star takes one character more.
            p = star + 1;
            t = ++behindStar;
        } else {
            return false;
        }
    }
    return pattern.find_first_not_of('*', p) == std::string_view::npos;
}

Selector::Selector(std::string_view text) {
    for (const std::string_view term : splitAtCommas(text))
        terms_.push_back(termOf(term));
}

Selector::Term Selector::termOf(std::string_view text) {
    if (text.empty()) throw SelectorError("the selector has an empty term");
    const auto one = [&](Term::Kind kind, std::string_view key, std::vector<std::string> values) {
        if (!isName(key)) throwBad(text, "has no label's name");
        return Term{kind, std::string(key), std::move(values)};
    };
    if (const auto in = splitAt(text, "in")) {
        return one(Term::Kind::IsOneOf, in->first, valuesIn(text, in->second));
    }
    if (const auto notIn = splitAt(text, "notin")) {
        return one(Term::Kind::IsNoneOf, notIn->first, valuesIn(text, notIn->second));
    }
    const std::size_t equals = text.find('=');
    if (equals != std::string_view::npos) {
        const bool isNot = equals > 0 && text[equals - 1] == '!';
        const std::string_view value = trimmed(text.substr(equals + 1));
        if (!isPattern(value)) throwBad(text, "has a value that is none");
        return one(isNot ? Term::Kind::IsNoneOf : Term::Kind::IsOneOf,
                   trimmed(text.substr(0, isNot ? equals - 1 : equals)), {std::string(value)});
    }
    if (text.front() == '!') return one(Term::Kind::Missing, trimmed(text.substr(1)), {});
    if (text.find('*') == std::string_view::npos) return one(Term::Kind::Exists, text, {});
    if (!isPattern(text)) throwBad(text, "is no name of hosts");
    return {Term::Kind::Name, std::string(text), {}};
}

bool Selector::holds(const Term& term, const std::string& host, const Labels& labels) {
    if (term.kind == Term::Kind::Name) return fitsPattern(term.key, host);
    const auto label = labels.find(term.key);
    const bool exists = label != labels.end();
    const auto isOne = [&] {
        return exists &&
               std::any_of(term.values.begin(), term.values.end(),
                           [&](const auto& value) { return fitsPattern(value, label->second); });
    };
    switch (term.kind) {
        case Term::Kind::IsOneOf:
            return isOne();
        case Term::Kind::IsNoneOf:
            return !isOne();
        case Term::Kind::Missing:
            return !exists;
        default:
            return exists;
    }
}

bool Selector::matches(const std::string& host, const Labels& labels) const {
    return std::all_of(terms_.begin(), terms_.end(),
                       [&](const Term& term) { return holds(term, host, labels); });
}

}  // namespace fleet

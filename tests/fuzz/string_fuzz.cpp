// String against a plain text that does the same in the simplest way. An input is a list of
// operations, each a byte and its arguments; after each the two texts must be equal, and an
// operation throws exactly where the position or the count is one that the text does not have.

#include <algorithm>
#include <climits>
#include <cwctype>
#include <optional>
#include <sstream>

#include "base/zavstr.h"
#include "support/fuzz_support.h"

using fuzz::Input;
using fuzz::require;
using fuzz::stringOf;
using fuzz::unitsOf;
using ZAV::String;

namespace {

constexpr std::size_t kLongest = 4096;
constexpr unsigned kTextBound = 24;

struct State {
    String text;
    std::u16string model;
    Input input;
};

/// The result of `action`, or nothing when it threw for a bad position.
template <typename Action>
auto attempt(Action action) -> std::optional<decltype(action())> {
    try {
        return action();
    } catch (const ZAV::IndexOutOfBoundsException&) {
        return std::nullopt;
    }
}

std::uint32_t indexOf(std::size_t position) {
    return position == std::u16string::npos ? String::NPOS : static_cast<std::uint32_t>(position);
}

/// A position in the text's first 255 units, its end or, now and then, one beyond it.
std::size_t position(State& state) {
    return state.input.byte() % std::min<std::size_t>(state.model.size() + 2, 256);
}

void append(State& state) {
    const std::u16string tail = state.input.units(kTextBound);
    if (tail.size() == 1) {
        state.text.append(tail[0]);
    } else {
        state.text.append(stringOf(tail));
    }
    state.model += tail;
}

void appendPart(State& state) {
    const std::u16string tail = state.input.units(kTextBound);
    const unsigned n = state.input.below(kTextBound + 2);
    const bool fits = n <= tail.size();
    const auto done = attempt([&] { return &state.text.append(stringOf(tail), n); });
    require(done.has_value() == fits, "appending more than there is throws");
    if (fits) state.model.append(tail, 0, n);
}

void appendItself(State& state) {
    state.text.append(state.text);
    state.model += std::u16string(state.model);
}

void eraseRange(State& state) {
    const std::size_t pos = position(state);
    const std::size_t n = state.input.byte();
    const bool toEnd = n == 255;
    const std::size_t length = state.model.size();
    const bool exists = toEnd ? pos < length : n > 0 && pos <= length && n <= length - pos;
    const auto at = static_cast<std::uint32_t>(pos);
    const auto part = attempt([&] {
        return toEnd ? state.text.substr(at) : state.text.substr(at, static_cast<std::uint32_t>(n));
    });
    require(part.has_value() == exists, "a part outside the text throws");
    if (part) {
        require(unitsOf(*part) == state.model.substr(pos, toEnd ? std::u16string::npos : n),
                "a part is what stands there");
    }
    const auto done = attempt([&] {
        return toEnd ? &state.text.erase(at) : &state.text.erase(at, static_cast<std::uint32_t>(n));
    });
    require(done.has_value() == exists, "erasing outside the text throws");
    if (exists) state.model.erase(pos, toEnd ? std::u16string::npos : n);
}

void trim(State& state) {
    const auto isBlank = [](char16_t unit) { return std::iswspace(unit) != 0; };
    state.text.trim();
    while (!state.model.empty() && isBlank(state.model.back()))
        state.model.pop_back();
    while (!state.model.empty() && isBlank(state.model.front()))
        state.model.erase(0, 1);
}

void changeCase(State& state) {
    const bool upper = state.input.below(2) == 1;
    if (upper) {
        state.text.toUpper();
    } else {
        state.text.toLower();
    }
    for (char16_t& unit : state.model) {
        unit = static_cast<char16_t>(upper ? std::towupper(unit) : std::towlower(unit));
    }
}

void removeEscapes(State& state) {
    const char16_t escape = state.input.unit();
    state.text.removeEscapes(escape);
    std::u16string kept;
    for (std::size_t i = 0; i < state.model.size(); ++i) {
        const bool isEscape =
            state.model[i] == escape && i + 1 < state.model.size() &&
            std::u16string_view(u"[]{}=\\").find(state.model[i + 1]) != std::u16string_view::npos;
        if (isEscape) ++i;
        kept += state.model[i];
    }
    state.model = kept;
}

/// The terminator counts as a unit of the text here.
void insertEscapes(State& state) {
    const char16_t escape = state.input.unit();
    const std::u16string special = state.input.units(8);
    state.text.insertEscapes(escape, stringOf(special));
    std::u16string escaped;
    for (const char16_t unit : state.model + u'\0') {
        if (special.find(unit) != std::u16string::npos) escaped += escape;
        escaped += unit;
    }
    escaped.pop_back();
    state.model = escaped;
}

/// Escapes that go in come out again, as far as both sides agree on what is special.
void escapeAndBack(State& state) {
    String escaped(state.text);
    escaped.insertEscapes('\\', "[]{}=\\");
    escaped.removeEscapes('\\');
    require(unitsOf(escaped) == state.model, "escapes can be taken out again");
}

void findUnit(State& state) {
    const char16_t unit = state.input.unit();
    const std::size_t start = position(state);
    const auto at = static_cast<std::uint32_t>(start);
    const auto found =
        attempt([&] { return state.text.find(static_cast<unsigned short>(unit), at); });
    require(found.has_value() == (start < state.model.size()), "a start outside throws");
    if (found) require(*found == indexOf(state.model.find(unit, start)), "the first unit is found");
    const std::size_t last = state.model.rfind(unit);
    const std::uint32_t expected = unit == 0   ? indexOf(state.model.size())
                                   : last == 0 ? String::NPOS
                                               : indexOf(last);
    if (unit != 0 || !state.model.empty()) {
        require(state.text.rfind(unit) == expected, "the last unit is found, but not the first");
    }
}

void findUnescaped(State& state) {
    const char16_t unit = state.input.unit();
    const char16_t escape = state.input.unit();
    const std::size_t start = position(state);
    const auto found =
        attempt([&] { return state.text.find(unit, escape, static_cast<std::uint32_t>(start)); });
    require(found.has_value() == (start < state.model.size()), "a start outside throws");
    std::uint32_t expected = String::NPOS;
    for (std::size_t i = start; i < state.model.size() && expected == String::NPOS; ++i) {
        std::size_t escapes = 0;
        while (escapes < i && state.model[i - 1 - escapes] == escape)
            ++escapes;
        if (state.model[i] == unit && (i == start || escapes % 2 == 0)) expected = indexOf(i);
    }
    if (found) require(*found == expected, "the first unit that is not escaped is found");
}

void findText(State& state) {
    const std::u16string wanted = state.input.units(6);
    const std::size_t start = position(state);
    const std::size_t expected =
        wanted.empty() ? std::u16string::npos : state.model.find(wanted, start);
    require(
        state.text.find(stringOf(wanted), static_cast<std::uint32_t>(start)) == indexOf(expected),
        "the first occurrence is found");
}

void replace(State& state) {
    const std::u16string what = state.input.units(4);
    const std::u16string with = state.input.units(8);
    state.text = String::replace(state.text, stringOf(what), stringOf(with));
    if (what.empty()) return;
    for (std::size_t at = 0; (at = state.model.find(what, at)) != std::u16string::npos;) {
        state.model.replace(at, what.size(), with);
        at += with.size();
    }
}

void compare(State& state) {
    const std::u16string other = state.input.units(kTextBound);
    const std::u16string a = state.model.substr(0, state.model.find(u'\0'));
    const std::u16string b = other.substr(0, other.find(u'\0'));
    std::size_t same = 0;
    while (same < a.size() && same < b.size() && a[same] == b[same])
        ++same;
    const int expected = same == a.size() && same == b.size() ? 0
                         : same == a.size()                   ? -1
                         : same == b.size()                   ? 1
                                                              : a[same] - b[same];
    require(String::compare(state.text, stringOf(other)) == expected, "texts compare by units");
    require((state.text == stringOf(other)) == (expected == 0), "equal texts are equal");
}

/// The number that the ASCII text is as a whole; nothing when it is not one or too large.
std::optional<int> numberIn(const std::string& text) {
    std::size_t at = std::min(text.find_first_not_of(" \t\n\v\f\r"), text.size());
    if (text.empty()) return 0;
    const bool negative = at < text.size() && text[at] == '-';
    if (at < text.size() && (text[at] == '-' || text[at] == '+')) ++at;
    if (at == text.size()) return std::nullopt;
    long long value = 0;
    for (; at < text.size(); ++at) {
        if (text[at] < '0' || text[at] > '9') return std::nullopt;
        value = std::min(value * 10 + (text[at] - '0'), 1LL << 40);
    }
    if (negative) value = -value;
    if (value >= INT_MAX || value <= INT_MIN) return std::nullopt;
    return static_cast<int>(value);
}

void convert(State& state) {
    const ZAV::CharStar narrow = state.text.c_str();
    const std::string bytes(static_cast<const char*>(narrow));
    require(bytes.size() <= state.model.size() + 1, "bytes are cut to the number of units");
    const String back(bytes.c_str());
    require(back.length() <= bytes.size(), "a text has no more units than bytes");
    unitsOf(back);
    std::ostringstream printed;
    printed << state.text;
    require(fuzz::isAscii(printed.str()), "what is printed is ASCII");

    int number = -1;
    const bool isNumber = String::convertToInt(state.text, &number);
    require(isNumber || number == 0, "what is no number is 0");
    const std::u16string shown = state.model.substr(0, state.model.find(u'\0'));
    if (!std::all_of(state.model.begin(), state.model.end(), [](char16_t c) { return c < 128; }))
        return;
    require(std::u16string(bytes.begin(), bytes.end()) == shown, "ASCII is kept");
    require(unitsOf(back) == shown, "and comes back");
    const std::optional<int> expected = numberIn(bytes);
    require(isNumber == expected.has_value() && number == expected.value_or(0), "a number is read");
}

void copyAndMove(State& state) {
    String copy(state.text);
    String moved(std::move(copy));
    require(unitsOf(copy).empty(), "a text that was moved from is empty");
    const unsigned n = state.input.below(
        static_cast<unsigned>(std::min<std::size_t>(state.model.size() + 1, 256)));
    require(unitsOf(String(moved, n)) == state.model.substr(0, n), "a beginning is copied");
    state.text = std::move(moved);
    require(unitsOf(moved).empty(), "a text that was moved from is empty");
}

void subscript(State& state) {
    const std::size_t i = position(state);
    const auto unit = attempt([&] { return state.text[static_cast<std::uint32_t>(i)]; });
    require(unit.has_value() == (i <= state.model.size()), "a subscript outside throws");
    if (unit) require(*unit == state.model.c_str()[i], "the unit stands there");
}

constexpr void (*kOperations[])(State&) = {
    append,        appendPart,    appendItself,  eraseRange,  trim,          changeCase,
    removeEscapes, insertEscapes, escapeAndBack, findUnit,    findUnescaped, findText,
    replace,       compare,       convert,       copyAndMove, subscript,
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    State state{{}, {}, Input(data, size)};
    while (!state.input.isEmpty() && state.model.size() <= kLongest) {
        kOperations[state.input.below(std::size(kOperations))](state);
        require(unitsOf(state.text) == state.model, "both texts are equal");
    }
    return 0;
}

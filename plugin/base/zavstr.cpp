// String without the conversions, which are in zavstr_conv.cpp.

#include "base/zavstr.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <cwctype>
#include <ostream>
#include <string>

#include "base/zavtrace.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavstr"};

[[noreturn]] void throwOutOfBounds(const Trace& trace, int line = __builtin_LINE()) {
    trace(line).error("IndexOutOfBounds occurred, throwing exception");
    throw IndexOutOfBoundsException(line, traceUnit.name);
}

/// Whether a text of `length` units has `n` units at `pos`, and `n` is not 0.
bool isRange(std::uint32_t pos, std::uint32_t n, std::uint32_t length) {
    return n != 0 && n <= length && pos <= length - n;
}

using UnitBlock = unsigned short __attribute__((vector_size(16)));
constexpr std::uint32_t kBlock = sizeof(UnitBlock) / sizeof(unsigned short);

/// Whether a block contains `ch`.
bool blockHolds(const unsigned short* units, unsigned short ch) {
    UnitBlock block;
    std::memcpy(&block, units, sizeof block);
    const auto equal = block == ch;
    std::uint64_t words[2];
    static_assert(sizeof words == sizeof equal);
    std::memcpy(words, &equal, sizeof words);
    return (words[0] | words[1]) != 0;
}

/// The index of the first `ch` in [start, end), or `end`.
std::uint32_t indexOf(const unsigned short* units, std::uint32_t start, std::uint32_t end,
                      unsigned short ch) {
    while (end - start >= kBlock && !blockHolds(units + start, ch))
        start += kBlock;
    while (start < end && units[start] != ch)
        ++start;
    return start;
}

/// Copies the two ends of a text, which may overlap: it has as many units as one or two words.
template <typename Word>
void copyEnds(unsigned short* to, const unsigned short* from, std::uint32_t n) {
    constexpr std::uint32_t kUnits = sizeof(Word) / sizeof(unsigned short);
    Word first;
    Word last;
    std::memcpy(&first, from, sizeof first);
    std::memcpy(&last, from + n - kUnits, sizeof last);
    std::memcpy(to, &first, sizeof first);
    std::memcpy(to + n - kUnits, &last, sizeof last);
}

/// Copies a text in pieces that are short enough for the C library to use vector moves. For longer
/// ones it uses a string instruction that takes three times as long on some processors.
void copyLong(unsigned short* to, const unsigned short* from, std::uint32_t n) {
    constexpr std::uint32_t kPiece = 512;
    while (n > 0) {
        const std::uint32_t piece = std::min(n, kPiece);
        std::memcpy(to, from, piece * sizeof *to);
        to += piece;
        from += piece;
        n -= piece;
    }
}

/// Copies `n` units. Most texts are short, and a call would take longer than the copy.
inline void copyUnits(unsigned short* to, const unsigned short* from, std::uint32_t n) {
    if (n > 2 * kBlock) {
        copyLong(to, from, n);
    } else if (n >= kBlock) {
        copyEnds<UnitBlock>(to, from, n);
    } else if (n >= 4) {
        copyEnds<std::uint64_t>(to, from, n);
    } else if (n > 0) {
        to[0] = from[0];
        to[n / 2] = from[n / 2];
        to[n - 1] = from[n - 1];
    }
}

std::uint32_t lengthOf(const unsigned short* units) {
    std::size_t count = 0;
    while (units[count] != 0)
        ++count;
    if (count >= UINT32_MAX) throwArrayTooLong();
    return static_cast<std::uint32_t>(count);
}

/// Returns `n`. Throws when it leaves no room for the terminator, because the sum must not wrap.
std::uint32_t withRoomForTerminator(std::uint32_t n) {
    if (n == UINT32_MAX) throwArrayTooLong();
    return n;
}

bool occursIn(const String& set, unsigned short unit) {
    const std::uint32_t length = set.length();
    return indexOf(set.getData(), 0, length, unit) != length;
}

bool isSpecial(unsigned short unit) {
    return unit != 0 && unit < 128 && std::strchr("[]{}=\\", unit) != nullptr;
}

}  // namespace

std::string localText(const String& text) {
    return static_cast<const char*>(text.c_str());
}

TraceArgument::TraceArgument(const CharStar& text)
    : kind_(Kind::Text), pointer_(static_cast<const char*>(text)) {}

String::String(String&& other) : String() {
    units_.swap(other.units_);
}

/// Copies `n` units into a block of exactly the size they need. Always inlined, because substr
/// calls it for every token of a text.
[[gnu::always_inline]] inline String::String(Counted, const unsigned short* units, std::uint32_t n)
    : units_(n + 1) {
    unsigned short* const own = units_.getData();
    copyUnits(own, units, n);
    own[n] = 0;
}

String::String(const String& other) : String(Counted{}, other.getData(), other.length()) {}

String::String(const String& other, std::uint32_t n)
    : String(Counted{}, other.getData(), withRoomForTerminator(n)) {}

String::String(const unsigned short* units)
    : String(Counted{}, units, units != nullptr ? lengthOf(units) : 0) {}

String& String::operator=(const String& other) {
    return this == &other ? *this : assign(other);
}

String& String::operator=(String&& other) noexcept {
    if (this == &other) return *this;
    units_.swap(other.units_);
    // `other` holds this text's former units. Truncating it needs no memory.
    other.units_.getData()[0] = 0;
    other.units_.remove(1, other.units_.getSize() - 1);
    return *this;
}

String& String::assign(const unsigned short* units) {
    return *this = String(units);
}

String& String::assign(const unsigned short* units, std::uint32_t n) {
    return *this = String(Counted{}, units, units != nullptr ? withRoomForTerminator(n) : 0);
}

String& String::assign(const String& other) {
    units_ = other.units_;
    return *this;
}

String& String::assign(const String& other, std::uint32_t n) {
    return assign(other.getData(), n);
}

void String::clear() {
    units_.clear();
    terminate();
}

/// Makes room for `n` more units, and for half as many as the text has. Texts are often built from
/// many small pieces; reallocating for each would take quadratic time.
void String::reserveMore(std::uint32_t n) {
    const std::uint32_t size = units_.getSize();
    const std::uint32_t capacity = units_.getCapacity();
    if (n > UINT32_MAX - size) throwArrayTooLong();
    if (size + n <= capacity) return;
    const std::uint32_t generous = capacity + std::min(capacity / 2, UINT32_MAX - capacity);
    units_.reserveCapacity(std::max(size + n, generous));
}

/// Appends a range of a text, which may be this one.
String& String::appendRange(const String& other, std::uint32_t pos, std::uint32_t n) {
    reserveMore(n);
    const std::uint32_t end = length();
    units_.grow(n);
    unsigned short* const units = units_.getData();
    CopyMem(units + end, other.units_.getData() + pos, n);
    units[end + n] = 0;
    return *this;
}

String& String::append(unsigned short ch) {
    reserveMore(1);
    units_.grow(1);
    unsigned short* const end = units_.getData() + units_.getSize();
    end[-2] = ch;
    end[-1] = 0;
    return *this;
}

String& String::append(const String& other, std::uint32_t n) {
    const Trace trace(traceUnit);
    if (n > other.length()) throwOutOfBounds(trace);
    return appendRange(other, 0, n);
}

String& String::erase(std::uint32_t pos) {
    const Trace trace(traceUnit);
    if (pos >= length()) throwOutOfBounds(trace);
    return erase(pos, length() - pos);
}

String& String::erase(std::uint32_t pos, std::uint32_t n) {
    const Trace trace(traceUnit);
    if (!isRange(pos, n, length())) throwOutOfBounds(trace);
    units_.remove(pos, n);
    return *this;
}

String& String::trim() {
    const Trace trace(traceUnit);
    const unsigned short* const units = getData();
    std::uint32_t begin = 0;
    // The blanks of an indentation are all the same unit, so one test is enough.
    while (isWhiteSpace(units[begin])) {
        const unsigned short blank = units[begin];
        while (units[begin] == blank)
            ++begin;
    }
    if (begin >= length()) {
        clear();
        return *this;
    }
    std::uint32_t end = length();
    while (isWhiteSpace(units[end - 1]))
        --end;
    units_.remove(end, length() - end);
    units_.remove(0, begin);
    return *this;
}

String& String::toUpper() {
    const Trace trace(traceUnit);
    unsigned short* const units = units_.getData();
    std::transform(units, units + length(), units, [](unsigned short unit) {
        return static_cast<unsigned short>(std::towupper(unit));
    });
    return *this;
}

String& String::toLower() {
    const Trace trace(traceUnit);
    unsigned short* const units = units_.getData();
    std::transform(units, units + length(), units, [](unsigned short unit) {
        return static_cast<unsigned short>(std::towlower(unit));
    });
    return *this;
}

String& String::removeEscapes(unsigned short esc) {
    const Trace trace(traceUnit);
    unsigned short* const units = units_.getData();
    const std::uint32_t end = length();
    std::uint32_t kept = 0;
    for (std::uint32_t i = 0; i < end; ++i) {
        // The unit after a removed escape is kept without looking at it.
        if (units[i] == esc && isSpecial(units[i + 1])) ++i;
        units[kept++] = units[i];
    }
    units_.remove(kept, end - kept);
    return *this;
}

String& String::insertEscapes(unsigned short esc, const String& special) {
    const Trace trace(traceUnit);
    // Includes the terminator: when the special set contains 0, it is escaped like any other unit.
    const unsigned short* const units = getData();
    const std::uint32_t end = units_.getSize();
    std::uint32_t escapes = 0;
    for (std::uint32_t i = 0; i < end; ++i) {
        if (occursIn(special, units[i])) ++escapes;
    }
    if (escapes == 0) return *this;

    Array<unsigned short> escaped;
    if (escapes > UINT32_MAX - end) throwArrayTooLong();
    escaped.grow(end + escapes);
    unsigned short* out = escaped.getData();
    for (std::uint32_t i = 0; i < end; ++i) {
        if (occursIn(special, units[i])) *out++ = esc;
        *out++ = units[i];
    }
    units_.swap(escaped);
    return *this;
}

void String::throwBadSubscript() {
    const Trace trace(traceUnit, "operator[]");
    throwOutOfBounds(trace);
}

String String::substr(std::uint32_t pos) const {
    const Trace trace(traceUnit);
    if (pos >= length()) throwOutOfBounds(trace);
    return substr(pos, length() - pos);
}

String String::substr(std::uint32_t pos, std::uint32_t n) const {
    const Trace trace(traceUnit);
    if (!isRange(pos, n, length())) throwOutOfBounds(trace);
    return String(Counted{}, getData() + pos, n);
}

std::uint32_t String::find(unsigned short ch, std::uint32_t start) const {
    Trace trace(traceUnit);
    if (start >= length()) throwOutOfBounds(trace);
    const std::uint32_t index = indexOf(getData(), start, length(), ch);
    return trace.exit(index == length() ? NPOS : index);
}

std::uint32_t String::find(char ch, std::uint32_t start) const {
    return find(static_cast<unsigned short>(static_cast<unsigned char>(ch)), start);
}

std::uint32_t String::find(unsigned short ch, unsigned short esc, std::uint32_t start) const {
    Trace trace(traceUnit);
    if (start >= length()) throwOutOfBounds(trace);
    const unsigned short* const units = getData();
    std::uint32_t escapes = 0;  // directly before i, including those before the start
    while (escapes < start && units[start - 1 - escapes] == esc)
        ++escapes;
    for (std::uint32_t i = start; i < length(); ++i) {
        if (units[i] == ch && (i == start || escapes % 2 == 0)) return trace.exit(i);
        escapes = units[i] == esc ? escapes + 1 : 0;
    }
    return trace.exit(NPOS);
}

std::uint32_t String::find(const String& other, std::uint32_t start) const {
    Trace trace(traceUnit);
    const std::uint32_t count = other.length();
    if (count == 0 || count > length() || start > length() - count) return trace.exit(NPOS);
    const unsigned short* const units = getData();
    const unsigned short* const wanted = other.getData();
    const std::uint32_t end = length() - count + 1;
    for (std::uint32_t i = start; (i = indexOf(units, i, end, wanted[0])) < end; ++i) {
        if (std::equal(wanted, wanted + count, units + i)) return trace.exit(i);
    }
    return trace.exit(NPOS);
}

std::uint32_t String::rfind(unsigned short ch) const {
    Trace trace(traceUnit);
    for (std::uint32_t i = length(); i > 0; --i) {
        if (units_.getData()[i] == ch) return trace.exit(i);
    }
    return trace.exit(NPOS);
}

int String::compare(const String& a, const String& b) {
    return compare(a.getData(), b.getData());
}

int String::compare(const unsigned short* a, const unsigned short* b) {
    for (;; ++a, ++b) {
        if (*a == 0 || *b == 0) return *b != 0 ? -1 : *a != 0 ? 1 : 0;
        if (*a != *b) return *a - *b;
    }
}

String String::replace(const String& str, const String& what, const String& with) {
    const Trace trace(traceUnit);
    trace().detail("Str [%s], replace [%s] with [%s]", str, what, with);
    String result;
    result.units_.reserveCapacity(str.units_.getSize());
    std::uint32_t copied = 0;
    for (std::uint32_t match = 0; (match = str.find(what, copied)) != NPOS;) {
        result.appendRange(str, copied, match - copied).append(with);
        copied = match + what.length();
    }
    result.appendRange(str, copied, str.length() - copied);
    trace().detail("Returning [%s]", result);
    return result;
}

bool String::isWhiteSpace(unsigned short ch) {
    return std::iswspace(ch) != 0;
}

String operator+(const String& a, const String& b) {
    String sum(a);
    sum.append(b);
    return sum;
}

std::ostream& operator<<(std::ostream& out, const String& text) {
    std::string printed;
    printed.reserve(text.length());
    const unsigned short* const units = text.getData();
    for (std::uint32_t i = 0; i < text.length(); ++i) {
        if (units[i] >= 1 && units[i] <= 127) {
            printed += static_cast<char>(units[i]);
        } else {
            char escape[8];
            std::snprintf(escape, sizeof escape, "\\x%04X", static_cast<unsigned>(units[i]));
            printed += escape;
        }
    }
    return out.write(printed.data(), static_cast<std::streamsize>(printed.size()));
}

}  // namespace ZAV

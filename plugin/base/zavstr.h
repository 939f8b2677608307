/// The text type of this library. Text is stored as UTF-16. It is converted from the process's code
/// page where it comes in as `char*`, and to it where c_str() returns it.
#pragma once

#include <atomic>
#include <cstdint>
#include <iosfwd>
#include <memory>

#include "base/zavarryi.h"
#include "base/zavindex.h"
#include "platform/nls2.h"

namespace ZAV {

/// An owned, 0-terminated narrow text. The pointers that it converts to are valid as long as the
/// CharStar lives: use them within the same full expression, or keep the CharStar in a variable.
class CharStar {
public:
    /// Copies `text`; a null pointer stays null.
    CharStar(const char* text);
    CharStar(const CharStar& other);
    CharStar(CharStar&& other) noexcept : text_(other.text_) { other.text_ = nullptr; }
    ~CharStar() { delete[] text_; }
    CharStar& operator=(const CharStar& other);
    CharStar& operator=(CharStar&& other) noexcept;

    operator char*() const { return text_; }
    operator const char*() const { return text_; }

private:
    friend class String;
    explicit CharStar(std::unique_ptr<char[]> text) : text_(text.release()) {}

    char* text_;  // from array new
};

/// UTF-16 text. Lengths and positions count code units, so a surrogate pair counts as two. The
/// units are always followed by exactly one terminating 0.
///
/// A position or count out of range is traced and throws IndexOutOfBoundsException; the String is
/// unchanged then. Conversions never fail; they return what could be converted. Use a String on one
/// thread at a time; several threads may convert at once.
class String {
public:
    /// The result of a search that finds nothing.
    static constexpr std::uint32_t NPOS = 0xFFFFFFFFu;

    String() { terminate(); }
    String(const String& other);
    /// Leaves `other` empty. May throw std::bad_alloc, because `other` needs a block for its
    /// terminator.
    String(String&& other);
    /// The first `n` units of `other`. Does not check that there are as many.
    String(const String& other, std::uint32_t n);
    /// From the local code page; a null pointer gives an empty text.
    String(const char* text);
    /// From the first `n` bytes of `text`, or fewer when there is a 0 before that.
    String(const char* text, std::uint32_t n);
    /// From 0-terminated units; a null pointer gives an empty text.
    String(const unsigned short* units);
    virtual ~String() {}

    String& operator=(const String& other);
    /// Leaves `other` empty.
    String& operator=(String&& other) noexcept;
    String& operator=(const unsigned short* units) { return assign(units); }

    String& assign(const char* text);
    String& assign(const char* text, std::uint32_t n);
    String& assign(const unsigned short* units);
    /// Assigns `n` units, which may include a 0.
    String& assign(const unsigned short* units, std::uint32_t n);
    String& assign(const String& other);
    String& assign(const String& other, std::uint32_t n);
    void clear();

    String& append(unsigned short ch);
    String& append(const String& other) { return append(other, other.length()); }
    /// Appends the first `n` units of `other`. Throws when it has fewer.
    String& append(const String& other, std::uint32_t n);
    /// Erases the text from `pos` to the end. Throws when there is nothing to erase.
    String& erase(std::uint32_t pos);
    /// Erases `n` units, starting at `pos`. Throws when `n` is 0.
    String& erase(std::uint32_t pos, std::uint32_t n);
    /// Removes white space (see isWhiteSpace) at both ends.
    String& trim();
    String& toUpper();
    String& toLower();
    /// Removes each `esc` that precedes one of the special characters [ ] { } = \ .
    String& removeEscapes(unsigned short esc);
    /// Inserts `esc` before every unit that occurs in `special`.
    String& insertEscapes(unsigned short esc, const String& special);

    std::uint32_t length() const { return units_.getSize() - 1; }
    std::uint32_t size() const { return length(); }
    /// The 0-terminated units; valid until the text changes.
    const unsigned short* getData() const { return units_.getData(); }
    /// The unit at `i`, or the terminator when `i` is the length.
    unsigned short& operator[](std::uint32_t i) {
        if (i > length()) throwBadSubscript();
        return units_.getData()[i];
    }
    const unsigned short& operator[](std::uint32_t i) const {
        if (i > length()) throwBadSubscript();
        return units_.getData()[i];
    }

    /// The text from `pos` to the end. Throws when that would be empty.
    String substr(std::uint32_t pos) const;
    /// `n` units, starting at `pos`. Throws when `n` is 0.
    String substr(std::uint32_t pos, std::uint32_t n) const;

    /// The first index at or after `start` that holds `ch`, or NPOS. Throws when `start` is not
    /// less than the length.
    std::uint32_t find(unsigned short ch, std::uint32_t start = 0) const;
    /// The same for a byte value.
    std::uint32_t find(char ch, std::uint32_t start) const;
    /// The first `ch` at or after `start` that is not escaped, which means that it is at `start` or
    /// follows an even number of `esc` units. Throws like find(ch, start).
    std::uint32_t find(unsigned short ch, unsigned short esc, std::uint32_t start) const;
    /// The first index at or after `start` at which `other` occurs, or NPOS. An empty text is never
    /// found. Does not throw.
    std::uint32_t find(const String& other, std::uint32_t start) const;
    /// The last index that holds `ch`, or NPOS. Includes the terminator's index, but not index 0.
    std::uint32_t rfind(unsigned short ch) const;

    /// The text in the local code page, truncated to as many bytes as the text with its terminator
    /// has code units.
    CharStar c_str() const;

    /// Opens the process's locale again and replaces the current one. Returns whether there is one.
    /// The first conversion calls it; several threads may do so at once. Calling it later is safe
    /// only when the platform allows releasing a locale while another thread converts with it.
    static bool initialize();

    /// Compares unit by unit up to the terminator. Returns 0 when equal, -1 when `a` is a prefix of
    /// `b`, 1 when `b` is a prefix of `a`, otherwise the difference of the first units that differ.
    static int compare(const String& a, const String& b);
    static int compare(const unsigned short* a, const unsigned short* b);
    /// Returns `str` with every `what` replaced by `with`.
    static String replace(const String& str, const String& what, const String& with);
    /// Converts a decimal number, which must be the whole of `s` except for leading blanks. An
    /// empty text is 0. Returns false and sets `*out` to 0 when `s` is not a number, does not fit
    /// into 32 bits, or is one of the two extreme values.
    static bool convertToInt(const String& s, int* out);
    static bool isWhiteSpace(unsigned short ch);

    /// Converts text in the local code page to new 0-terminated units. Returns null for a null
    /// pointer. The caller frees the result with releaseUnicodeString.
    static unsigned short* createUnicodeString(const char* text);
    static unsigned short* createUnicodeString(const char* text, std::uint32_t n);
    /// Converts text, which is not null, as createUnicodeString does into `out`, which has room for
    /// as many units as the text has bytes with its terminator.
    static void convertToUnicode(const char* text, unsigned short* out);
    static unsigned short* copyUnicodeString(const unsigned short* units);
    static void releaseUnicodeString(unsigned short* units);

private:
    static bool initializeLocked();
    static NLS2_LOCALE* localeForConversion();
    [[noreturn]] static void throwBadSubscript();

    /// Names the constructor that takes the number of units, which is less than UINT32_MAX.
    struct Counted {};
    String(Counted, const unsigned short* units, std::uint32_t n);

    void terminate() { units_.append(0); }
    void convertFrom(const char* text);
    void reserveMore(std::uint32_t n);
    String& appendRange(const String& other, std::uint32_t pos, std::uint32_t n);

    static std::atomic<bool> _initialized;
    static std::atomic<NLS2_LOCALE*> _locale;

    Array<unsigned short> units_;  // the text and its terminator
};

String operator+(const String& a, const String& b);

inline bool operator==(const String& a, const String& b) {
    return String::compare(a, b) == 0;
}
inline bool operator!=(const String& a, const String& b) {
    return String::compare(a, b) != 0;
}
inline bool operator==(const char* a, const String& b) {
    return String(a) == b;
}
inline bool operator==(const String& a, const char* b) {
    return a == String(b);
}

/// Writes ASCII unchanged and every other unit, 0 included, as "\x" and four hexadecimal digits.
std::ostream& operator<<(std::ostream& out, const String& text);

}  // namespace ZAV

/// The text type of this library. Text is kept as UTF-16 and converted from and to the process's
/// code page only where it comes in as `char*` and where c_str() hands it out.
#pragma once

#include <atomic>
#include <cstdint>
#include <iosfwd>
#include <memory>

#include "base/zavarryi.h"
#include "base/zavindex.h"
#include "platform/nls2.h"

namespace ZAV {

/// An owned, 0-terminated narrow text. What its conversions yield lives as long as the CharStar:
/// use it within the full expression or keep the CharStar in a local.
class CharStar {
public:
    /// Copies `text`; a null pointer is kept as one.
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

/// UTF-16 text. Lengths and positions count code units: a surrogate pair counts as two. After every
/// operation the units are followed by exactly one terminating 0.
///
/// A position or count that the text does not have is traced and throws IndexOutOfBoundsException;
/// the String is unchanged then. Conversions never fail: whatever could be converted is used. A
/// String belongs to one thread at a time; conversions run on any number of threads.
class String {
public:
    /// What searches return when nothing is found.
    static constexpr std::uint32_t NPOS = 0xFFFFFFFFu;

    String() { terminate(); }
    String(const String& other);
    /// Leaves `other` empty. May run out of memory, since `other` needs a block for its terminator.
    String(String&& other);
    /// The first `n` units of `other`, which is trusted to have them.
    String(const String& other, std::uint32_t n);
    /// From the local code page; a null pointer yields an empty text.
    String(const char* text);
    /// From the first `n` bytes of `text`, or from what stands before an earlier 0.
    String(const char* text, std::uint32_t n);
    /// From 0-terminated units; a null pointer yields an empty text.
    String(const unsigned short* units);
    virtual ~String() {}

    String& operator=(const String& other);
    /// Leaves `other` empty.
    String& operator=(String&& other) noexcept;
    String& operator=(const unsigned short* units) { return assign(units); }

    String& assign(const char* text);
    String& assign(const char* text, std::uint32_t n);
    String& assign(const unsigned short* units);
    /// Takes `n` units, a 0 among them too.
    String& assign(const unsigned short* units, std::uint32_t n);
    String& assign(const String& other);
    String& assign(const String& other, std::uint32_t n);
    void clear();

    String& append(unsigned short ch);
    String& append(const String& other) { return append(other, other.length()); }
    /// Appends the first `n` units of `other`; throws when it has fewer.
    String& append(const String& other, std::uint32_t n);
    /// Erases from `pos` to the end; throws when that is nothing.
    String& erase(std::uint32_t pos);
    /// Erases `n` units from `pos` on; throws when `n` is 0.
    String& erase(std::uint32_t pos, std::uint32_t n);
    /// Removes white space (isWhiteSpace) at both ends.
    String& trim();
    String& toUpper();
    String& toLower();
    /// Removes each `esc` that stands before one of the special characters [ ] { } = \ .
    String& removeEscapes(unsigned short esc);
    /// Puts `esc` before every unit that occurs in `special`.
    String& insertEscapes(unsigned short esc, const String& special);

    std::uint32_t length() const { return units_.getSize() - 1; }
    std::uint32_t size() const { return length(); }
    /// The 0-terminated units; valid until the text is next changed.
    const unsigned short* getData() const { return units_.getData(); }
    /// The unit at `i`; the terminator when `i` is the length.
    unsigned short& operator[](std::uint32_t i) {
        if (i > length()) throwBadSubscript();
        return units_.getData()[i];
    }
    const unsigned short& operator[](std::uint32_t i) const {
        if (i > length()) throwBadSubscript();
        return units_.getData()[i];
    }

    /// From `pos` to the end; throws when that is nothing.
    String substr(std::uint32_t pos) const;
    /// `n` units from `pos` on; throws when `n` is 0.
    String substr(std::uint32_t pos, std::uint32_t n) const;

    /// The first index at or after `start` that holds `ch`, or NPOS. Throws when `start` is not
    /// less than the length.
    std::uint32_t find(unsigned short ch, std::uint32_t start = 0) const;
    /// The same for a byte value.
    std::uint32_t find(char ch, std::uint32_t start) const;
    /// The first `ch` at or after `start` that is not escaped: it stands at `start` itself or
    /// behind an even number of `esc` units. Throws as find(ch, start) does.
    std::uint32_t find(unsigned short ch, unsigned short esc, std::uint32_t start) const;
    /// The first index at or after `start` at which `other` occurs, or NPOS; an empty text occurs
    /// nowhere. Never throws.
    std::uint32_t find(const String& other, std::uint32_t start) const;
    /// The last index that holds `ch`, the terminator's included and index 0 left out, or NPOS.
    std::uint32_t rfind(unsigned short ch) const;

    /// The text in the local code page, cut to as many bytes as the text and its terminator have
    /// code units.
    CharStar c_str() const;

    /// Opens the process's locale anew, in place of the one held; true when there is one. Called by
    /// the first conversion. Threads may race for it; but whoever calls it once conversions run
    /// must know that the platform lets a locale be released while another thread converts.
    static bool initialize();

    /// Compares unit by unit up to the terminator: 0 when equal, -1 when `a` is the beginning of
    /// `b`, 1 the other way round, else the difference of the first two units that differ.
    static int compare(const String& a, const String& b);
    static int compare(const unsigned short* a, const unsigned short* b);
    /// `str` with every `what` in it replaced by `with`.
    static String replace(const String& str, const String& what, const String& with);
    /// The decimal number that `s` is as a whole, blanks before it allowed; an empty text is 0. On
    /// failure `*out` is 0: not a number, not within 32 bits, or one of the two extreme values.
    static bool convertToInt(const String& s, int* out);
    static bool isWhiteSpace(unsigned short ch);

    /// New 0-terminated units from text in the local code page; null for a null pointer. The caller
    /// frees them with releaseUnicodeString.
    static unsigned short* createUnicodeString(const char* text);
    static unsigned short* createUnicodeString(const char* text, std::uint32_t n);
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

/// Writes ASCII as it is and every other unit, 0 included, as "\x" and four hexadecimal digits.
std::ostream& operator<<(std::ostream& out, const String& text);

}  // namespace ZAV

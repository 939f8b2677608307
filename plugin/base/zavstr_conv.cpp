// String: conversion from and to the process's code page, and the functions that depend on it.

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string>

#include "base/zavstr.h"
#include "base/zavtrace.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavstr"};

/// Held while a thread opens the locale. Never destroyed, because texts are converted until the
/// process has exited.
std::mutex& localeMutex() {
    static std::mutex& mutex = *new std::mutex;
    return mutex;
}

/// The number of bytes of `text`, including its terminator.
std::uint32_t countBytes(const char* text) {
    const std::size_t count = std::strlen(text) + 1;
    if (count > UINT32_MAX) throwArrayTooLong();
    return static_cast<std::uint32_t>(count);
}

/// Converts `n` bytes, including the terminator, to at most `n` units. Returns the number of units
/// before the terminator. The result is always terminated, whatever the conversion left.
std::uint32_t convertToUnits(NLS2_LOCALE* locale, const char* text, std::uint32_t n,
                             unsigned short* out) {
    int status = NLS2_OK;
    std::uint32_t written = std::min(NLS2_toUTF16(locale, text, n, out, n, &status), n);
    if (written == n || (written > 0 && out[written - 1] == 0)) --written;
    out[written] = 0;
    return written;
}

}  // namespace

std::atomic<bool> String::_initialized{false};
std::atomic<NLS2_LOCALE*> String::_locale{nullptr};

CharStar::CharStar(const char* text) : text_(nullptr) {
    if (text == nullptr) return;
    const std::size_t count = std::strlen(text) + 1;
    text_ = new char[count];
    std::memcpy(text_, text, count);
}

CharStar::CharStar(const CharStar& other) : CharStar(other.text_) {}

CharStar& CharStar::operator=(const CharStar& other) {
    if (this != &other) *this = CharStar(other);
    return *this;
}

CharStar& CharStar::operator=(CharStar&& other) noexcept {
    std::swap(text_, other.text_);
    return *this;
}

bool String::initialize() {
    const std::lock_guard<std::mutex> lock(localeMutex());
    return initializeLocked();
}

bool String::initializeLocked() {
    Trace trace(traceUnit, "initialize");
    int status = NLS2_OK;
    if (NLS2_LOCALE* const held = _locale.exchange(nullptr)) NLS2_ReleaseLocale(held);
    NLS2_LOCALE* locale = NLS2_GetLocale(NLS2_BY_DEFAULT, 0, 0, &status);
    const int codepage = NLS2_GetLocaleCodepageId(locale, &status);
    trace().detail("codepage=%d", codepage);
    // Two code pages are replaced by their supersets. The locale opened first is not released, on
    // purpose.
    if (codepage == NLS2_CP943) {
        trace().detail("codepage NLS2_CP943 detected, switching to NLS2_CP932");
        locale = NLS2_GetLocale(NLS2_BY_CODEPAGE, NLS2_CP932, 0, &status);
    } else if (codepage == NLS2_CP_EUC_JP) {
        trace().detail("codepage 33722 detected, switching to 1208");
        locale = NLS2_GetLocale(NLS2_BY_CODEPAGE, NLS2_CP_UTF8, 0, &status);
    }
    _locale.store(locale);
    return trace.exit(locale != nullptr);
}

/// The locale for conversions. The first thread that asks opens it. Returns null when there is
/// none; the next conversion then tries again.
NLS2_LOCALE* String::localeForConversion() {
    if (!_initialized.load(std::memory_order_acquire)) {
        const std::lock_guard<std::mutex> lock(localeMutex());
        if (!_initialized.load(std::memory_order_relaxed)) _initialized.store(initializeLocked());
    }
    return _locale.load(std::memory_order_acquire);
}

String::String(const char* text) : units_(text != nullptr ? countBytes(text) : 1) {
    const Trace trace(traceUnit);
    if (text == nullptr) {
        units_.getData()[0] = 0;
    } else {
        convertFrom(text);
    }
}

String::String(const char* text, std::uint32_t n) : String() {
    assign(text, n);
}

/// Fills an array that has as many elements as the text has bytes with its terminator.
void String::convertFrom(const char* text) {
    const std::uint32_t n = units_.getSize();
    const std::uint32_t count = convertToUnits(localeForConversion(), text, n, units_.getData());
    units_.remove(count + 1, n - count - 1);
}

String& String::assign(const char* text) {
    return *this = String(text);
}

String& String::assign(const char* text, std::uint32_t n) {
    const Trace trace(traceUnit);
    if (text == nullptr) return assign(text);
    return assign(std::string(text, ::strnlen(text, n)).c_str());
}

CharStar String::c_str() const {
    const Trace trace(traceUnit);
    // Room for one byte per unit, so a text that needs more is truncated. One more byte holds the
    // terminator when the text fills all of that.
    const std::uint32_t n = units_.getSize();
    std::unique_ptr<char[]> buffer(new char[std::size_t{n} + 1]);
    int status = NLS2_OK;
    const std::uint32_t written =
        NLS2_fromUTF16(localeForConversion(), units_.getData(), n, buffer.get(), n, &status);
    buffer[std::min(written, n)] = '\0';
    return CharStar(std::move(buffer));
}

unsigned short* String::createUnicodeString(const char* text) {
    const Trace trace(traceUnit);
    if (text == nullptr) return nullptr;
    const std::uint32_t n = countBytes(text);
    std::unique_ptr<unsigned short[]> buffer(new unsigned short[n]);
    convertToUnits(localeForConversion(), text, n, buffer.get());
    return buffer.release();
}

void String::convertToUnicode(const char* text, unsigned short* out) {
    const Trace trace(traceUnit, "createUnicodeString");
    convertToUnits(localeForConversion(), text, countBytes(text), out);
}

unsigned short* String::createUnicodeString(const char* text, std::uint32_t n) {
    const Trace trace(traceUnit);
    if (text == nullptr) return nullptr;
    return createUnicodeString(std::string(text, ::strnlen(text, n)).c_str());
}

unsigned short* String::copyUnicodeString(const unsigned short* units) {
    const Trace trace(traceUnit);
    if (units == nullptr) return nullptr;
    std::size_t count = 1;
    while (units[count - 1] != 0)
        ++count;
    auto* const copy = new unsigned short[count];
    std::memcpy(copy, units, count * sizeof *units);
    return copy;
}

void String::releaseUnicodeString(unsigned short* units) {
    delete[] units;
}

bool String::convertToInt(const String& s, int* out) {
    Trace trace(traceUnit);
    *out = 0;
    errno = 0;
    const CharStar text = s.c_str();
    const char* const digits = text;
    char* end = nullptr;
    const long value = std::strtol(digits, &end, 10);
    if (*end != '\0') {
        trace().error("Can't convert, buffer is not number: %s", digits);
        return trace.exit(false);
    }
    // Refuses both extremes, because strtol also returns them for numbers that are out of range.
    if (value >= INT_MAX || value <= INT_MIN) {
        trace().error("Can't convert, number is too large: %s", digits);
        return trace.exit(false);
    }
    *out = static_cast<int>(value);
    return trace.exit(true);
}

}  // namespace ZAV

#include "base/zavtrace.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string_view>

namespace ZAV {
namespace {

constexpr const char* kFlags = "-+ #0";
constexpr const char* kDigits = "0123456789";
constexpr const char* kLengths = "hljztL";
constexpr const char* kConversions = "diuxXocsp";

/// Returns the conversion that begins at the "%" at `format`, without its length modifiers; empty
/// when it is not one of printf's. Sets `end` to the position after it.
std::string conversionAt(const char* format, const char*& end) {
    const char* at = format + 1;
    at += std::strspn(at, kFlags);
    at += std::strspn(at, kDigits);
    if (*at == '.') {
        ++at;
        at += std::strspn(at, kDigits);
    }
    const std::string head(format, at);
    at += std::strspn(at, kLengths);
    if (*at == '\0' || std::strchr(kConversions, *at) == nullptr) return {};
    end = at + 1;
    return head + *at;
}

template <typename T>
void appendFormatted(const std::string& conversion, T value, std::string& out) {
    char buffer[64];
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
    // The caller has built the conversion for exactly this type.
    const int length = std::snprintf(buffer, sizeof buffer, conversion.c_str(), value);
#pragma GCC diagnostic pop
    if (length > 0) {
        out.append(buffer, std::min(static_cast<std::size_t>(length), sizeof buffer - 1));
    }
}

std::size_t numberAt(const std::string& conversion, std::size_t at) {
    return static_cast<std::size_t>(std::strtoul(conversion.c_str() + at, nullptr, 10));
}

/// Appends a text like "%s" with the given width and precision. The text need not be terminated
/// when it is as long as the precision.
void appendText(const std::string& conversion, const char* text, std::string& out) {
    const std::size_t flagsEnd = conversion.find_first_not_of(kFlags, 1);
    const bool leftAligned = conversion.find('-') < flagsEnd;
    const std::size_t width = numberAt(conversion, flagsEnd);
    const std::size_t dot = conversion.find('.');
    const std::size_t length = dot == std::string::npos
                                   ? std::strlen(text)
                                   : ::strnlen(text, numberAt(conversion, dot + 1));
    const std::size_t padding = width > length ? width - length : 0;
    if (!leftAligned) out.append(padding, ' ');
    out.append(text, length);
    if (leftAligned) out.append(padding, ' ');
}

}  // namespace

void TraceArgument::formatText(const std::string& conversion, std::string& out) const {
    if (kind_ == Kind::Wide) {
        appendText(conversion, localText(*static_cast<const String*>(pointer_)).c_str(), out);
    } else {
        const char* const text = static_cast<const char*>(pointer_);
        appendText(conversion, text != nullptr ? text : "(null)", out);
    }
}

void TraceArgument::format(const std::string& conversion, std::string& out) const {
    const char letter = conversion.back();
    const std::string head = conversion.substr(0, conversion.size() - 1);
    const bool isNumber = kind_ == Kind::Signed || kind_ == Kind::Unsigned;
    if (isNumber && letter == 'c') {
        out += static_cast<char>(number_);
    } else if (isNumber && (letter == 's' || letter == 'p')) {
        out += kind_ == Kind::Signed ? std::to_string(number_)
                                     : std::to_string(static_cast<unsigned long long>(number_));
    } else if (isNumber && (letter == 'd' || letter == 'i')) {
        appendFormatted(head + "lld", number_, out);
    } else if (isNumber) {
        // A negative int is printed in hexadecimal as 32 bits, not as 64.
        const long long value = kind_ == Kind::Signed && number_ < 0 && number_ >= INT32_MIN
                                    ? static_cast<long long>(static_cast<std::uint32_t>(number_))
                                    : number_;
        appendFormatted(head + "ll" + letter, static_cast<unsigned long long>(value), out);
    } else if (kind_ == Kind::Pointer || letter == 'p') {
        appendFormatted("%p", pointer_, out);
    } else {
        formatText(conversion, out);
    }
}

bool TraceArgument::formatPlain(char letter, std::string& out) const {
    if (letter == 'd' && kind_ == Kind::Signed) {
        char digits[24];
        const auto [end, error] = std::to_chars(digits, digits + sizeof digits, number_);
        out.append(digits, end);
        return true;
    }
    if (letter == 's' && kind_ == Kind::Wide) {
        out += localText(*static_cast<const String*>(pointer_));
        return true;
    }
    if (letter == 's' && kind_ == Kind::Text) {
        const char* const text = static_cast<const char*>(pointer_);
        out += text != nullptr ? text : "(null)";
        return true;
    }
    return false;
}

std::string formatTrace(const char* format, std::initializer_list<TraceArgument> arguments) {
    std::string out;
    const TraceArgument* next = arguments.begin();
    for (const char* at = format; *at != '\0';) {
        if (*at != '%') {
            const std::size_t run = std::strcspn(at, "%");
            out.append(at, run);
            at += run;
            continue;
        }
        if (next != arguments.end() && next->formatPlain(at[1], out)) {
            ++next;
            at += 2;
            continue;
        }
        const char* end = nullptr;
        const std::string conversion = conversionAt(at, end);
        if (at[1] == '%') {
            out += '%';
            at += 2;
        } else if (conversion.empty() || next == arguments.end()) {
            out += *at++;
        } else {
            (next++)->format(conversion, out);
            at = end;
        }
    }
    return out;
}

void Trace::Place::write(unsigned level, const char* format,
                         std::initializer_list<TraceArgument> arguments) const noexcept {
    const int savedErrno = errno;
    try {
        const std::string text = formatTrace(format, arguments);
        RAS1_Printf(&trace_.block_, level, line_, "%s", text.c_str());
    } catch (...) {
        RAS1_Printf(&trace_.block_, level, line_, "%s", format);
    }
    errno = savedErrno;
}

void Trace::writeExit() const {
    if (hasResult_) {
        RAS1_ExitValue(&block_, line_, result_);
    } else {
        RAS1_Exit(&block_, line_);
    }
}

}  // namespace ZAV

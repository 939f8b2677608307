/// Fixed-width fields of rows, as texts.
#pragma once

#include <string>

/// The field's bytes, all of them.
template <std::size_t Size>
std::string fieldText(const char (&field)[Size]) {
    return std::string(field, Size);
}

/// `text` with the blanks behind it that fill a field of `width` bytes.
inline std::string padded(std::string text, std::size_t width) {
    text.resize(width, ' ');
    return text;
}

/// The field without the blanks behind its text.
template <std::size_t Size>
std::string trimmedField(const char (&field)[Size]) {
    const std::string text(field, Size);
    return text.substr(0, text.find_last_not_of(' ') + 1);
}

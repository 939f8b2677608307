/// Texts to work on.
#pragma once

#include <string>

#include "base/zavstr.h"

/// English text of exactly `size` characters, all of them ASCII.
inline std::string narrowText(std::size_t size) {
    std::string text;
    while (text.size() < size)
        text += "The quick brown fox, 0123456789 ";
    text.resize(size);
    return text;
}

/// The same as a String.
inline ZAV::String ownText(std::size_t size) {
    return ZAV::String(narrowText(size).c_str());
}

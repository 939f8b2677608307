/// Shorthand between ZAV::String and the texts of tests.
#pragma once

#include <string>
#include <vector>

#include "base/zavstr.h"

using Units = std::vector<unsigned short>;

/// The units of a text without its terminator.
inline Units unitsOf(const ZAV::String& text) {
    return Units(text.getData(), text.getData() + text.length());
}

/// A text of these units, 0 allowed among them.
inline ZAV::String fromUnits(const Units& units) {
    ZAV::String text;
    text.assign(units.data(), static_cast<unsigned>(units.size()));
    return text;
}

/// A text of that many equal characters.
inline ZAV::String repeated(unsigned count, unsigned short unit) {
    return fromUnits(Units(count, unit));
}

inline std::string narrow(const ZAV::String& text) {
    return std::string(static_cast<const char*>(text.c_str()));
}

/// Whether the one terminator stands where it must.
inline bool isTerminated(const ZAV::String& text) {
    return text.getData()[text.length()] == 0 && text[text.length()] == 0;
}

#pragma once

#include <cstdint>

#include "base/unit_set.h"
#include "base/zavstr.h"

/// Splits a text at delimiter characters; runs of them count as one, and those at the ends as none.
/// Without delimiters, every operation on a text that is not empty throws
/// ZAV::IndexOutOfBoundsException. One thread at a time.
class StringTokenizer {
public:
    explicit StringTokenizer(ZAV::String text);
    /// Each character of `delimiters` is one.
    StringTokenizer(ZAV::String text, ZAV::String delimiters);

    /// Whether nextToken has something to return.
    bool hasMoreTokens() const;
    /// How many tokens are still to come; the position stays.
    int countTokens() const;
    /// The next token; throws ZAV::IndexOutOfBoundsException when there is none.
    ZAV::String nextToken();

private:
    bool isAtToken() const;
    std::uint32_t skipDelimiters(std::uint32_t p) const;
    std::uint32_t readToken(std::uint32_t p) const;

    ZAV::String text;
    ZAV::String delimiters;
    ZAV::UnitSet delimiterSet;
    std::uint32_t position;  // of the next token, or the length when there is none
};

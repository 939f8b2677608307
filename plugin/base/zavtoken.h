#pragma once

#include <cstdint>

#include "base/unit_set.h"
#include "base/zavstr.h"

/// Splits a text at delimiter characters. A run of delimiters counts as one; those at either end
/// are ignored. When `delimiters` is empty, every operation on a text that is not empty throws
/// ZAV::IndexOutOfBoundsException. One thread at a time.
class StringTokenizer {
public:
    explicit StringTokenizer(ZAV::String text);
    /// Each character of `delimiters` is one.
    StringTokenizer(ZAV::String text, ZAV::String delimiters);

    /// Whether nextToken has something to return.
    bool hasMoreTokens() const;
    /// The number of tokens that are left. Does not move on.
    int countTokens() const;
    /// Returns the next token. Throws ZAV::IndexOutOfBoundsException when there is none.
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

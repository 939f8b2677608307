#include "base/zavtoken.h"

#include <utility>

#include "base/zavtrace.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtoken"};

}  // namespace

StringTokenizer::StringTokenizer(String textToSplit)
    : StringTokenizer(std::move(textToSplit), String()) {}

StringTokenizer::StringTokenizer(String textToSplit, String delimiterCharacters)
    : text(std::move(textToSplit)),
      delimiters(std::move(delimiterCharacters)),
      delimiterSet(delimiters.getData(), delimiters.length()),
      position(skipDelimiters(0)) {}

/// The first index at or after `p` that holds no delimiter, or the length.
inline std::uint32_t StringTokenizer::skipDelimiters(std::uint32_t p) const {
    const unsigned short* const units = text.getData();
    return static_cast<std::uint32_t>(delimiterSet.findOther(units + p, units + text.length()) -
                                      units);
}

/// The end of the token at `p`.
inline std::uint32_t StringTokenizer::readToken(std::uint32_t p) const {
    const unsigned short* const units = text.getData();
    return static_cast<std::uint32_t>(delimiterSet.findMember(units + p, units + text.length()) -
                                      units);
}

/// Whether there is a token at the position. Throws when there are no delimiters, like a search in
/// an empty text.
inline bool StringTokenizer::isAtToken() const {
    if (position >= text.length()) return false;
    if (delimiters.length() == 0) delimiters.find(text.getData()[position], 0);
    return true;
}

bool StringTokenizer::hasMoreTokens() const {
    Trace trace(traceUnit);
    return trace.exit(isAtToken());
}

int StringTokenizer::countTokens() const {
    Trace trace(traceUnit);
    int count = 0;
    if (isAtToken()) {
        for (std::uint32_t p = position; p < text.length(); p = skipDelimiters(readToken(p)))
            ++count;
    }
    return trace.exit(count);
}

String StringTokenizer::nextToken() {
    const Trace trace(traceUnit);
    // Without a token the length is 0, and substr throws.
    const std::uint32_t start = position;
    const std::uint32_t end = isAtToken() ? readToken(start) : start;
    position = skipDelimiters(end);
    return text.substr(start, end - start);
}

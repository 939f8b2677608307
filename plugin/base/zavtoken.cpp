#include "base/zavtoken.h"

#include <algorithm>
#include <utility>

#include "base/zavtrace.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtoken"};

std::uint32_t index(int p) {
    return static_cast<std::uint32_t>(p);
}

}  // namespace

StringTokenizer::StringTokenizer(String textToSplit) : text(std::move(textToSplit)) {}

StringTokenizer::StringTokenizer(String textToSplit, String delimiterCharacters)
    : text(std::move(textToSplit)), delimiters(std::move(delimiterCharacters)) {}

bool StringTokenizer::isDelimiterAt(int p) const {
    const unsigned short unit = text[index(p)];
    // String::find is what throws without delimiters; a trace block for each character of the text
    // would cost more than all the rest.
    if (delimiters.length() == 0) return delimiters.find(unit, 0) != String::NPOS;
    const unsigned short* const first = delimiters.getData();
    const unsigned short* const end = first + delimiters.length();
    return std::find(first, end, unit) != end;
}

int StringTokenizer::skipDelimiters(int p) const {
    while (index(p) < text.length() && isDelimiterAt(p))
        ++p;
    return p;
}

int StringTokenizer::readToken(int p) const {
    while (index(p) < text.length() && !isDelimiterAt(p))
        ++p;
    return p;
}

bool StringTokenizer::hasMoreTokens() const {
    Trace trace(traceUnit);
    return trace.exit(index(skipDelimiters(position)) < text.length());
}

int StringTokenizer::countTokens() const {
    Trace trace(traceUnit);
    int count = 0;
    for (int p = skipDelimiters(position); index(p) < text.length(); p = skipDelimiters(p)) {
        p = readToken(p);
        ++count;
    }
    return trace.exit(count);
}

String StringTokenizer::nextToken() {
    const Trace trace(traceUnit);
    const int start = skipDelimiters(position);
    position = readToken(start);
    return text.substr(index(start), index(position - start));
}

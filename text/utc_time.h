/// Times as RFC 3339 writes them, in UTC.
#pragma once

#include <chrono>
#include <string>

namespace text {

/// With milliseconds: "2025-01-31T12:00:00.000Z". The count is from the beginning of 1970. A time
/// before the year 0 or after 9999, which have no form, is the first or the last one that has.
std::string utcTime(std::chrono::milliseconds sinceEpoch);
std::string utcTime(std::chrono::system_clock::time_point time);

}  // namespace text

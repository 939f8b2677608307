/// Times as RFC 3339 writes them, in UTC.
#pragma once

#include <chrono>
#include <string>

namespace text {

/// With milliseconds: "2025-01-31T12:00:00.000Z".
std::string utcTime(std::chrono::system_clock::time_point time);

}  // namespace text

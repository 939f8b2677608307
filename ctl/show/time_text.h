/// Times as people read them.
#pragma once

#include <chrono>
#include <optional>
#include <string>

namespace ctl {

using WallTime = std::chrono::system_clock::time_point;

/// A time such as "2026-03-01T12:30:00.250Z"; nothing for any other text.
std::optional<WallTime> parseTime(const std::string& text);

/// "5 s", "2 min", "3 h" or "4 days": the largest unit of which there is at least one. Nothing is
/// negative: clocks differ a little.
std::string spanText(std::chrono::seconds span);

/// Such a time on the local clock and as seen from `now`: "13:30:00, 5 s ago", with the date if it
/// is another day's. A text that is no time is given back with its control characters shown.
std::string timeText(const std::string& text, WallTime now);

}  // namespace ctl

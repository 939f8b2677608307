/// How times and lists are written on the command line.
#pragma once

#include <chrono>
#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// "90s", "10m", "1h", "30d". Throws KeysError; what is too long for anything is an error, too.
std::chrono::milliseconds durationOf(const std::string& text);

/// A number of days, at least one and at most 36500. Throws KeysError.
std::chrono::milliseconds daysOf(long long days);

/// "2026-01-31 23:59 UTC".
std::string textOfMoment(Moment moment);

/// "a,b"; "-" if there are none.
std::string joined(const std::vector<std::string>& texts);

}  // namespace fleet

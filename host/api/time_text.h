/// Reading times as RFC 3339 writes them, in UTC.
#pragma once

#include <string>

#include "host/commands/command.h"

namespace host {

/// The time that the text says, with or without a fraction of a second. One that the clock cannot
/// hold, such as one in the year 9999, is the nearest that it can. Throws routes::BadRequest.
WallClock::time_point timeOf(const std::string& text);

}  // namespace host

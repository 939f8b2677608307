/// Why an order ended as it did, in one line.
#pragma once

#include <string>

#include "fleet/bus/messages/outcome.h"

namespace fleet {

/// What the host's document of the task says: its reason, or the return code and the message of its
/// last event. At most 300 bytes of UTF-8 without control characters; "" if it says nothing. The
/// document comes from the host and may hold anything.
std::string shortReason(const Outcome& outcome);

}  // namespace fleet

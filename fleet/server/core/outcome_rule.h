/// Which of two outcomes of an order counts.
#pragma once

#include <optional>

#include "fleet/bus/messages/outcome.h"

namespace fleet {

enum class OutcomeVerdict {
    Keep,     ///< it is the first, or more than was known
    Ignore,   ///< it says nothing new
    Conflict  ///< a host that tells two stories
};

/// The first real outcome stays. "unknown" gives way to it whenever it comes.
OutcomeVerdict judgeOutcome(const std::optional<Outcome>& known, const Outcome& told);

}  // namespace fleet

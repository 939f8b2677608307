/// What the statuses of the centre's errors mean.
#pragma once

#include <vector>

#include "routes/description/description.h"

namespace fleet {

/// In the order of their numbers.
const std::vector<routes::StatusMeaning>& centreStatusMeanings();

}  // namespace fleet

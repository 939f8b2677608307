/// What the statuses of errors mean.
#pragma once

#include <vector>

#include "routes/description/description.h"

namespace host {

using routes::StatusMeaning;

/// In the order of their numbers.
const std::vector<StatusMeaning>& statusMeanings();

}  // namespace host

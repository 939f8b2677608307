/// The description of the centre's interface for machines.
#pragma once

#include <string>
#include <vector>

#include "fleet/server/api/visit.h"

namespace fleet {

/// As routes::describe() makes it.
std::string describe(const std::vector<ApiRoute>& routes);

}  // namespace fleet

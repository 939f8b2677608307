/// All requests of the centre's interface.
#pragma once

#include <vector>

#include "fleet/server/api/visit.h"

namespace fleet {

std::vector<ApiRoute> apiRoutes();

}  // namespace fleet

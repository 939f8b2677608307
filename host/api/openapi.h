/// The description of the host's interface for machines.
#pragma once

#include <string>
#include <vector>

#include "host/api/route.h"

namespace host {

/// As routes::describe() makes it.
std::string describe(const std::vector<Route>& routes);

}  // namespace host

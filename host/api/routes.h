/// The route table: every request that the host answers.
#pragma once

#include <vector>

#include "host/api/route.h"

namespace host {

std::vector<Route> routes();

}  // namespace host

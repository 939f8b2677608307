/// Whose a roll-out is.
#pragma once

#include <string>

#include "fleet/server/api/visit.h"

namespace fleet {

/// Throws Forbidden if the roll-out is another operator's and the visitor no admin. One that does
/// not exist is nobody's.
void insistOnOwn(const Visit& visit, const std::string& id);

}  // namespace fleet

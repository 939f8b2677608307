/// How an operator's key is listed.
#pragma once

#include <string>

#include "fleet/server/keys/trust/operators.h"

namespace fleet {

/// One line: all that a certificate says or would say, and the state.
std::string lineOf(const OperatorKey& key);

}  // namespace fleet

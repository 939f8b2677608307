/// whoami: who one is to the centre.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"

namespace fleet {

/// The answer of /v1/whoami. Throws ctl::Failure if it is not one.
ctl::Page showOperator(const nlohmann::json& answer, ctl::Format format);

}  // namespace fleet

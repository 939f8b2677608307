/// doctor: what the host's checks of its home and machine find.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"

namespace ctl {

/// A line for each check in the host's document: the result, the check's name, what was found and
/// the remedy. The status says whether there was an error. Throws Failure when the document is not
/// a list of checks.
Page showChecks(const nlohmann::json& checks, Format format);

}  // namespace ctl

/// Verbs that are for one host only, and what does the same for a fleet.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "ctl/client/failure.h"

namespace fleet {

/// What to say of a command line for a fleet whose verb is for one host only: why not, and the way
/// instead. Nothing for all other lines, also for those with verbs that nobody knows.
std::optional<ctl::Failure> refusalOfOneHostsVerb(const std::vector<std::string>& words);

}  // namespace fleet

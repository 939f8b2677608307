/// What a host has told about itself, as a document.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "fleet/server/store/host_facts.h"

namespace fleet {

/// An inventory has its age in seconds, by whichever clock makes it older: the host's may be wrong,
/// and nothing shall look newer than it is.
nlohmann::json factsDocument(const KeptFacts& kept, Moment now);

}  // namespace fleet

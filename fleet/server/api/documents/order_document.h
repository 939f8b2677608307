/// An order as operators see it.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "fleet/server/core/records.h"
#include "fleet/server/keys/directory/fleet_facts.h"

namespace fleet {

/// What the centre has of the order, and what its operator has signed, as far as it can be read.
nlohmann::json orderDocument(const OrderRecord& record, const FleetFacts& facts);

}  // namespace fleet

/// Makes all keys of a new fleet.
#pragma once

#include "fleet/server/keys/setup/fleet_plan.h"

namespace fleet {

/// Makes the offline root, the centre's directory, and the bus's directory with the configuration
/// of its server. Refuses when the root's file, a file in the centre's directory or one in the
/// bus's is there already: nothing that counts is ever overwritten. Throws KeysError; before
/// anything was made unless a disk fails. What is made last are the facts, without which the
/// directory is not taken for one.
void makeFleet(const FleetPlan& plan);

}  // namespace fleet

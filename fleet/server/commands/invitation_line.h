/// The line that invites somebody into the fleet.
#pragma once

#include <string>

#include "fleet/server/keys/directory/fleet_directory.h"

namespace fleet {

/// With the token, for one who knows nothing of the fleet yet. Throws KeysError.
std::string invitationLine(const FleetDirectory& directory, const std::string& token);

}  // namespace fleet

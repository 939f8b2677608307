/// Hosts that join a fleet all at once.
#pragma once

#include <string>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/link/program/link_configuration.h"
#include "fleet/server/keys/directory/fleet_directory.h"

namespace fleet_scale {

/// What a host has after its enrolment.
struct SimulatedMember {
    fleet::KeyPair bus;
    fleet::KeyPair signing;
    std::string token;  ///< of the bus
    fleet::LinkConfiguration configuration;
};

/// Invites so many hosts and has each join by what the centre's interface calls, in one transaction
/// in the place of two for each. The centre learns of them at its next start. They have the label
/// env=test, and share `state` for what they do not keep.
std::vector<SimulatedMember> enrolSimulated(const fleet::FleetDirectory& directory,
                                            std::size_t count, const std::string& state);

}  // namespace fleet_scale

/// What the running centre tells the bus's servers of accounts.
#pragma once

#include <string>
#include <vector>

#include "fleet/server/keys/directory/bus_keys.h"
#include "fleet/server/keys/directory/fleet_facts.h"

namespace fleet {

/// The tokens of all accounts with everybody whose key counts no longer: hosts that were revoked,
/// and the centre's own earlier users. For updateAccount() at the centre's start and after each
/// revocation; signed by bus.accountSigner, and issued in a later second than those before.
std::vector<std::string> accountTokens(const FleetFacts& facts, const BusKeys& bus,
                                       const Revocations& revokedHosts, TokenTime issuedAt);

}  // namespace fleet

/// What everybody may know of a fleet.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/accounts/fleet_accounts.h"

namespace fleet {

struct FleetFacts {
    std::string fleet;        ///< its name
    std::string root;         ///< the public key that certifies the centre and the operators
    std::string busOperator;  ///< the public key that answers for the bus's accounts
    AccountKeys accounts;     ///< of the bus
    std::string url;          ///< the centre's, by HTTPS, without a "/" at its end
    std::vector<std::string> busUrls;
    std::vector<std::string> names;  ///< of the servers; the first is a DNS name
    std::string busDirectory;        ///< where the bus's server has its files
    /// What the root has certified of the centre's keys, the newest first. Links take numbers and
    /// replies by each of them until it ends: orders that an older key has numbered still wait for
    /// their hosts when a newer one is there.
    std::vector<std::string> centres;
};

std::string textOfFacts(const FleetFacts& facts);
/// Throws KeysError, which says what is wrong.
FleetFacts readFacts(std::string_view text);

}  // namespace fleet

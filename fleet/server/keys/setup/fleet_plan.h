/// What an administrator chooses for a new fleet.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"

namespace fleet {

struct FleetPlan {
    std::string fleet;      ///< its name: at most 40 letters, digits, "-", "_" and "."
    std::string directory;  ///< of the centre's configuration
    std::string rootFile;   ///< where the offline root goes; not below the directory
    /// By which the servers of the bus and the centre are reached: DNS names, the first one in any
    /// case, and IP addresses.
    std::vector<std::string> names;
    std::vector<std::string> busUrls;  ///< "nats://HOST:PORT"; none: the first name and port 4222
    std::string url;                   ///< "https://HOST[:PORT]"; "": the first name and port 8443
    std::string busDirectory;  ///< where the bus's server has its files; "": "bus" in the directory
    std::optional<std::uint64_t>
        storeBytes;  ///< what the bus may store; none: 80 % of what is free
    Moment now{};
    Moment until{};           ///< when the centre's and the servers' certificates end
    Moment authorityUntil{};  ///< when that of the TLS authority does
};

/// The plan with all that was left out filled in. Throws KeysError, which says what cannot be.
FleetPlan completed(FleetPlan plan);

/// Throws KeysError if the root's file would be in the centre's directory, whatever links lead
/// there.
void insistOnRootApart(const FleetPlan& plan);

/// The port of a URL of the bus.
std::string portOfBus(const std::string& url);

}  // namespace fleet

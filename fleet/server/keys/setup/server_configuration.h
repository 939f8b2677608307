/// The configuration of the bus's server.
#pragma once

#include <cstdint>
#include <string>

#include "fleet/bus/accounts/fleet_accounts.h"

namespace fleet {

struct ServerConfiguration {
    std::string directory;  ///< absolute; where the server has its files
    std::string port;
    std::uint64_t storeBytes = 0;  ///< the most that it may store
};

/// The name of its certificate with the key, in the directory.
constexpr const char* kBusServerFile = "server.pem";

/// The text for nats-server.
std::string textOf(const ServerConfiguration& configuration, const FleetKeys& keys,
                   TokenTime issuedAt);

/// Four fifths of what is free where the directory is or will be: a server whose disk is full does
/// not go on until it is killed. Throws KeysError.
std::uint64_t storeBytesFor(const std::string& directory);

}  // namespace fleet

/// Gives the centre new keys.
#pragma once

#include "fleet/bus/messages/values.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/directory/root_file.h"

namespace fleet {

/// A new signing key with a certificate, new users of the bus, and a new certificate for TLS. The
/// running centre goes on with what it has read; one that is started afterwards uses the new keys
/// and has the earlier users of the bus refused. The earlier signing key stays certified, up to its
/// own end: orders that it has numbered wait for hosts that are away.
///
/// The bus's server gets its new certificate too if its directory is here; it reads it at its next
/// reload. Returns whether it is. Killed at any point the directory is of use: either key has its
/// certificate. Throws KeysError; if the root is not this fleet's, before anything was changed.
bool rotateKeys(const FleetDirectory& directory, const RootKeys& keys, Moment now, Moment until);

/// Throws KeysError if the root is not this fleet's.
void insistOnRootOf(const FleetFacts& facts, const RootKeys& keys);

}  // namespace fleet

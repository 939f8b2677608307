/// Keys and certificates that will end.
#pragma once

#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "sqlite/database.h"

namespace fleet {

struct Ending {
    std::string what;  ///< for people
    std::string help;  ///< what is to be done about it
    Moment until{};    ///< it may be over already
};

/// How long before the end an administrator is warned.
constexpr Moment kWarnedBefore = std::chrono::hours(24 * 30);

/// What ends within kWarnedBefore or has ended, the most urgent first: the certificate of the
/// centre's key, those for TLS, and the operators'. An operator who has a key that lasts longer is
/// not among them, nor one that has been over for as long. Throws KeysError and
/// sqlite::DatabaseError.
std::vector<Ending> endingsOf(const FleetDirectory& directory, sqlite::Database& trust, Moment now);

}  // namespace fleet

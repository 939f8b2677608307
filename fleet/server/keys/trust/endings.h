/// Keys and certificates that will end.
#pragma once

#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "sqlite/database.h"

namespace fleet {

struct Ending {
    enum class Of { Centre, Server, Authority, Operator };
    std::string what;  ///< for people
    std::string help;  ///< what is to be done about it
    Moment until{};    ///< it may be over already
    Of of = Of::Centre;
};

/// How long before the end an administrator is warned.
constexpr Moment kWarnedBefore = std::chrono::hours(24 * 30);

/// What has an end at all, the most urgent first: the certificate of the centre's key, those for
/// TLS, and the latest ones of the operators, but for those that have been over for kWarnedBefore.
/// Throws KeysError and sqlite::DatabaseError.
std::vector<Ending> allEndingsOf(const FleetDirectory& directory, sqlite::Database& trust,
                                 Moment now);

/// Of those, what ends within kWarnedBefore or has ended.
std::vector<Ending> endingsOf(const FleetDirectory& directory, sqlite::Database& trust, Moment now);

}  // namespace fleet

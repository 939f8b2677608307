#include <CLI/CLI.hpp>
#include <ostream>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/commands/texts.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/trust/revocations.h"
#include "fleet/server/keys/trust/trust_database.h"

namespace fleet {

Action declareRevokeList(CLI::App&) {
    return [](Surroundings& around) {
        TrustDatabase trust(FleetDirectory(around.directory).trustDatabase());
        for (const RevokedKey& revoked : RevokedKeys(trust.connection()).all()) {
            around.out << (revoked.kind == RevokedKey::Kind::Host ? "host" : "operator") << "  "
                       << (revoked.name.empty() ? "-" : revoked.name) << "  " << revoked.key
                       << "  since " << textOfMoment(revoked.since) << '\n';
        }
        return kDone;
    };
}

}  // namespace fleet

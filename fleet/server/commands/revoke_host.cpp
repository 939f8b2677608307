#include <CLI/CLI.hpp>
#include <memory>
#include <ostream>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/trust/revocations.h"
#include "fleet/server/keys/trust/trust_database.h"

namespace fleet {

Action declareRevokeHost(CLI::App& app) {
    const auto who = std::make_shared<std::string>();
    app.add_option("NAME", *who, "The host's name, or one key")->required();
    return [who](Surroundings& around) {
        TrustDatabase trust(FleetDirectory(around.directory).trustDatabase());
        for (const std::string& key : RevokedKeys(trust.connection()).revokeHost(*who, around.now))
            around.out << key << '\n';
        return kDone;
    };
}

}  // namespace fleet

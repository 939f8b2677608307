#include <CLI/CLI.hpp>
#include <memory>
#include <ostream>
#include <string>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/trust/trust_database.h"
#include "fleet/server/store/centre_database.h"

namespace fleet {
namespace {

int backUp(const std::string& folder, Surroundings& around) {
    const FleetDirectory directory(around.directory);
    // Orders first: a revocation that is in neither copy is better done again than forgotten.
    backUpCentre(directory.orders(), folder + "/orders.db");
    TrustDatabase(directory.trustDatabase()).backup(folder + "/trust.db");
    around.out << "copied to " << folder << "/orders.db and trust.db\n";
    around.err << "The keys in " << around.directory
               << " are files that change with a rotation only: keep a copy of those, too.\n";
    return kDone;
}

}  // namespace

Action declareBackup(CLI::App& app) {
    const auto folder = std::make_shared<std::string>();
    app.add_option("FOLDER", *folder, "Where the copies go, which replace older ones there")
        ->required()
        ->check(CLI::ExistingDirectory);
    return [folder](Surroundings& around) { return backUp(*folder, around); };
}

}  // namespace fleet

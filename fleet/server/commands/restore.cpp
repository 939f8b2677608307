#include <CLI/CLI.hpp>
#include <memory>
#include <ostream>
#include <string>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/store/centre_database.h"

namespace fleet {
namespace {

int restore(const std::string& copy, Surroundings& around) {
    putBackCentre(FleetDirectory(around.directory).orders(), copy);
    around.out << "put back " << copy << '\n';
    around.err
        << "At its next start the centre takes up what is on the bus, and asks hosts for ten "
           "minutes what they have.\nRoll-outs that were running are paused: look at each, "
           "and let it go on with zavctl rollout resume.\n";
    return kDone;
}

}  // namespace

Action declareRestore(CLI::App& app) {
    const auto copy = std::make_shared<std::string>();
    app.add_option("COPY", *copy, "orders.db, as backup has made it")
        ->required()
        ->check(CLI::ExistingFile);
    return [copy](Surroundings& around) { return restore(*copy, around); };
}

}  // namespace fleet
